// A file of texts, and any other JSON that comes from outside.
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>

#include "appliance/texts/TextFile.h"
#include "appliance/util/StrictJson.h"
#include "appliance/util/Utf8.h"
#include "appliance/webapi/JsonWriter.h"
#include "fuzz/Require.h"

namespace {

bool IsOneLine(const std::string& text) {
    return !text.empty() && text.find('\n') == std::string::npos;
}

void RequireTexts(const Json::Value& document) {
    Require(document.isObject(), "a text file is an object");
    for (const Json::Value& section : document) {
        Require(section.isObject(), "a section is an object");
        for (const Json::Value& text : section) {
            Require(text.isString(), "a text is a text");
        }
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string bytes(reinterpret_cast<const char*>(data), size);
    std::string error;
    const std::optional<Json::Value> document = orva::ParseStrictJson(bytes, error);
    if (document) {
        Require(error.empty(), "a document that is good comes without an error");
        Require(orva::ValidUtf8Length(bytes) == bytes.size(), "a document is UTF-8");
        const std::optional<Json::Value> again =
            orva::ParseStrictJson(orva::WriteJson(*document), error);
        Require(again == document, "what is written reads back as the same document");
    } else {
        Require(IsOneLine(error), "a refusal is one line");
    }

    std::string fault;
    const Json::Value texts = orva::ParseTextFile(bytes, fault);
    RequireTexts(texts);
    Require(fault.empty() || IsOneLine(fault), "what is wrong is one line");
    Require(document || (texts.empty() && !fault.empty()), "a bad document has no texts");
    Require(!fault.empty() || texts == document, "what is dropped is told");
    return 0;
}
