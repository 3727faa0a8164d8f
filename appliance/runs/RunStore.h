#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <vector>

#include "appliance/runs/Run.h"
#include "appliance/store/TaskStore.h"

namespace orva {

// The history of an appliance's tasks. It stands in the task store's database: the runs that wait
// or go on, and those that ended, as many as the scheduler keeps.
//
// Functions throw StoreFailure; failures of the database have been logged with its path by then.
// Threads: any. Any process that may read the database may use it, whether a scheduler runs or not.
class RunStore {
  public:
    // Which runs of the history are meant: all but those that differ in a member that is set.
    struct Filter {
        std::optional<int> task;
        std::optional<RunState> state;
    };
    struct Page {
        std::vector<Run> runs;
        // How many the filter leaves altogether, damaged ones too.
        std::int64_t total = 0;
    };

    // The history below the root of this program.
    static std::shared_ptr<RunStore> Current();

    explicit RunStore(std::shared_ptr<TaskStore> taskStore);

    // The newest runs first. `offset` and `limit` are not negative. Damaged ones are left out of
    // the page, here and below, and logged.
    Page List(const Filter& filter, std::int64_t offset, std::int64_t limit);

    // Of each task that has any, in the order of `tasks`: the run that is going on, otherwise the
    // newest. A start that was skipped for it would hide it else.
    std::vector<Run> Latest(const std::vector<int>& tasks);

    std::optional<Run> Find(std::int64_t run);

    // What the run has printed, so far if it goes on. Nothing when there is no such run.
    std::optional<RunOutput> Output(std::int64_t run);

    // Takes a run that waits for its start out of the queue: it counts as skipped, because it was
    // stopped. False when it does not wait.
    bool Cancel(std::int64_t run);

    // A number that grows with every change of tasks or runs, by whatever process.
    std::int64_t Revision();

  private:
    std::shared_ptr<TaskStore> store;
};

}  // namespace orva
