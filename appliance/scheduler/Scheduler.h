#pragma once

#include <absl/time/time.h>

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "appliance/runs/RunWriter.h"
#include "appliance/scheduler/ClockTrust.h"
#include "appliance/scheduler/Planner.h"
#include "appliance/scheduler/RunHost.h"
#include "appliance/scheduler/WaitingRuns.h"
#include "appliance/store/TaskStore.h"
#include "appliance/store/TaskTable.h"

namespace orva {

// Carries out what the planner decides, on the task store and a host of runs. Knows neither an
// event loop nor a clock of its own: who drives it calls Work() when something may have changed,
// and again when Work() has said so.
//
// Every step is one transaction, and what has to survive is committed before the host is told of
// it: however the program ends, the next one finds in the store and at the host how far it got.
//
// Functions throw StoreFailure when the store fails; nothing is lost then, and the step is done
// again at the next call. Belongs to one thread.
class Scheduler {
  public:
    struct Options {
        // How many runs may go on at once.
        std::size_t mostRuns = 64;
        // When this program was made: no right clock stands before that.
        absl::Time programMade = absl::InfinitePast();
        // How long the machine has been running.
        std::function<absl::Duration()> uptime = [] { return absl::InfiniteDuration(); };
        // Whether the kernel has its time from a time service.
        std::function<bool()> clockSynchronised = [] { return false; };
    };

    // All three must outlive the scheduler.
    Scheduler(TaskStore& taskStore, RunHost& runHost, Options schedulerOptions);

    // Takes over what an earlier scheduler has left. Work() does the same before anything else, and
    // again when another database has taken the place of the former one.
    void Recover();

    // Does a part of what there is to do. Yields when to be called again at the latest: a time that
    // has passed when there is more to do at once.
    absl::Time Work();

    // A run of the host has ended. Throws nothing.
    void RunEnded(std::int64_t run);
    // Somebody has set the clock. Throws nothing.
    void ClockWasSet();
    // Throws nothing.
    void SetMostRuns(std::size_t mostRuns) { options.mostRuns = mostRuns; }

    // Ends a run that goes on, or takes one that waits out of the queue. Nothing when that is done
    // or under way, else why it cannot be: before Recover() has succeeded nobody knows what goes
    // on.
    std::optional<std::string> Stop(std::int64_t run);

    // Removes some of the runs that are too old to be kept. True as long as there may be more.
    bool RemoveOldRuns();

    std::size_t RunsGoingOn() const { return running.size(); }

  private:
    struct RunningTask {
        int task = 0;
        std::string app;
        // It has ended, and its row does not say so yet.
        bool over = false;
    };
    struct EndedRun {
        std::int64_t run = 0;
        // What is said of it when nobody knows how it ended.
        std::string_view whyLost;
        // It has been logged that what it has left cannot be read.
        bool saidUnreadable = false;
    };
    struct Beginning {
        RunOrder order;
        std::string app;
    };
    // What one transaction does, for what is to follow its commit.
    struct Step {
        // Its database is not the one that was taken over; nothing was done.
        bool otherDatabase = false;
        // So many of the first ended runs are dealt with; these of them cannot be read for now.
        std::size_t endings = 0;
        std::set<std::int64_t> unreadable;
        std::vector<Beginning> beginnings;
        bool recordsClock = false;
        // Up to which task next starts are corrected.
        std::optional<std::int64_t> corrected;
        // Tasks that are left out from now on.
        std::vector<DamagedTask> damaged;
        // The tasks that have runs going on after it.
        RunningTasks tasks;
    };

    absl::Time Now() const { return store.Now(); }
    Moment CurrentMoment();
    bool HasTakenOver();
    void ForgetAll();
    void TakeOver(Connection& connection, const RunningRun& run);
    void Ended(std::int64_t run, std::string_view whyLost);
    bool HasWork(const Moment& moment);
    void DoWork(const Moment& moment);
    void StoreStep(const Moment& moment, Step& step);
    static void LeaveOut(Connection& connection, const std::vector<DamagedTask>& tasks, Step& step);
    void StoreEndings(Connection& connection, const Moment& moment, Step& step);
    void ForgetEnded(const Step& step);
    void RecordDueTasks(Connection& connection, const Moment& moment, Step& step);
    bool WaitsAlready(Connection& connection, const TaskData& task) const;
    void ReadQueue(Connection& connection);
    void SkipOutdated(Connection& connection, const Moment& moment);
    void StartQueued(Connection& connection, const Moment& moment, Step& step);
    void StartOrEnd(Connection& connection, const Moment& moment, std::int64_t run, Step& step);
    void StartRun(Connection& connection, const Moment& moment, std::int64_t run,
                  const TaskData& task, Step& step);
    void CorrectStarts(Connection& connection, const Moment& moment, Step& step) const;
    void Begin(const Beginning& beginning);
    // The ending of a run that could not be started, and why.
    static RunEnding NotStarted(absl::Time now, std::string why);
    bool Corrects(const Moment& moment) const;
    bool RecordsClock(const Moment& moment) const;
    bool CanStart() const;
    bool HasOutdated(const Moment& moment) const;
    absl::Time NextCall(const Moment& moment);

    TaskStore& store;
    RunHost& host;
    Options options;
    ClockTrust clock;

    // The database that was taken over, as Database::Generation() counts; 0 before.
    std::uint64_t generation = 0;

    WaitingRuns waiting;
    std::map<std::int64_t, RunningTask> running;
    // Of those runs the ones that have not ended.
    RunningTasks runningTasks;
    // Runs that have ended and whose rows still say that they go on; and those of them whose
    // endings could not be read, which are tried again after a while.
    std::deque<EndedRun> ended;
    std::deque<EndedRun> unreadable;
    // Why runs could not be begun, until that is stored.
    std::map<std::int64_t, RunEnding> failedStarts;

    // The next starts of tasks up to this id hold for the zone and the clock as they are; nothing
    // when all do.
    std::optional<std::int64_t> corrected = 0;
    absl::TimeZone zoneOfStarts;
    bool clockTrusted = true;
    // The clock was set, and that is not stored yet.
    bool clockWasSet = false;
    // Up to which task old runs have been removed.
    int trimmedTask = 0;
};

}  // namespace orva
