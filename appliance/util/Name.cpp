#include "appliance/util/Name.h"

#include <cstddef>

#include "appliance/util/Utf8.h"

namespace orva {

bool IsSafeName(std::string_view name) {
    constexpr std::size_t kMaxBytes = 255;  // what a file system takes
    if (name.empty() || name.size() > kMaxBytes || name.front() == '-' || name == "." ||
        name == ".." || ValidUtf8Length(name) != name.size()) {
        return false;
    }
    constexpr std::string_view kForbidden("/\0", 2);
    return name.find_first_of(kForbidden) == std::string_view::npos;
}

}  // namespace orva
