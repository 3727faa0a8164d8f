#include "include/JsonText.h"

#include <json/reader.h>
#include <json/writer.h>

#include <optional>
#include <utility>

#include "include/PlainJson.h"

#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

std::string WriteJsonText(const Json::Value& value) {
    if (std::optional<std::string> text = WritePlainJson(value)) {
        return *std::move(text);
    }
    return Json::FastWriter().write(value);
}

bool ParseJsonText(const std::string& text, Json::Value& value,
                   std::span<const std::string_view> frequentNames) {
    if (ReadPlainJson(text, frequentNames, value)) {
        return true;
    }
    constexpr bool kCollectComments = true;
    try {
        return Json::Reader().parse(text, value, kCollectComments);
    } catch (const Json::Exception&) {
        // The reader throws on nesting deeper than it supports and leaves an unfinished value.
        value = Json::Value();
        return false;
    }
}
