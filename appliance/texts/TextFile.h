#pragma once

#include <json/value.h>

#include <string>

namespace orva {

// The document of a strings.json, {section: {key: text}}. For anything else an empty object; then
// `error` is one line that says what is wrong, and is untouched otherwise.
[[nodiscard]] Json::Value ParseTextFile(const std::string& content, std::string& error);

}  // namespace orva
