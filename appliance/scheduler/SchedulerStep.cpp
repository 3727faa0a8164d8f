// What one step of the scheduler does to the store, in one transaction.
#include <syslog.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <string_view>
#include <utility>

#include "appliance/scheduler/Scheduler.h"
#include "appliance/store/StoreFailure.h"
#include "appliance/store/TaskTable.h"

namespace orva {
namespace {

// How much one step does at most: a transaction should not keep others waiting, nor a stop signal
// or the next due second. An ending may bring 128 KiB of output, which is held in memory.
constexpr std::size_t kEndingsAtOnce = 16;
constexpr int kDueAtOnce = 250;
constexpr int kQueuedAtOnce = 1000;
constexpr std::size_t kBegunAtOnce = 32;
constexpr int kCorrectedAtOnce = 500;

constexpr const char* kWhyDamaged = "its task is damaged";
constexpr const char* kWhyRowDamaged = "its row is damaged";

}  // namespace

RunEnding Scheduler::NotStarted(absl::Time now, std::string why) {
    const RunTime ended(std::chrono::microseconds(absl::ToUnixMicros(now)));
    return {{}, ended, {}, {}, std::move(why)};
}

void Scheduler::StoreStep(const Moment& moment, Step& step) {
    Database& database = store.UsedDatabase();
    WriteTransaction transaction(database);
    step.otherDatabase = database.Generation() != generation;
    if (step.otherDatabase) {
        return;
    }
    step.endings = std::min(ended.size(), kEndingsAtOnce);
    step.tasks = runningTasks;
    step.recordsClock = RecordsClock(moment);
    if (step.recordsClock) {
        RecordClockSet(*transaction, moment.now);
    }
    StoreEndings(*transaction, moment, step);
    // Before the due ones and after them: whose task waits already is not queued again.
    ReadQueue(*transaction);
    RecordDueTasks(*transaction, moment, step);
    ReadQueue(*transaction);
    SkipOutdated(*transaction, moment);
    StartQueued(*transaction, moment, step);
    CorrectStarts(*transaction, moment, step);
    transaction.Commit();
}

// Takes away the next start alone: somebody may still mend the rest.
void Scheduler::LeaveOut(Connection& connection, const std::vector<DamagedTask>& tasks,
                         Step& step) {
    for (const DamagedTask& task : tasks) {
        SetNextStart(connection, task.id, kNoStart);
        step.damaged.push_back(task);
    }
}

void Scheduler::StoreEndings(Connection& connection, const Moment& moment, Step& step) {
    for (std::size_t index = 0; index < step.endings; ++index) {
        EndedRun& over = ended[index];
        if (const auto failed = failedStarts.find(over.run); failed != failedStarts.end()) {
            MarkEnded(connection, over.run, failed->second, {});
            continue;
        }
        const std::optional<RunRemains> remains = host.Remains(over.run);
        if (!remains) {
            if (!std::exchange(over.saidUnreadable, true)) {
                syslog(LOG_ERR, "the ending of run %lld cannot be read for now: %s",
                       static_cast<long long>(over.run), std::strerror(errno));
            }
            step.unreadable.insert(over.run);
        } else if (remains->ending) {
            MarkEnded(connection, over.run, *remains->ending, remains->output);
        } else {
            MarkLost(connection, over.run, over.whyLost, moment.now, remains->output);
        }
    }
}

void Scheduler::RecordDueTasks(Connection& connection, const Moment& moment, Step& step) {
    const StoredStarts due = ReadDueTasks(connection, moment.now, kDueAtOnce);
    LeaveOut(connection, due.damaged, step);
    for (const auto& [task, start, since] : due.tasks) {
        const DuePlan plan = PlanDueTask(task, start, since, moment);
        for (const PlannedStart& planned : plan.starts) {
            const bool overlaps = planned.why.empty() && WaitsAlready(connection, task);
            InsertRun(connection,
                      {task.id, task.name, planned.occurrence, planned.reason,
                       overlaps ? kWhyOverlap : planned.why},
                      moment.now);
        }
        // Together with the row of this start: neither is ever there without the other.
        SetNextStart(connection, task.id, plan.next);
        TrimRunsOfTask(connection, task.id);
    }
}

// Whether it may not run beside the run that waits. Otherwise a task would queue one more at each
// of its times while all others take long.
bool Scheduler::WaitsAlready(Connection& connection, const TaskData& task) const {
    // In the store that run may have been stopped meanwhile.
    return !task.Has(kCanRunTaskSameTime) && waiting.HasOf(task.id) &&
           HasQueuedRun(connection, task.id);
}

void Scheduler::ReadQueue(Connection& connection) {
    std::size_t got = kQueuedAtOnce;
    while (got == std::size_t{kQueuedAtOnce}) {
        const std::vector<QueuedRun> runs =
            ReadQueuedRuns(connection, waiting.LastAdded(), kQueuedAtOnce);
        for (const QueuedRun& run : runs) {
            waiting.Add(run);
        }
        got = runs.size();
    }
}

void Scheduler::SkipOutdated(Connection& connection, const Moment& moment) {
    for (int count = 0; HasOutdated(moment) && count < kQueuedAtOnce; ++count) {
        const std::string_view why = WhyNoLongerStarted(waiting.OldestSince(), moment);
        MarkSkipped(connection, waiting.TakeOldest(), why);
    }
}

void Scheduler::StartQueued(Connection& connection, const Moment& moment, Step& step) {
    int looked = 0;
    while (!waiting.Empty() && !HasOutdated(moment) && step.tasks.Count() < options.mostRuns &&
           step.beginnings.size() < kBegunAtOnce && looked++ < kQueuedAtOnce) {
        StartOrEnd(connection, moment, waiting.TakeFirst(), step);
    }
}

void Scheduler::StartOrEnd(Connection& connection, const Moment& moment, std::int64_t run,
                           Step& step) {
    std::optional<TaskOfRun> queued;
    try {
        queued = ReadTaskOfQueued(connection, run);
    } catch (const StoreFailure&) {
        MarkEnded(connection, run, NotStarted(moment.now, kWhyDamaged), {});
        return;
    }
    if (!queued) {
        // Unless somebody has stopped it.
        MarkSkipped(connection, run, kWhyDeleted);
        return;
    }
    if (!queued->reason) {
        MarkEnded(connection, run, NotStarted(moment.now, kWhyRowDamaged), {});
        return;
    }
    const TaskData& task = queued->task;
    const std::string_view why = WhyNotStarted(task, *queued->reason, step.tasks);
    if (why.empty()) {
        StartRun(connection, moment, run, task, step);
    } else {
        MarkSkipped(connection, run, why);
    }
    if (queued->reason == RunReason::kByHand) {
        // Those by the schedule have been trimmed when they were recorded.
        TrimRunsOfTask(connection, task.id);
    }
}

void Scheduler::StartRun(Connection& connection, const Moment& moment, std::int64_t run,
                         const TaskData& task, Step& step) {
    // Before the row says that it goes on: what is made now tells the next scheduler whether it has
    // begun.
    const RunOrder order{run, task.id, task.owner, task.command, {}};
    if (const std::optional<std::string> problem = host.Prepare(order)) {
        MarkEnded(connection, run, NotStarted(moment.now, *problem), {});
        return;
    }
    step.beginnings.push_back({order, task.app});
    step.tasks.Add(task.id, task.app);
    MarkRunning(connection, run, host.BootId(), moment.now);
}

void Scheduler::CorrectStarts(Connection& connection, const Moment& moment, Step& step) const {
    step.corrected = corrected;
    if (!Corrects(moment)) {
        return;
    }
    const StoredStarts found = ReadTasksAfter(connection, *corrected, kCorrectedAtOnce);
    LeaveOut(connection, found.damaged, step);
    for (const auto& [task, start, since] : found.tasks) {
        // What has come by now is dealt with as due.
        if (start <= absl::ToUnixSeconds(moment.now)) {
            continue;
        }
        const StartSecond next = ComputeNextStart(task, moment.zone, moment.now);
        if (next != start) {
            SetNextStart(connection, task.id, next);
        }
    }
    step.corrected =
        found.read < std::size_t{kCorrectedAtOnce} ? std::nullopt : std::optional(found.last);
}

}  // namespace orva
