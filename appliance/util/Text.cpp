#include "appliance/util/Text.h"

#include <cerrno>
#include <cstring>

namespace orva {

std::string_view TrimBlanks(std::string_view text) {
    const std::size_t first = text.find_first_not_of(" \t");
    const std::size_t last = text.find_last_not_of(" \t");
    return first == std::string_view::npos ? std::string_view()
                                           : text.substr(first, last - first + 1);
}

std::string ErrnoText() { return std::strerror(errno); }

}  // namespace orva
