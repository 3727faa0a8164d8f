// What is written into the history, most of it by the scheduler. Functions throw SQLite::Exception
// and StoreFailure; those that change something belong inside a Transaction.
#pragma once

#include <absl/time/time.h>

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "appliance/runs/Run.h"
#include "appliance/store/Connection.h"
#include "appliance/store/TaskData.h"
#include "appliance/supervisor/OutputFile.h"
#include "appliance/supervisor/RunRecords.h"

namespace orva {

// A start by the schedule.
struct ScheduledRun {
    int task = 0;
    std::string taskName;
    std::int64_t occurrence = 0;  // seconds since 1970 UTC
    RunReason reason = RunReason::kSchedule;
    // Empty: the run waits for its start. Else it is skipped, and this is why.
    std::string_view why;
};

// For how long it is known of a start by the schedule that it has been put on record, also when its
// run is no longer kept. Counts back from the task's newest one; so many are known however old.
inline constexpr absl::Duration kStartsKnownFor = absl::Hours(24 * 90);
inline constexpr int kStartsAlwaysKnown = 1000;

// Yields the run's id; nothing when that instant of the task is on record already: it has been
// dealt with, and nothing is stored. A start that was skipped when its time had not really come, by
// a clock that was wrong, can still be made: its run takes the place of the skipped one.
std::optional<std::int64_t> InsertRun(Connection& connection, const ScheduledRun& run,
                                      absl::Time now);

struct QueuedRun {
    std::int64_t id = 0;
    int task = 0;
    // The instant of the schedule; of a run by hand, when it was asked for.
    absl::Time due;
    // When it was recorded.
    absl::Time since;
};

// Up to `most` queued runs with an id above `after`, by id.
std::vector<QueuedRun> ReadQueuedRuns(Connection& connection, std::int64_t after, int most);

// Whether a run of the task is queued.
bool HasQueuedRun(Connection& connection, int task);

struct TaskOfRun {
    TaskData task;
    // Nothing in a damaged row.
    std::optional<RunReason> reason;
};

// The task of a run that is still queued, as the task is now. Nothing when run or task is gone.
std::optional<TaskOfRun> ReadTaskOfQueued(Connection& connection, std::int64_t run);

struct RunningRun {
    std::int64_t id = 0;
    int task = 0;
    // The task's application now; empty when the task is gone.
    std::string app;
    // The machine's boot in which it was started.
    std::string bootId;
};

std::vector<RunningRun> ReadRunningRuns(Connection& connection);

// From queued to running. Committed before the process is started.
void MarkRunning(Connection& connection, std::int64_t run, const std::string& bootId,
                 absl::Time now);
// From running back to queued: its process was never started.
void MarkQueued(Connection& connection, std::int64_t run);
// From queued to skipped. False when it is not queued any more.
bool MarkSkipped(Connection& connection, std::int64_t run, std::string_view why);
// The same, because somebody has stopped it.
bool CancelQueued(Connection& connection, std::int64_t run);
// From running to ended, with what it printed; from queued, when it cannot be started. Nothing is
// stored of a run that is neither.
void MarkEnded(Connection& connection, std::int64_t run, const RunEnding& ending,
               const StoredOutput& output);
// From running to lost, with what it had printed. Nothing is stored of a run that is not running.
void MarkLost(Connection& connection, std::int64_t run, std::string_view why, absl::Time now,
              const StoredOutput& output);

// The clock was set to `now`: the instants of all runs so far may come from one that was wrong.
void RecordClockSet(Connection& connection, absl::Time now);

// The latest instant among the newest runs and what the clock was last set to; InfinitePast when
// there is neither. Runs from before the clock was set do not count.
absl::Time NewestRecord(Connection& connection);

// How much of the history is kept.
inline constexpr int kRunsKeptOfTask = 100;
inline constexpr absl::Duration kRunsKeptFor = absl::Hours(24 * 90);

// Removes the oldest runs of the task beyond kRunsKeptOfTask, a few at a time. Runs that wait or go
// on are kept.
void TrimRunsOfTask(Connection& connection, int task);

// The first of the tasks above `after` that have runs; nothing when there is none.
std::optional<int> NextTaskWithRuns(Connection& connection, int after);

// Removes up to `most` runs of the task from before `time`, and yields how many. Runs that wait or
// go on are kept.
int RemoveOldRuns(Connection& connection, int task, absl::Time time, int most);
// Whether RemoveOldRuns would find one.
bool HasOldRuns(Connection& connection, int task, absl::Time time);

}  // namespace orva
