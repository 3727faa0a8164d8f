#pragma once

#include <absl/time/time.h>

#include <optional>

#include "appliance/schedule/Schedule.h"
#include "appliance/store/NextStartTime.h"

namespace orva {

// The last starts of a schedule that have come by now.
struct PassedStarts {
    StartSecond latest = kUnknownStart;
    // The one before it.
    std::optional<StartSecond> before;
};

// Of the starts from `stored` on, which is one itself and not later than `now`; and of the others
// those after `since`, from when on the schedule holds. The effort grows with the logarithm of the
// time that has passed, not with the number of starts.
PassedStarts FindPassedStarts(const Schedule& schedule, const absl::TimeZone& zone,
                              StartSecond stored, StartSecond since, absl::Time now);

}  // namespace orva
