#include <cstddef>
#include <cstring>
#include <new>
#include <string>

#include "appliance/util/Error.h"
#include "platform/qlibc.h"

int QLIBCStrReplace(char* buffer, const char* from, const char* to, int flags, int size) {
    if (buffer == nullptr || from == nullptr || to == nullptr || *from == '\0' || flags != 0 ||
        size <= 0) {
        return orva::Fail(orva::kErrBadArgument);
    }
    const auto room = static_cast<std::size_t>(size);
    const std::size_t length = ::strnlen(buffer, room);
    if (length == room) {
        return orva::Fail(orva::kErrBadArgument);
    }
    const std::size_t fromLength = std::strlen(from);
    const std::size_t toLength = std::strlen(to);
    try {
        std::string result;
        int count = 0;
        const char* rest = buffer;
        while (const char* found = std::strstr(rest, from)) {
            result.append(rest, found);
            result.append(to, toLength);
            if (result.size() >= room) {
                return orva::Fail(orva::kErrTooLong);
            }
            rest = found + fromLength;
            ++count;
        }
        result.append(rest);
        if (result.size() >= room) {
            return orva::Fail(orva::kErrTooLong);
        }
        std::memcpy(buffer, result.c_str(), result.size() + 1);
        return count;
    } catch (const std::bad_alloc&) {
        return orva::Fail(orva::kErrNoMemory);
    }
}
