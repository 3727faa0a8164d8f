#include "appliance/scheduler/WaitingRuns.h"

#include <algorithm>

namespace orva {

void WaitingRuns::Add(const QueuedRun& run) {
    if (!runs.emplace(run.id, run).second) {
        return;
    }
    byDue.emplace(run.due, run.id);
    byAge.emplace(run.since, run.id);
    tasks.insert(run.task);
    lastAdded = std::max(lastAdded, run.id);
}

std::int64_t WaitingRuns::TakeFirst() { return Take(byDue.begin()->second); }

absl::Time WaitingRuns::OldestSince() const {
    return byAge.empty() ? absl::InfiniteFuture() : byAge.begin()->first;
}

std::int64_t WaitingRuns::TakeOldest() { return Take(byAge.begin()->second); }

std::int64_t WaitingRuns::Take(std::int64_t run) {
    const QueuedRun taken = runs.at(run);
    runs.erase(run);
    byDue.erase({taken.due, run});
    byAge.erase({taken.since, run});
    tasks.erase(tasks.find(taken.task));
    return run;
}

}  // namespace orva
