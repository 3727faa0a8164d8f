// Reading documents whose shape nobody has checked: requests, and stored sections that may be older
// than this code or damaged.
#pragma once

#include <json/value.h>

// The name of a member that is to be created, as a literal: jsoncpp copies any other name, twice.
using Key = Json::StaticString;

// The member `key` of `value`; null when `value` is no object or lacks it. Unlike jsoncpp's own
// access it takes every type, creates nothing and never throws. The reference lives as long as
// `value`.
inline const Json::Value& MemberOf(const Json::Value& value, const char* key) {
    return value.isObject() ? value[key] : Json::Value::nullSingleton();
}

// True for an integer of any size; jsoncpp's own isInt() and isIntegral() take 5.0 for one too.
inline bool IsJsonInteger(const Json::Value& value) {
    return value.type() == Json::intValue || value.type() == Json::uintValue;
}
