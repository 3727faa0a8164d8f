// Tasks and queued runs as rows. Functions throw SQLite::Exception and StoreFailure; those that
// change something belong inside a Transaction.
#pragma once

#include <absl/time/time.h>

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "appliance/store/Connection.h"
#include "appliance/store/NextStartTime.h"
#include "appliance/store/TaskData.h"

namespace orva {

std::optional<TaskData> ReadTask(Connection& connection, int id);

// All tasks in ascending order of id. Damaged ones are added to `damaged` instead.
std::vector<SharedTask> ReadAllTasks(Connection& connection, std::vector<DamagedTask>& damaged);

// Stores a new task and yields its id: `task.id`, which must never have been used, or the next free
// one when that is kNewTaskId.
int InsertTask(Connection& connection, const TaskData& task, StartSecond nextStart);

// Replaces the stored task with the id of `task`. Its next start stays as it is when there is no
// `nextStart`, and when it has come by `now`: the scheduler has not seen it yet and puts it on
// record. False when there is no such task.
[[nodiscard]] bool UpdateTask(Connection& connection, const TaskData& task,
                              std::optional<StartSecond> nextStart, absl::Time now);

// Removes the task, and which of its starts are on record; its queued runs count as skipped. False
// when there is none.
[[nodiscard]] bool RemoveTask(Connection& connection, int id);

// The highest id that was ever given to a task; 0 when there was none.
std::int64_t HighestTaskId(Connection& connection);

// The number of the newest change; 0 when there was none.
std::int64_t NewestChange(Connection& connection);

// The ids of the tasks that changed after change number `after`, in ascending order, each once.
// Nothing when that is too long ago to tell, or more than `most` changes.
std::optional<std::vector<int>> TasksChangedAfter(Connection& connection, std::int64_t after,
                                                  std::int64_t most);

// A task with its next start as it is stored.
struct StoredStart {
    TaskData task;
    StartSecond start = kNoStart;
    // Since when the task has had its schedule, or has been enabled; 0 for what it was created
    // with.
    StartSecond scheduleSince = 0;
};

struct StoredStarts {
    std::vector<StoredStart> tasks;
    // Of the rows with a next start.
    std::vector<DamagedTask> damaged;
    // How many rows were read, and the id of the last one.
    std::size_t read = 0;
    std::int64_t last = 0;
};

// Up to `most` tasks whose next start has come by `now`, in order of it.
StoredStarts ReadDueTasks(Connection& connection, absl::Time now, int most);

// Up to `most` tasks with an id above `after`, by id.
StoredStarts ReadTasksAfter(Connection& connection, std::int64_t after, int most);

// The earliest next start of all tasks; kNoStart when there is none.
StartSecond EarliestStart(Connection& connection);

// Stores a task's next start and nothing else; does not count as a change of the task.
void SetNextStart(Connection& connection, std::int64_t id, StartSecond start);

// Queues a run that was asked for by hand. False when there is no such task.
[[nodiscard]] bool QueueRun(Connection& connection, int task, absl::Time now,
                            const std::string& program, const std::string& account);

}  // namespace orva
