#include "appliance/store/NextStartTime.h"

#include "appliance/schedule/StartTimes.h"

namespace orva {

StartSecond ComputeNextStart(const TaskData& task, const absl::TimeZone& zone, absl::Time now) {
    if (!task.Has(kEnabled)) {
        return kNoStart;
    }
    const std::optional<absl::Time> start = NextStart(task.schedule, zone, now);
    return start ? absl::ToUnixSeconds(*start) : kNoStart;
}

std::string FormatNextStart(StartSecond start, const absl::TimeZone& zone) {
    return start == kNoStart ? "N/A" : FormatLocalMinute(absl::FromUnixSeconds(start), zone);
}

}  // namespace orva
