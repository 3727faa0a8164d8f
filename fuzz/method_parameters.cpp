// A request: the first byte chooses the method, "0" to "6", the rest is the body.
#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "appliance/util/StrictJson.h"
#include "fuzz/FilledPlatform.h"
#include "fuzz/Require.h"

namespace {

constexpr std::array<const char*, 7> kMethods = {"list", "set_enable", "delete", "run",
                                                 "get",  "set",        "create"};

void RequireReadable(const FilledPlatform& platform, const Json::Value& answer) {
    Require(answer["id"].isInt(), "a written task's id is answered");
    Json::Value parameters;
    parameters["id"] = answer["id"];
    Require(Call(platform, "get", parameters).Succeeded(), "what was written can be read");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) {
        return 0;
    }
    const std::string_view body(reinterpret_cast<const char*>(data) + 1, size - 1);
    std::string error;
    const std::optional<Json::Value> parameters = orva::ParseStrictObject(body, error);
    if (!parameters) {
        return 0;
    }
    const std::string method = kMethods[(data[0] - unsigned{'0'}) % kMethods.size()];
    const FilledPlatform platform;
    const MethodCall call = Call(platform, method, *parameters);
    if (call.Succeeded() && (method == "set" || method == "create")) {
        RequireReadable(platform, call.response.GetDocument());
    }
    return 0;
}
