#pragma once

#include <absl/time/time.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <mutex>
#include <optional>
#include <string_view>
#include <vector>

#include "appliance/store/NextStartTime.h"
#include "appliance/store/TaskData.h"

namespace orva {

enum class SortKey { kState, kId, kAppName, kName, kAction, kNextStart };
constexpr std::size_t kSortKeys = 6;

// The key that a list is asked to be sorted by, as in "next trigger time".
std::optional<SortKey> ParseSortKey(std::string_view text);

// What a task is sorted by.
struct SortItem {
    const TaskData* task;
    StartSecond nextStart;
};

// The indices 0 to `count` - 1 in the order that the key asks for. Equal ones keep their order
// either way; those without a next start come last either way.
std::vector<std::uint32_t> SortedIndices(std::size_t count, SortKey key, bool ascending,
                                         const std::function<SortItem(std::uint32_t)>& item);

// An order of tasks, and back: rankOf[order[n]] is n.
struct SortOrder {
    std::vector<std::uint32_t> order;
    std::vector<std::uint32_t> rankOf;

    explicit SortOrder(std::vector<std::uint32_t> indices);
};

// All stored tasks at one time. Immutable; shared by threads.
class Snapshot {
  public:
    // `allTasks` in ascending order of id. Next starts are computed for the zone, later than `now`.
    Snapshot(std::vector<SharedTask> allTasks, const absl::TimeZone& zoneToUse, absl::Time now,
             std::vector<DamagedTask> damagedTasks = {});
    Snapshot(const Snapshot&) = delete;
    Snapshot& operator=(const Snapshot&) = delete;

    // All but the damaged ones.
    std::size_t Count() const { return tasks.size(); }
    const std::vector<SharedTask>& Tasks() const { return tasks; }
    const std::vector<DamagedTask>& Damaged() const { return damaged; }
    const TaskData& Task(std::size_t index) const { return *tasks[index]; }
    std::uint16_t Flags(std::size_t index) const { return flags[index]; }
    StartSecond NextStart(std::size_t index) const { return nextStarts[index]; }
    const absl::TimeZone& Zone() const { return zone; }
    // When its next starts were computed.
    absl::Time ComputedAt() const { return computedAt; }

    // The index of the task with that id.
    std::optional<std::size_t> Find(int id) const;

    // Whether the next starts hold for that zone at that time: none has passed, and the clock has
    // not been put back either.
    bool HoldsFor(const absl::TimeZone& zoneNow, absl::Time now) const;

    // Sorted at the first call for a key and direction, then kept.
    const SortOrder& Order(SortKey key, bool ascending) const;

  private:
    struct LazyOrder {
        std::once_flag once;
        std::optional<SortOrder> order;
    };

    std::vector<SharedTask> tasks;
    std::vector<DamagedTask> damaged;
    // Beside the tasks and not in them: a walk over all tasks then stays in few cache lines.
    std::vector<std::uint16_t> flags;
    std::vector<StartSecond> nextStarts;
    absl::TimeZone zone;
    absl::Time computedAt;
    StartSecond earliestStart = kNoStart;
    mutable std::array<LazyOrder, kSortKeys * 2> orders;
};

}  // namespace orva
