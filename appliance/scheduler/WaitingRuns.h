#pragma once

#include <absl/time/time.h>

#include <cstddef>
#include <cstdint>
#include <map>
#include <set>
#include <utility>

#include "appliance/runs/RunWriter.h"

namespace orva {

// The runs that wait for their start: a copy of what the store holds, as far as it has been read.
class WaitingRuns {
  public:
    void Add(const QueuedRun& run);

    bool Empty() const { return runs.empty(); }
    // The highest id that was ever added; 0 when there was none.
    std::int64_t LastAdded() const { return lastAdded; }
    bool HasOf(int task) const { return tasks.count(task) != 0; }

    // Takes out the run that is to be started first. There must be one.
    std::int64_t TakeFirst();

    // Since when the one that has waited longest does so; InfiniteFuture when none waits.
    absl::Time OldestSince() const;
    // Takes out that one.
    std::int64_t TakeOldest();

  private:
    // By an instant, then by id.
    using Order = std::set<std::pair<absl::Time, std::int64_t>>;

    std::int64_t Take(std::int64_t run);

    std::map<std::int64_t, QueuedRun> runs;
    Order byDue;
    Order byAge;
    std::multiset<int> tasks;
    std::int64_t lastAdded = 0;
};

}  // namespace orva
