#include "appliance/scheduler/Scheduler.h"

#include <syslog.h>

#include <algorithm>
#include <limits>
#include <string_view>

#include "appliance/runs/RunTable.h"
#include "appliance/store/DatabaseGuard.h"
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
constexpr int kTrimmedTasksAtOnce = 20;
constexpr int kTrimmedRunsAtOnce = 20;

constexpr std::string_view kWhyRestarted = "the machine was restarted";
constexpr std::string_view kWhyNoTrace = "its supervisor has left no ending";
constexpr const char* kWhyDamaged = "its task is damaged";

RunTime RunTimeOf(absl::Time time) {
    return RunTime(std::chrono::microseconds(absl::ToUnixMicros(time)));
}

absl::Time TimeOf(StartSecond start) {
    return start == kNoStart ? absl::InfiniteFuture() : absl::FromUnixSeconds(start);
}

}  // namespace

Scheduler::Scheduler(TaskStore& taskStore, RunHost& runHost, Options schedulerOptions)
    : store(taskStore),
      host(runHost),
      options(std::move(schedulerOptions)),
      clock(options.programMade),
      zoneOfStarts(taskStore.Zone()) {}

Moment Scheduler::CurrentMoment() {
    Moment moment;
    moment.now = store.Now();
    moment.zone = store.Zone();
    moment.machineStarted = moment.now - options.uptime();
    moment.clockTrusted = clock.Trusts(moment.now, options.clockSynchronised());
    return moment;
}

void Scheduler::Recover() {
    running.clear();
    runningTasks = {};
    ended.clear();
    ForgetQueue();
    Database& database = store.UsedDatabase();
    Guarded(database, [&] {
        WriteTransaction transaction(database);
        clock.Remember(NewestRecord(*transaction));
        const Moment moment = CurrentMoment();
        clockTrusted = moment.clockTrusted;
        for (const RunningRun& run : ReadRunningRuns(*transaction)) {
            TakeOver(*transaction, run);
        }
        ResumeQueue(*transaction, moment);
        transaction.Commit();
    });
    for (const std::int64_t run : host.All()) {
        if (running.count(run) == 0) {
            host.Remove(run);
        }
    }
}

void Scheduler::TakeOver(Connection& connection, const RunningRun& run) {
    const bool sameBoot = run.bootId == host.BootId();
    const RunHost::Trace trace = sameBoot ? host.Look(run.id) : RunHost::Trace::kOver;
    if (trace == RunHost::Trace::kNotBegun) {
        MarkQueued(connection, run.id);
        return;
    }
    running.emplace(run.id, RunningTask{run.task, run.app});
    if (trace == RunHost::Trace::kOver) {
        ended.push_back({run.id, sameBoot ? kWhyNoTrace : kWhyRestarted});
    } else {
        runningTasks.Add(run.task, run.app);
    }
}

void Scheduler::ResumeQueue(Connection& connection, const Moment& moment) {
    std::int64_t last = 0;
    for (;;) {
        const std::vector<QueuedRun> runs = ReadQueuedRuns(connection, last, kQueuedAtOnce);
        for (const QueuedRun& run : runs) {
            last = run.id;
            if (const std::string_view why = WhyNotResumed(run.due, moment); !why.empty()) {
                MarkSkipped(connection, run.id, why);
            }
        }
        if (runs.empty()) {
            return;
        }
    }
}

void Scheduler::RunEnded(std::int64_t run) {
    ended.push_back({run, kWhyNoTrace});
    // At once, and not when its ending is stored: it is in nobody's way any more.
    if (const auto task = running.find(run); task != running.end()) {
        runningTasks.Remove(task->second.task, task->second.app);
    }
}

void Scheduler::ClockWasSet() {
    clock.ClockWasSet();
    corrected = 0;
}

absl::Time Scheduler::Work() {
    const Moment moment = CurrentMoment();
    if (moment.zone != zoneOfStarts || moment.clockTrusted != clockTrusted) {
        zoneOfStarts = moment.zone;
        clockTrusted = moment.clockTrusted;
        corrected = 0;
    }
    Database& database = store.UsedDatabase();
    return Guarded(database, [&] {
        if (HasWork(moment)) {
            try {
                DoWork(moment);
            } catch (...) {
                ForgetQueue();
                throw;
            }
        }
        return NextCall(moment);
    });
}

// Without the write lock: most calls find nothing to do.
bool Scheduler::HasWork(const Moment& moment) {
    if (!ended.empty() || Corrects(moment) || CanStart()) {
        return true;
    }
    Database::Lease lease(store.UsedDatabase());
    return TimeOf(EarliestStart(*lease)) <= moment.now ||
           !ReadQueuedRuns(*lease, lastQueued, 1).empty();
}

void Scheduler::DoWork(const Moment& moment) {
    Step step;
    step.endings = std::min(ended.size(), kEndingsAtOnce);
    step.tasks = runningTasks;
    WriteTransaction transaction(store.UsedDatabase());
    StoreEndings(*transaction, moment, step.endings);
    const bool more = RecordDueTasks(*transaction, moment, step);
    ReadQueue(*transaction);
    StartQueued(*transaction, moment, step);
    const std::optional<std::int64_t> nowCorrected = CorrectStarts(*transaction, moment, step);
    transaction.Commit();

    moreDue = more;
    corrected = nowCorrected;
    runningTasks = std::move(step.tasks);
    for (; step.endings > 0; --step.endings) {
        const std::int64_t run = ended.front().run;
        ended.pop_front();
        running.erase(run);
        failedStarts.erase(run);
        host.Remove(run);
    }
    for (const DamagedTask& task : step.damaged) {
        syslog(LOG_ERR, "task store %s: %s: it is not started any more",
               store.UsedDatabase().File().c_str(), task.problem.c_str());
    }
    for (const Beginning& beginning : step.beginnings) {
        Begin(beginning);
    }
}

// Takes away the next start alone: somebody may still mend the rest.
void Scheduler::LeaveOut(Connection& connection, const std::vector<DamagedTask>& tasks,
                         Step& step) {
    for (const DamagedTask& task : tasks) {
        SetNextStart(connection, task.id, kNoStart);
        step.damaged.push_back(task);
    }
}

void Scheduler::StoreEndings(Connection& connection, const Moment& moment, std::size_t endings) {
    for (std::size_t index = 0; index < endings; ++index) {
        const auto& [run, whyLost] = ended[index];
        const auto failed = failedStarts.find(run);
        if (failed != failedStarts.end()) {
            MarkEnded(connection, run, failed->second, {});
        } else if (const std::optional<RunEnding> ending = host.Ending(run)) {
            MarkEnded(connection, run, *ending, host.Output(run));
        } else {
            MarkLost(connection, run, whyLost, moment.now, host.Output(run));
        }
    }
}

// Whether there may be more of them.
bool Scheduler::RecordDueTasks(Connection& connection, const Moment& moment, Step& step) {
    const StoredStarts due = ReadDueTasks(connection, moment.now, kDueAtOnce);
    LeaveOut(connection, due.damaged, step);
    for (const auto& [task, start] : due.tasks) {
        const DuePlan plan = PlanDueTask(task, start, moment);
        for (const PlannedStart& planned : plan.starts) {
            InsertRun(connection,
                      {task.id, task.name, planned.occurrence, planned.reason, planned.why},
                      moment.now);
        }
        // Together with the row of this start: neither is ever there without the other.
        SetNextStart(connection, task.id, plan.next);
        TrimRunsOfTask(connection, task.id);
    }
    return due.read == std::size_t{kDueAtOnce};
}

void Scheduler::ReadQueue(Connection& connection) {
    std::size_t got = kQueuedAtOnce;
    while (got == std::size_t{kQueuedAtOnce}) {
        const std::vector<QueuedRun> runs = ReadQueuedRuns(connection, lastQueued, kQueuedAtOnce);
        for (const QueuedRun& run : runs) {
            queue.emplace(run.due, run.id);
            lastQueued = run.id;
        }
        got = runs.size();
    }
}

void Scheduler::StartQueued(Connection& connection, const Moment& moment, Step& step) {
    int looked = 0;
    while (!queue.empty() && step.tasks.Count() < options.mostRuns &&
           step.beginnings.size() < kBegunAtOnce && looked++ < kQueuedAtOnce) {
        const std::int64_t run = queue.begin()->second;
        queue.erase(queue.begin());
        std::optional<TaskOfRun> queued;
        try {
            queued = ReadTaskOfQueued(connection, run);
        } catch (const StoreFailure&) {
            RunEnding ending;
            ending.ended = RunTimeOf(moment.now);
            ending.why = kWhyDamaged;
            MarkEnded(connection, run, ending, {});
            continue;
        }
        if (!queued) {
            // Its task was removed.
            continue;
        }
        const TaskData& task = queued->task;
        const std::string_view why = WhyNotStarted(task, queued->reason, step.tasks);
        if (why.empty()) {
            MarkRunning(connection, run, host.BootId(), moment.now);
        } else {
            MarkSkipped(connection, run, why);
        }
        if (queued->reason == RunReason::kByHand) {
            // Those by the schedule have been trimmed when they were recorded.
            TrimRunsOfTask(connection, task.id);
        }
        if (!why.empty()) {
            continue;
        }
        step.tasks.Add(task.id, task.app);
        Beginning beginning;
        beginning.order.run = run;
        beginning.order.task = task.id;
        beginning.order.owner = task.owner;
        beginning.order.command = task.command;
        beginning.app = task.app;
        step.beginnings.push_back(std::move(beginning));
    }
}

// Yields where to go on.
std::optional<std::int64_t> Scheduler::CorrectStarts(Connection& connection, const Moment& moment,
                                                     Step& step) const {
    if (!Corrects(moment)) {
        return corrected;
    }
    const StoredStarts found = ReadTasksAfter(connection, *corrected, kCorrectedAtOnce);
    LeaveOut(connection, found.damaged, step);
    for (const auto& [task, start] : found.tasks) {
        // What has come by now is dealt with as due.
        if (TimeOf(start) <= moment.now) {
            continue;
        }
        const StartSecond next = ComputeNextStart(task, moment.zone, moment.now);
        if (next != start) {
            SetNextStart(connection, task.id, next);
        }
    }
    return found.read < std::size_t{kCorrectedAtOnce} ? std::nullopt : std::optional(found.last);
}

void Scheduler::Begin(const Beginning& beginning) {
    const std::int64_t run = beginning.order.run;
    running.emplace(run, RunningTask{beginning.order.task, beginning.app});
    if (std::optional<std::string> problem = host.Start(beginning.order)) {
        RunEnding ending;
        ending.ended = RunTimeOf(Now());
        ending.why = *std::move(problem);
        failedStarts.emplace(run, std::move(ending));
        RunEnded(run);
    }
}

// It is read anew from the store.
void Scheduler::ForgetQueue() {
    queue.clear();
    lastQueued = 0;
}

bool Scheduler::Corrects(const Moment& moment) const {
    return corrected.has_value() && moment.clockTrusted;
}

bool Scheduler::CanStart() const {
    return !queue.empty() && runningTasks.Count() < options.mostRuns;
}

absl::Time Scheduler::NextCall(const Moment& moment) {
    if (!ended.empty() || moreDue || Corrects(moment) || CanStart()) {
        return absl::InfinitePast();
    }
    Database::Lease lease(store.UsedDatabase());
    return TimeOf(EarliestStart(*lease));
}

std::optional<std::string> Scheduler::Stop(std::int64_t run) {
    const bool over = std::any_of(ended.begin(), ended.end(),
                                  [run](const EndedRun& each) { return each.run == run; });
    if (running.count(run) != 0 && !over) {
        host.Stop(run);
        return std::nullopt;
    }
    Database& database = store.UsedDatabase();
    return Guarded(database, [&] {
        Database::Lease lease(database);
        return ReadRun(*lease, run) ? "it is not running" : "no such run";
    });
}

bool Scheduler::RemoveOldRuns() {
    const Moment moment = CurrentMoment();
    if (!moment.clockTrusted) {
        return false;
    }
    const absl::Time oldest = moment.now - kRunsKeptFor;
    Database& database = store.UsedDatabase();
    return Guarded(database, [&] {
        for (int count = 0; count < kTrimmedTasksAtOnce; ++count) {
            std::optional<int> task;
            bool hasOld = false;
            {
                Database::Lease lease(database);
                task = NextTaskWithRuns(*lease, trimmedTask);
                hasOld = task && HasOldRuns(*lease, *task, oldest);
            }
            if (!task) {
                trimmedTask = 0;
                return false;
            }
            if (hasOld) {
                WriteTransaction transaction(database);
                const int removed =
                    orva::RemoveOldRuns(*transaction, *task, oldest, kTrimmedRunsAtOnce);
                transaction.Commit();
                if (removed == kTrimmedRunsAtOnce) {
                    return true;
                }
            }
            trimmedTask = *task;
        }
        return true;
    });
}

}  // namespace orva
