#include "tests/appliance/modules/ModuleTest.h"

#include <filesystem>

#include "appliance/webapi/JsonWriter.h"

ModuleTest::ModuleTest() {
    MakeDirectory("/modules");
    for (const char* name : {"ORVA.Core.Appliance.so", "ORVA.Core.TaskHistory.so"}) {
        std::filesystem::create_symlink(std::string(ORVA_LIB_DIR "/") + name,
                                        RootPath() + "/modules/" + name);
    }
    modules = std::make_unique<orva::ModuleLoader>(RootPath() + "/modules");
}

std::string ModuleTest::Ask(const std::string& api, const std::string& method,
                            const std::string& body, const std::string& language) const {
    const orva::Dispatcher dispatcher(modules->Catalogue());
    return orva::WriteAnswer(dispatcher.Call(api, 1, method, body, language).response);
}

std::string ModuleTest::Refusal(int code, const std::string& message) {
    return R"({"success":false,"error":{"code":)" + std::to_string(code) + R"(,"details":{"msg":)" +
           orva::WriteJson(message) + "}}}";
}
