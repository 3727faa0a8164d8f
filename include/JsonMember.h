// Reading stored sections, which may be older than this code or damaged.
#pragma once

#include <json/value.h>

// The member `key` of `value`; null when `value` is no object or lacks it. Unlike jsoncpp's own
// access it takes every type, creates nothing and never throws. The reference lives as long as
// `value`.
inline const Json::Value& MemberOf(const Json::Value& value, const char* key) {
    return value.isObject() ? value[key] : Json::Value::nullSingleton();
}
