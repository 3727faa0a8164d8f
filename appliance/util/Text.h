// What many rooms ask of short texts, the same in every locale.
#pragma once

#include <string>
#include <string_view>

namespace orva {

inline bool IsDigit(char byte) { return byte >= '0' && byte <= '9'; }

// The text without spaces and tabs at its ends.
std::string_view TrimBlanks(std::string_view text);

// What errno means: "No such file or directory".
std::string ErrnoText();

}  // namespace orva
