#include "appliance/scheduler/Scheduler.h"

#include <syslog.h>

#include <algorithm>
#include <string_view>
#include <utility>

#include "appliance/runs/RunTable.h"
#include "appliance/store/DatabaseGuard.h"
#include "appliance/store/TaskTable.h"

namespace orva {
namespace {

// How much is trimmed at once: a transaction should not keep others waiting.
constexpr int kTrimmedTasksAtOnce = 20;
constexpr int kTrimmedRunsAtOnce = 20;

// How often an ending is tried again that could not be read.
constexpr absl::Duration kReadInterval = absl::Milliseconds(500);

// How often a clock that is not trusted is looked at. A time service that finds it right does not
// set it: that wakes nobody.
constexpr absl::Duration kClockInterval = absl::Minutes(1);

constexpr std::string_view kWhyRestarted = "the machine was restarted";
constexpr std::string_view kWhyNoEnding = "its supervisor has left no ending";

absl::Time TimeOf(StartSecond start) {
    return start == kNoStart ? absl::InfiniteFuture() : absl::FromUnixSeconds(start);
}

// Starts may lie years ahead of such a clock: then the history has nothing that would tell.
void LogClockTrust(const Moment& moment) {
    if (moment.clockTrusted) {
        syslog(LOG_NOTICE, "the clock is trusted again");
        return;
    }
    syslog(LOG_WARNING,
           "the clock shows %s, which cannot be right: no task starts by itself until it is set",
           absl::FormatTime("%Y-%m-%dT%H:%M:%SZ", moment.now, absl::UTCTimeZone()).c_str());
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
    ForgetAll();
    Database& database = store.UsedDatabase();
    Guarded(database, [&] {
        // Asked before: one that takes its place from now on is noticed.
        const std::uint64_t present = database.Generation();
        WriteTransaction transaction(database);
        clock.Remember(NewestRecord(*transaction));
        for (const RunningRun& run : ReadRunningRuns(*transaction)) {
            TakeOver(*transaction, run);
        }
        transaction.Commit();
        generation = present;
    });
    for (const std::int64_t run : host.All()) {
        if (running.count(run) == 0) {
            host.Remove(run);
        }
    }
}

// What stands there now, and not only a database that another one has replaced since.
bool Scheduler::HasTakenOver() {
    Database& database = store.UsedDatabase();
    return Guarded(database, [&] { return database.Generation() == generation; });
}

void Scheduler::ForgetAll() {
    generation = 0;
    waiting = {};
    running.clear();
    runningTasks = {};
    ended.clear();
    unreadable.clear();
    failedStarts.clear();
    corrected = 0;
}

void Scheduler::TakeOver(Connection& connection, const RunningRun& run) {
    // Before the host is asked: it may tell at once that the run has ended.
    running.emplace(run.id, RunningTask{run.task, run.app});
    runningTasks.Add(run.task, run.app);
    if (run.bootId != host.BootId()) {
        Ended(run.id, kWhyRestarted);
        return;
    }
    switch (host.Look(run.id)) {
        case RunHost::Trace::kNotBegun:
            running.erase(run.id);
            runningTasks.Remove(run.task, run.app);
            MarkQueued(connection, run.id);
            return;
        case RunHost::Trace::kOver:
            Ended(run.id, kWhyNoEnding);
            return;
        case RunHost::Trace::kGoesOn:
            return;
    }
}

void Scheduler::RunEnded(std::int64_t run) { Ended(run, kWhyNoEnding); }

void Scheduler::Ended(std::int64_t run, std::string_view whyLost) {
    ended.push_back({run, whyLost});
    // At once, and not when its ending is stored: it is in nobody's way any more.
    if (const auto task = running.find(run); task != running.end()) {
        runningTasks.Remove(task->second.task, task->second.app);
        task->second.over = true;
    }
}

void Scheduler::ClockWasSet() {
    clock.ClockWasSet();
    clockWasSet = true;
    corrected = 0;
}

absl::Time Scheduler::Work() {
    if (!HasTakenOver()) {
        Recover();
    }
    const Moment moment = CurrentMoment();
    if (ended.empty()) {
        ended.swap(unreadable);
    }
    if (moment.zone != zoneOfStarts) {
        zoneOfStarts = moment.zone;
        corrected = 0;
    }
    if (moment.clockTrusted != clockTrusted) {
        clockTrusted = moment.clockTrusted;
        corrected = 0;
        LogClockTrust(moment);
    }
    return Guarded(store.UsedDatabase(), [&] {
        if (HasWork(moment)) {
            DoWork(moment);
        }
        return NextCall(moment);
    });
}

// Without the write lock: most calls find nothing to do.
bool Scheduler::HasWork(const Moment& moment) {
    if (!ended.empty() || Corrects(moment) || RecordsClock(moment) || CanStart() ||
        HasOutdated(moment)) {
        return true;
    }
    Database::Lease lease(store.UsedDatabase());
    return TimeOf(EarliestStart(*lease)) <= moment.now ||
           !ReadQueuedRuns(*lease, waiting.LastAdded(), 1).empty();
}

void Scheduler::DoWork(const Moment& moment) {
    Step step;
    try {
        StoreStep(moment, step);
    } catch (...) {
        // They wait still; read anew, since some were taken out.
        waiting = {};
        for (const Beginning& beginning : step.beginnings) {
            host.Remove(beginning.order.run);
        }
        throw;
    }
    if (step.otherDatabase) {
        return;
    }
    clockWasSet = clockWasSet && !step.recordsClock;
    corrected = step.corrected;
    runningTasks = std::move(step.tasks);
    ForgetEnded(step);
    for (const DamagedTask& task : step.damaged) {
        syslog(LOG_ERR, "task store %s: %s: it is not started any more",
               store.UsedDatabase().File().c_str(), task.problem.c_str());
    }
    for (const Beginning& beginning : step.beginnings) {
        Begin(beginning);
    }
}

// All that the step has stored; the others come again.
void Scheduler::ForgetEnded(const Step& step) {
    for (std::size_t count = 0; count < step.endings; ++count) {
        const EndedRun over = ended.front();
        ended.pop_front();
        if (step.unreadable.count(over.run) != 0) {
            unreadable.push_back(over);
            continue;
        }
        running.erase(over.run);
        failedStarts.erase(over.run);
        host.Remove(over.run);
    }
}

void Scheduler::Begin(const Beginning& beginning) {
    const std::int64_t run = beginning.order.run;
    running.emplace(run, RunningTask{beginning.order.task, beginning.app});
    if (std::optional<std::string> problem = host.Start(run)) {
        failedStarts.emplace(run, NotStarted(Now(), *std::move(problem)));
        RunEnded(run);
    }
}

bool Scheduler::Corrects(const Moment& moment) const {
    return corrected.has_value() && moment.clockTrusted;
}

// A clock that is still wrong is set once more.
bool Scheduler::RecordsClock(const Moment& moment) const {
    return clockWasSet && moment.clockTrusted;
}

bool Scheduler::CanStart() const {
    return !waiting.Empty() && runningTasks.Count() < options.mostRuns;
}

bool Scheduler::HasOutdated(const Moment& moment) const {
    return !WhyNoLongerStarted(waiting.OldestSince(), moment).empty();
}

absl::Time Scheduler::NextCall(const Moment& moment) {
    if (!ended.empty() || Corrects(moment) || CanStart() || HasOutdated(moment) ||
        store.UsedDatabase().Generation() != generation) {
        return absl::InfinitePast();
    }
    Database::Lease lease(store.UsedDatabase());
    const absl::Time start = TimeOf(EarliestStart(*lease));
    if (start <= moment.now) {
        // More has come than one step takes.
        return absl::InfinitePast();
    }
    absl::Time next = std::min(start, waiting.OldestSince() + kQueuePatience + absl::Seconds(1));
    if (!moment.clockTrusted) {
        next = std::min(next, moment.now + kClockInterval);
    }
    return unreadable.empty() ? next : std::min(next, moment.now + kReadInterval);
}

std::optional<std::string> Scheduler::Stop(std::int64_t run) {
    if (!HasTakenOver()) {
        return "the scheduler is only just starting; try again";
    }
    if (const auto found = running.find(run); found != running.end() && !found->second.over) {
        host.Stop(run);
        return std::nullopt;
    }
    Database& database = store.UsedDatabase();
    return Guarded(database, [&]() -> std::optional<std::string> {
        WriteTransaction transaction(database);
        if (CancelQueued(*transaction, run)) {
            transaction.Commit();
            return std::nullopt;
        }
        return ReadRun(*transaction, run) ? "it is not running" : "no such run";
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
