#include <syslog.h>

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <ctime>
#include <exception>
#include <span>

#include "appliance/recycle/RecycleTool.h"

int main(int argc, char** argv) {
    ::openlog("orvarecycle", LOG_PERROR, LOG_USER);
    timespec now{};
    ::clock_gettime(CLOCK_REALTIME, &now);
    const std::span<const char* const> arguments(argv, static_cast<std::size_t>(argc));
    try {
        return orva::RunRecycleTool(
            arguments.empty() ? arguments : arguments.subspan(1), stdout, stderr,
            orva::ToFileTime(now.tv_sec, static_cast<std::uint32_t>(now.tv_nsec)));
    } catch (const std::exception& error) {
        std::fprintf(stderr, "orvarecycle: %s\n", error.what());
        return 1;
    }
}
