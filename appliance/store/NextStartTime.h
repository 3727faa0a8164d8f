#pragma once

#include <absl/time/time.h>

#include <cstdint>
#include <limits>
#include <string>

#include "appliance/store/TaskData.h"

namespace orva {

// The instant of a task's next start in seconds since 1970 UTC, as the database holds it.
using StartSecond = std::int64_t;

// A disabled task, or one whose schedule is over: later than every start.
constexpr StartSecond kNoStart = std::numeric_limits<StartSecond>::max();
// Not computed yet.
constexpr StartSecond kUnknownStart = std::numeric_limits<StartSecond>::min();

// The task's first start later than `now`; kNoStart when there is none.
StartSecond ComputeNextStart(const TaskData& task, const absl::TimeZone& zone, absl::Time now);

// Local time "YYYY-MM-DD HH:MM", "N/A" for kNoStart.
std::string FormatNextStart(StartSecond start, const absl::TimeZone& zone);

}  // namespace orva
