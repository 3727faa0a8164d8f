#pragma once

#include <json/value.h>

#include <string>

namespace orva {

// The document of a strings.json, {section: {key: text}}, without the members that are no object of
// texts or no text: one slip of a translator must not cost a whole language. An empty object for
// what is not JSON or no object. `error` is one line that says what is wrong, naming the first
// member that was left out, and is untouched when nothing is.
[[nodiscard]] Json::Value ParseTextFile(const std::string& content, std::string& error);

}  // namespace orva
