#include "appliance/scheduler/PassedStarts.h"

#include <algorithm>

#include "appliance/schedule/StartTimes.h"

namespace orva {
namespace {

// The start after `after`; kNoStart unless it is at `until` or before.
StartSecond StartBetween(const Schedule& schedule, const absl::TimeZone& zone, absl::Time after,
                         absl::Time until) {
    const std::optional<absl::Time> start = NextStart(schedule, zone, after);
    return start && *start <= until ? absl::ToUnixSeconds(*start) : kNoStart;
}

// The last start after `stored` and `since` that is at `until` or before; `stored` when there is
// none.
StartSecond LatestStart(const Schedule& schedule, const absl::TimeZone& zone, StartSecond stored,
                        StartSecond since, absl::Time until) {
    const absl::Time first = absl::FromUnixSeconds(std::max(stored, since));
    StartSecond latest = StartBetween(schedule, zone, first, until);
    if (latest == kNoStart) {
        return stored;
    }
    // Goes back in growing steps until a start is found: a week of missed minutes has ten thousand.
    for (absl::Duration step = absl::Minutes(1); until - step > first; step *= 2) {
        const StartSecond start = StartBetween(schedule, zone, until - step, until);
        if (start != kNoStart) {
            latest = start;
            break;
        }
    }
    for (StartSecond next = latest; next != kNoStart;
         next = StartBetween(schedule, zone, absl::FromUnixSeconds(latest), until)) {
        latest = next;
    }
    return latest;
}

}  // namespace

PassedStarts FindPassedStarts(const Schedule& schedule, const absl::TimeZone& zone,
                              StartSecond stored, StartSecond since, absl::Time now) {
    PassedStarts passed;
    passed.latest = LatestStart(schedule, zone, stored, since, now);
    if (passed.latest != stored) {
        passed.before =
            LatestStart(schedule, zone, stored, since, absl::FromUnixSeconds(passed.latest - 1));
    }
    return passed;
}

}  // namespace orva
