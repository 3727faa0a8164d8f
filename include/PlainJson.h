// A quick reader and writer for what sections nearly always are: small trees of plain texts and
// integers. Reading and writing one is else the larger part of what changing a task computes.
#pragma once

#include <json/value.h>

#include <optional>
#include <span>
#include <string>
#include <string_view>

// Parses `text` into `value` when it is plain: an object or array, nested at most 32 levels deep,
// of texts, integers of up to nine digits, booleans and nulls, without comments and without escaped
// surrogates. What it yields equals what jsoncpp's older reader yields for the same text. False for
// everything else, right or wrong, with `value` untouched.
//
// Members named in `frequentNames`, which are literals, get that name itself instead of a copy of
// it.
[[nodiscard]] bool ReadPlainJson(std::string_view text,
                                 std::span<const std::string_view> frequentNames,
                                 Json::Value& value);

// Writes `value` when it is plain: nested at most 32 levels deep, without holes in arrays, of
// integers, booleans, nulls, and texts whose bytes are ASCII and stand for themselves in JSON. The
// text equals that of jsoncpp's older writer, the newline at its end included. None for every other
// value.
[[nodiscard]] std::optional<std::string> WritePlainJson(const Json::Value& value);
