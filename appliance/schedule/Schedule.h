#pragma once

#include <absl/time/civil_time.h>

#include <cstdint>
#include <optional>

namespace orva {

// When a task starts, in the machine's local time. A value without a clock, a time zone or a file.
struct Schedule {
    // The enumerators' values are stored: new ones go to the end.
    enum class Mode : std::uint8_t {
        kWeekly,  // on the days of `weekDays`
        kDate,    // on `date`, and again as `repeat` says
    };
    enum class Repeat : std::uint8_t {
        kNever,
        kDaily,
        kWeekly,
        kMonthly,
        kQuarterly,
        kHalfYearly,
        kYearly,
    };

    static constexpr int kMinutesPerDay = 24 * 60;
    static constexpr std::uint8_t kAllWeekDays = 0x7f;

    Mode mode = Mode::kWeekly;
    Repeat repeat = Repeat::kNever;
    // Bit 0 is Sunday, bit 6 Saturday. May be empty in mode kDate only.
    std::uint8_t weekDays = kAllWeekDays;
    // Whether a start that the machine slept through is made up for.
    bool runMissed = false;
    // May be unset in mode kWeekly only. A month that lacks the day starts on its last one.
    std::optional<absl::CivilDay> date;
    // The first start of a day, in minutes after midnight: 0 to 1439.
    int firstMinute = 0;
    // Minutes from one start of a day to the next; 0 starts once, at most 1439.
    int intervalMinutes = 0;
    // With an interval, no start of the day is later than this: firstMinute to 1439.
    int lastMinute = kMinutesPerDay - 1;

    bool operator==(const Schedule&) const = default;
};

}  // namespace orva
