#include <cstddef>
#include <cstring>

#include "platform/qlibc.h"

namespace {

constexpr std::size_t kFileBytes = 255;

struct LastError {
    int code = 0;
    int line = 0;
    char file[kFileBytes + 1] = {};
};

thread_local LastError lastError;

}  // namespace

int QLIBCErrGet() { return lastError.code; }

const char* QLIBCErrorGetFile(int /*code*/) { return lastError.file; }

int QLIBCErrorGetLine(int /*code*/) { return lastError.line; }

void QLIBCErrSetEx(int code, const char* file, int line) {
    lastError.code = code;
    lastError.line = line;
    const std::size_t length = file != nullptr ? ::strnlen(file, kFileBytes) : 0;
    if (length > 0) {
        // A caller may hand back what QLIBCErrorGetFile gave it.
        std::memmove(lastError.file, file, length);
    }
    lastError.file[length] = '\0';
}
