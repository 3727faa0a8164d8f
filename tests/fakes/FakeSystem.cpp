// The system log and the allocator of the recording platform: definitions in the test program come
// before those of the C library.
#include <syslog.h>

#include <cstdarg>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <new>
#include <string>

#include "tests/fakes/RecordingPlatform.h"

namespace {

void Record(int priority, const char* format, va_list arguments) {
    if (!fakes::RecordingPlatform::Exists()) {
        return;
    }
    char* text = nullptr;
    if (vasprintf(&text, format, arguments) < 0) {
        throw std::bad_alloc();
    }
    const std::unique_ptr<char, decltype(&std::free)> owned(text, std::free);
    const std::string name =
        priority == LOG_ERR ? "LOG_ERR" : "LOG_PRIORITY_" + std::to_string(priority);
    fakes::RecordingPlatform::Current().Write(fakes::RecordingPlatform::Kind::kLog,
                                              name + " " + text);
}

}  // namespace

extern "C" {

void syslog(int priority, const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    Record(priority, format, arguments);
    va_end(arguments);
}

void vsyslog(int priority, const char* format, va_list arguments) {
    Record(priority, format, arguments);
}

// What fortified builds call in their place.
void __syslog_chk(int priority, int /*flag*/, const char* format, ...);
void __syslog_chk(int priority, int /*flag*/, const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    Record(priority, format, arguments);
    va_end(arguments);
}

void __vsyslog_chk(int priority, int /*flag*/, const char* format, va_list arguments);
void __vsyslog_chk(int priority, int /*flag*/, const char* format, va_list arguments) {
    Record(priority, format, arguments);
}

// The linker sends the module's calls of calloc here (--wrap=calloc).
void* __real_calloc(std::size_t count, std::size_t size);
void* __wrap_calloc(std::size_t count, std::size_t size);
void* __wrap_calloc(std::size_t count, std::size_t size) {
    if (fakes::RecordingPlatform::Exists() &&
        fakes::RecordingPlatform::Current().IsArmed("calloc") &&
        fakes::RecordingPlatform::Current().Enter(
            "calloc", std::to_string(count) + ", " + std::to_string(size))) {
        return nullptr;
    }
    return __real_calloc(count, size);
}
}
