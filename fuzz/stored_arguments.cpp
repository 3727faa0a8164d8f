// Application arguments that a task holds already, from an older version or a damaged store: the
// first byte chooses the task's kind, "1" to "5", the rest is the text.
#include <json/reader.h>
#include <json/writer.h>

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>

#include "appliance/util/StrictJson.h"
#include "fuzz/FilledPlatform.h"
#include "fuzz/Require.h"
#include "include/PlainJson.h"

namespace {

constexpr unsigned kKinds = 5;

void SetAgain(const FilledPlatform& platform, const Json::Value& parameters) {
    Require(Call(platform, "set", parameters).Succeeded(), "what was accepted once is again");
}

void ExpectPlainFormToBeRight(const std::string& text) {
    Json::Value plain;
    if (!ReadPlainJson(text, {}, plain)) {
        return;
    }
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
    Json::Value ordinary;
    Require(Json::Reader().parse(text, ordinary) && plain == ordinary,
            "what is read quickly is read rightly");
    const std::optional<std::string> written = WritePlainJson(plain);
    Require(!written || *written == Json::FastWriter().write(plain),
            "what is written quickly is written rightly");
#pragma GCC diagnostic pop
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) {
        return 0;
    }
    const int id = static_cast<int>((data[0] - unsigned{'1'}) % kKinds) + 1;
    const std::string bytes(reinterpret_cast<const char*>(data) + 1, size - 1);
    // The store's texts end at a NUL.
    const std::string text = bytes.substr(0, bytes.find('\0'));
    ExpectPlainFormToBeRight(text);
    FilledPlatform platform;
    platform.tasks[id].appArgs = text;

    Json::Value parameters;
    parameters["id"] = id;
    Call(platform, "get", parameters);

    parameters["name"] = "Job";
    if (!Call(platform, "set", parameters).Succeeded()) {
        return 0;
    }
    Require(Call(platform, "get", parameters).Succeeded(), "what was written can be read");
    std::string error;
    if (!orva::ParseStrictJson(text, error)) {
        // Bytes that are no UTF-8 and escapes that name no character go into the action text and
        // the command as they are this time, and become proper text in the arguments.
        SetAgain(platform, parameters);
    }
    const fakes::Task first = platform.tasks[id];
    SetAgain(platform, parameters);
    Require(platform.tasks[id] == first, "setting the same again changes nothing");
    return 0;
}
