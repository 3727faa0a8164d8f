// When a schedule starts next. Pure arithmetic: no clock, no files; safe from any thread.
//
// Starts are meant in wall-clock time, which now and then is put forward or back:
// - Starts inside a stretch that the clock jumps over become one, at the first instant after it.
// - A once-a-day start inside a stretch that the clock shows twice happens on the first pass. A
//   series of starts with one in such a stretch goes on at its interval, in real time, through both
//   passes; after them it follows the wall clock again.
#pragma once

#include <absl/time/time.h>

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "appliance/schedule/Schedule.h"

namespace orva {

struct Start {
    // What a change of the clock did to this start.
    enum class ClockChange {
        kNone,
        kJumpedOver,  // its wall-clock time does not exist; moved to the first instant after it
        kFirstPass,   // its wall-clock time comes twice; this is the first
        kSecondPass,
    };

    absl::Time at;
    ClockChange change = ClockChange::kNone;
};

// The first start strictly later than `after`; nothing when the schedule is over. The search looks
// at a handful of days, whatever the schedule.
std::optional<Start> FindNextStart(const Schedule& schedule, const absl::TimeZone& zone,
                                   absl::Time after);

// The instant of FindNextStart.
std::optional<absl::Time> NextStart(const Schedule& schedule, const absl::TimeZone& zone,
                                    absl::Time after);

// Up to `count` starts later than `after`, in time order.
std::vector<Start> NextStarts(const Schedule& schedule, const absl::TimeZone& zone,
                              absl::Time after, std::size_t count);

// Local time as "YYYY-MM-DD HH:MM".
std::string FormatLocalMinute(absl::Time time, const absl::TimeZone& zone);

}  // namespace orva
