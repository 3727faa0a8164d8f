#pragma once

#include <json/value.h>

#include <string>

namespace orva {

// Appends `value` to `text` as compact JSON in UTF-8, without line ends. Members come in ascending
// order of their names' bytes. Whatever the value holds, the result is valid JSON: bytes that are
// no UTF-8 become U+FFFD, numbers that JSON cannot express (infinities, NaN) become null. Not
// jsoncpp's own writer, because that one takes 2.1 times as long for the answer of a list of 50
// rows (1.6 times for 10,000) and lets bytes that are no UTF-8 pass when it is to emit UTF-8.
void AppendJson(const Json::Value& value, std::string& text);

std::string WriteJson(const Json::Value& value);

}  // namespace orva
