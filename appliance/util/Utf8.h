#pragma once

#include <cstddef>
#include <string_view>

namespace orva {

// The length in bytes of the longest start of `text` that is valid UTF-8: `text.size()` when all of
// it is. Surrogates, over-long forms and what lies beyond U+10FFFF are invalid.
[[nodiscard]] std::size_t ValidUtf8Length(std::string_view text);

// Takes the first character off `text`, which is valid and not empty.
[[nodiscard]] char32_t TakeCharacter(std::string_view& text);

}  // namespace orva
