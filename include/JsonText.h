// Application sections as compact JSON text, in the form that task records hold: the writer ends
// its text with a newline, the reader keeps comments. Both yield what jsoncpp's older reader and
// writer yield, which stored tasks depend on.
#pragma once

#include <json/value.h>

#include <span>
#include <string>
#include <string_view>

// Compact text of `value`, ended by a newline.
std::string WriteJsonText(const Json::Value& value);

// Parses `text` into `value`. False when it is not JSON, with whatever the reader produced of it in
// `value`, or when it is nested deeper than 1,000 levels, with null there. Never throws for its
// text. Members named in `frequentNames`, which are literals, may get that name itself instead of a
// copy of it: worth giving for a section of many members.
bool ParseJsonText(const std::string& text, Json::Value& value,
                   std::span<const std::string_view> frequentNames = {});
