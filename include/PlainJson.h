// A quick reader for what sections nearly always are: JSON that this system's own writer wrote.
#pragma once

#include <json/value.h>

#include <span>
#include <string_view>

// Parses `text` into `value` when it is plain: an object or array, nested at most 32 levels deep,
// of texts, integers of up to nine digits, booleans and nulls, without comments and without escaped
// surrogates. What it yields equals what jsoncpp's older reader yields for the same text. False for
// everything else, right or wrong, with `value` untouched.
//
// Members named in `frequentNames` get that name itself instead of a copy of it.
[[nodiscard]] bool ReadPlainJson(std::string_view text,
                                 std::span<const Json::StaticString> frequentNames,
                                 Json::Value& value);
