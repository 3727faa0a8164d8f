#pragma once

#include <json/value.h>

#include <optional>
#include <string>
#include <string_view>

namespace orva {

// The document of `text`, any JSON value. Stricter than jsoncpp's own readers: the syntax of RFC
// 8259 and nothing more, one document with nothing after it, valid UTF-8, no NUL in any text or
// member name, no member named twice, at most 64 arrays and objects inside one another, no number
// that a double or a 64-bit integer cannot hold.
//
// On failure `error` is one line for people, with the place where it is known; on success it is
// untouched. Never throws for a bad document. Time is linear in the text's length, and a deep
// document is refused before anything is built.
//
// Threads: any.
[[nodiscard]] std::optional<Json::Value> ParseStrictJson(std::string_view text, std::string& error);

// As ParseStrictJson, but a document that is no object is a failure too.
[[nodiscard]] std::optional<Json::Value> ParseStrictObject(std::string_view text,
                                                           std::string& error);

}  // namespace orva
