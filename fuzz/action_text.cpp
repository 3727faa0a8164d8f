// The action text of a task, with localisation keys in it.
#include <cstddef>
#include <cstdint>
#include <string>

#include "fuzz/FilledPlatform.h"
#include "fuzz/Require.h"
#include "include/TaskSchedulerHandler.h"

// The appliance's own function, compiled under this name; the linker sends the module's calls to
// the function below it.
int ApplianceQLIBCStrReplace(char* buffer, const char* from, const char* to, int flags, int size);
extern "C" int __wrap__Z15QLIBCStrReplacePcPKcS1_ii(char* buffer, const char* from, const char* to,
                                                    int flags, int size);
extern "C" int __wrap__Z15QLIBCStrReplacePcPKcS1_ii(char* buffer, const char* from, const char* to,
                                                    int flags, int size) {
    return ApplianceQLIBCStrReplace(buffer, from, to, flags, size);
}

namespace {

std::string Translated(const std::string& action, const std::string& app) {
    ORVA::APIRequest request(Json::Value(Json::objectValue), "enu");
    ORVA::APIResponse response;
    TaskSchedulerHandler handler(&request, &response);
    Json::Value row;
    row["action"] = action;
    handler.TranslateActionKey(row, app);
    Require(row["action"].isString(), "a text stays a text");
    return row["action"].asString();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string action(reinterpret_cast<const char*>(data), size);
    const bool hasKeys = action.find('#') != std::string::npos;

    FilledPlatform platform;
    for (const char* app : {"com.example.mail", "com.example.other"}) {
        Require(hasKeys || Translated(action, app) == action, "a text without keys stays as it is");
    }
    // Service names in the text are replaced by keys first.
    platform.tasks[4].action = action.substr(0, action.find('\0'));
    Require(Call(platform, "list", Json::Value(Json::objectValue)).Succeeded(), "tasks are listed");

    platform.texts.clear();
    Require(Translated(action, "com.example.mail") == action, "unknown keys stay as they are");
    return 0;
}
