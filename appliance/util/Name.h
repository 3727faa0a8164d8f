#pragma once

#include <string_view>

namespace orva {

// Whether `name` may be the name of a share or the id of a package: 1 to 255 bytes of UTF-8, no
// slash, no NUL, no leading dash, neither "." nor "..". Tools get such names as arguments and make
// paths of them; what else is odd in one (blanks, quotes, line ends) is for them to quote.
[[nodiscard]] bool IsSafeName(std::string_view name);

}  // namespace orva
