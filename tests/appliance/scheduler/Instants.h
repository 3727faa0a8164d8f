#pragma once

#include <absl/time/time.h>

#include <stdexcept>
#include <string>

// "2026-05-01 12:00:00", as UTC.
inline absl::Time Utc(const std::string& text) {
    absl::Time time;
    std::string error;
    if (!absl::ParseTime("%Y-%m-%d %H:%M:%E*S", text, &time, &error)) {
        throw std::runtime_error(error);
    }
    return time;
}

inline std::int64_t UtcSecond(const std::string& text) { return absl::ToUnixSeconds(Utc(text)); }
