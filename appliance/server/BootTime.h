#pragma once

#include <time.h>

#include <chrono>
#include <functional>

namespace orva {

// Time since the machine's start, sleep included: no change of the wall clock makes it jump.
inline std::chrono::milliseconds BootTime() {
    timespec now{};
    ::clock_gettime(CLOCK_BOOTTIME, &now);
    return std::chrono::seconds(now.tv_sec) + std::chrono::milliseconds(now.tv_nsec / 1'000'000);
}

// BootTime, or a test's own time.
using BootClock = std::function<std::chrono::milliseconds()>;

}  // namespace orva
