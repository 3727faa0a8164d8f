#pragma once

#include <json/value.h>

#include <string>

namespace orva {

// Appends `value` to `text` as compact JSON in UTF-8, without line ends. Members come in ascending
// order of their names' bytes. Whatever the value holds, the result is valid JSON: bytes that are
// no UTF-8 become U+FFFD, numbers that JSON cannot express (infinities, NaN) become null.
void AppendJson(const Json::Value& value, std::string& text);

std::string WriteJson(const Json::Value& value);

}  // namespace orva
