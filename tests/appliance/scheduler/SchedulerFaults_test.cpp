// Ends in the middle of a step, a store that fails or is damaged.
#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>

#include <stdexcept>
#include <string>

#include "appliance/store/StoreFailure.h"
#include "tests/appliance/scheduler/Instants.h"
#include "tests/appliance/scheduler/SchedulerTest.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

using SchedulerFaultsTest = SchedulerTest;

constexpr std::uint16_t kTogether = orva::kCanRunAppSameTime | orva::kCanRunTaskSameTime;

// What a kill is to the scheduler's own steps.
struct Killed : std::exception {};

TEST_F(SchedulerFaultsTest, WhatWasMissedWhileTheMachineWasOffIsRecordedAsThat) {
    AddTask("a", 18, 0);
    options.uptime = [] { return absl::Minutes(5); };
    SetNow("2026-05-04 09:00:00");
    RestartAndRecover();
    Work();
    EXPECT_THAT(Started(), IsEmpty());
    EXPECT_THAT(History(), ElementsAre("a 05-03 18:00 schedule skipped machine off"));
}

TEST_F(SchedulerFaultsTest, TheLatestMissedStartIsMadeUpForOnce) {
    orva::TaskData task = SampleTask("a");
    task.schedule.runMissed = true;
    AddTask(task);
    SetNow("2026-05-04 09:00:00");
    RestartAndRecover();
    Work();
    RestartAndRecover();
    Work();
    EXPECT_THAT(Started(), ElementsAre("true"));
    EXPECT_THAT(History(), ElementsAre("a 05-04 06:30 missed running -"));
}

TEST_F(SchedulerFaultsTest, AnEndBeforeTheRowLosesNothing) {
    AddTask("a", 12, 30);
    SetNow("2026-05-01 12:30:00");
    // Never worked.
    RestartAndRecover();
    Work();
    EXPECT_THAT(Started(), ElementsAre("a"));
}

TEST_F(SchedulerFaultsTest, ARunWhoseProcessWasNotStartedBeforeTheEndIsStartedAfterIt) {
    AddTask("a", 12, 30);
    SetNow("2026-05-01 12:30:00");
    host.beforeStart = [] { throw Killed(); };
    EXPECT_THROW(Work(), Killed);
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule running -"));
    host.beforeStart = nullptr;
    SetNow("2026-05-01 12:30:40");
    RestartAndRecover();
    Work();
    EXPECT_THAT(Started(), ElementsAre("a"));
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule running -"));
}

TEST_F(SchedulerFaultsTest, ARunThatGoesOnIsFollowedByTheNextScheduler) {
    orva::TaskData task = SampleTask("a");
    task.schedule.firstMinute = 0;
    task.schedule.intervalMinutes = 1;
    AddTask(task);
    SetNow("2026-05-01 12:01:00");
    Work();
    RestartAndRecover();
    Work();
    EXPECT_EQ(host.started.size(), 1U);
    // Known well enough to be in the way of the next start.
    SetNow("2026-05-01 12:02:00");
    Work();
    End(1, 4);
    Work();
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:01 schedule ended -",
                                       "a 05-01 12:02 schedule skipped overlap"));
    EXPECT_EQ(Find(1)->exitStatus, 4);
}

TEST_F(SchedulerFaultsTest, ARunThatEndedMeanwhileIsTakenInByTheNextScheduler) {
    AddTask("a", 12, 30);
    SetNow("2026-05-01 12:30:00");
    Work();
    End(1, 5);
    // The end comes before that is stored.
    RestartAndRecover();
    Work();
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule ended -"));
    EXPECT_EQ(Find(1)->exitStatus, 5);
    EXPECT_THAT(Started(), ElementsAre("a"));
    EXPECT_THAT(host.folders, IsEmpty());
}

TEST_F(SchedulerFaultsTest, ARunThatIsGoneWithoutAnEndingIsLost) {
    AddTask("a", 12, 30);
    SetNow("2026-05-01 12:30:00");
    Work();
    host.goingOn.clear();
    host.outputs[1] = {"so far", "", 0, 6};
    RestartAndRecover();
    Work();
    EXPECT_THAT(History(),
                ElementsAre("a 05-01 12:30 schedule lost its supervisor has left no ending"));
    EXPECT_EQ(orva::RunStore::Current()->Output(1)->head, "so far");
    EXPECT_THAT(Started(), ElementsAre("a"));
}

TEST_F(SchedulerFaultsTest, AnEndingThatCannotBeReadForNowIsReadLater) {
    options.mostRuns = 100;
    RestartAndRecover();
    for (int count = 0; count < 40; ++count) {
        AddTask("a", 12, 30, kTogether);
    }
    SetNow("2026-05-01 12:30:00");
    Work();
    for (std::int64_t run = 1; run <= 40; ++run) {
        End(run, 3);
    }
    host.outputs[7] = {"printed", "", 0, 7};
    host.unreadable = true;
    TakeLog();
    EXPECT_EQ(Work(), Utc("2026-05-01 12:30:00") + absl::Milliseconds(500));
    EXPECT_EQ(Work(), Utc("2026-05-01 12:30:00") + absl::Milliseconds(500));
    const std::vector<std::string> log = TakeLog();
    ASSERT_EQ(log.size(), 40U);
    EXPECT_EQ(log[0], "the ending of run 1 cannot be read for now: Too many open files");
    EXPECT_EQ(Find(1)->state, orva::RunState::kRunning);
    EXPECT_EQ(scheduler->Stop(1), "it is not running");
    EXPECT_EQ(host.folders.size(), 40U);

    host.unreadable = false;
    EXPECT_EQ(Work(), Utc("2026-05-02 12:30:00"));
    EXPECT_EQ(orva::RunStore::Current()->List({{}, orva::RunState::kEnded}, 0, 0).total, 40);
    EXPECT_EQ(Find(1)->exitStatus, 3);
    EXPECT_EQ(orva::RunStore::Current()->Output(7)->head, "printed");
    EXPECT_THAT(host.folders, IsEmpty());
}

TEST_F(SchedulerFaultsTest, ARunOfAnEarlierBootIsLostUnlessItHadEnded) {
    AddTask("a", 12, 30, kTogether);
    AddTask("b", 12, 30, kTogether);
    SetNow("2026-05-01 12:30:00");
    Work();
    End(2);
    host.goingOn.clear();
    host.folders.erase(1);
    host.bootId = "next boot";
    RestartAndRecover();
    Work();
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule lost the machine was restarted",
                                       "b 05-01 12:30 schedule ended -"));
    EXPECT_THAT(Started(), ElementsAre("a", "b"));
}

TEST_F(SchedulerFaultsTest, WhatAnEndedRunHasLeftBehindIsRemoved) {
    host.folders = {17, 18};
    RestartAndRecover();
    EXPECT_THAT(host.folders, IsEmpty());
}

TEST_F(SchedulerFaultsTest, RunsThatWaitedAreStartedByTheNextSchedulerUnlessItComesTooLate) {
    options.mostRuns = 1;
    RestartAndRecover();
    AddTask("a", 12, 30, kTogether);
    AddTask("b", 12, 30, kTogether);
    SetNow("2026-05-01 12:30:00");
    Work();
    SetNow("2026-05-01 13:00:00");
    RestartAndRecover();
    Work();
    End(1);
    Work();
    EXPECT_THAT(Started(), ElementsAre("a", "b"));

    AddTask("c", 13, 10, kTogether);
    SetNow("2026-05-01 13:10:00");
    Work();
    SetNow("2026-05-01 15:00:00");
    RestartAndRecover();
    End(2);
    Work();
    EXPECT_THAT(Started(), ElementsAre("a", "b"));
    EXPECT_THAT(History(),
                ElementsAre("a 05-01 12:30 schedule ended -", "b 05-01 12:30 schedule ended -",
                            "c 05-01 13:10 schedule skipped missed"));
}

TEST_F(SchedulerFaultsTest, ALockedDatabaseDelaysAndLosesNothing) {
    AddTask("a", 12, 30);
    Reopen(std::chrono::milliseconds(10));
    scheduler = std::make_unique<orva::Scheduler>(*orva::TaskStore::Current(), host, options);
    scheduler->Recover();
    Work();
    SetNow("2026-05-01 12:30:00");
    {
        SQLite::Database other(DatabasePath(), SQLite::OPEN_READWRITE);
        other.exec("BEGIN IMMEDIATE");
        EXPECT_THROW(Work(), orva::StoreFailure);
        EXPECT_THROW(Work(), orva::StoreFailure);
        EXPECT_THAT(Started(), IsEmpty());
        other.exec("ROLLBACK");
    }
    SetNow("2026-05-01 12:30:10");
    Work();
    EXPECT_THAT(Started(), ElementsAre("a"));
    {
        SQLite::Database other(DatabasePath(), SQLite::OPEN_READWRITE);
        other.exec("BEGIN IMMEDIATE");
        End(1, 3);
        EXPECT_THROW(Work(), orva::StoreFailure);
        other.exec("ROLLBACK");
    }
    Work();
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule ended -"));
    EXPECT_EQ(Find(1)->exitStatus, 3);
}

TEST_F(SchedulerFaultsTest, WhatWaitsIsStillKnownAfterAFailureOfTheStore) {
    options.mostRuns = 1;
    Reopen(std::chrono::milliseconds(10));
    scheduler = std::make_unique<orva::Scheduler>(*orva::TaskStore::Current(), host, options);
    scheduler->Recover();
    AddTask("a", 12, 30, kTogether);
    AddTask("b", 12, 30, kTogether);
    SetNow("2026-05-01 12:30:00");
    Work();
    {
        SQLite::Database other(DatabasePath(), SQLite::OPEN_READWRITE);
        other.exec("BEGIN IMMEDIATE");
        End(1);
        EXPECT_THROW(Work(), orva::StoreFailure);
        other.exec("ROLLBACK");
    }
    Work();
    EXPECT_THAT(Started(), ElementsAre("a", "b"));
}

TEST_F(SchedulerFaultsTest, RunsThatEndedTogetherWithTheDatabaseLockedAreInNobodysWay) {
    Reopen(std::chrono::milliseconds(10));
    scheduler = std::make_unique<orva::Scheduler>(*orva::TaskStore::Current(), host, options);
    scheduler->Recover();
    for (int count = 0; count < 40; ++count) {
        orva::TaskData task = SampleTask("task " + std::to_string(count));
        task.flags |= orva::kCanRunAppSameTime;
        task.schedule.firstMinute = 0;
        task.schedule.intervalMinutes = 1;
        AddTask(task);
    }
    SetNow("2026-05-01 12:01:00");
    Work();
    ASSERT_EQ(host.started.size(), 40U);
    for (std::int64_t run = 1; run <= 40; ++run) {
        End(run);
    }
    SetNow("2026-05-01 12:02:00");
    {
        SQLite::Database other(DatabasePath(), SQLite::OPEN_READWRITE);
        other.exec("BEGIN IMMEDIATE");
        EXPECT_THROW(Work(), orva::StoreFailure);
        other.exec("ROLLBACK");
    }
    Work();
    EXPECT_EQ(host.started.size(), 80U);
    EXPECT_EQ(orva::RunStore::Current()->List({{}, orva::RunState::kSkipped}, 0, 0).total, 0);
}

TEST_F(SchedulerFaultsTest, RunsThatEndedWhileNoSchedulerRanAreInNobodysWay) {
    for (int count = 0; count < 40; ++count) {
        orva::TaskData task = SampleTask("task " + std::to_string(count));
        task.flags |= orva::kCanRunAppSameTime;
        task.schedule.firstMinute = 0;
        task.schedule.intervalMinutes = 1;
        AddTask(task);
    }
    SetNow("2026-05-01 12:01:00");
    Work();
    ASSERT_EQ(host.started.size(), 40U);
    host.goingOn.clear();
    SetNow("2026-05-01 12:02:00");
    RestartAndRecover();
    Work();
    EXPECT_EQ(host.started.size(), 80U);
    EXPECT_EQ(orva::RunStore::Current()->List({{}, orva::RunState::kLost}, 0, 0).total, 40);
}

TEST_F(SchedulerFaultsTest, ADamagedTaskIsLeftOutAndTheOthersGoOn) {
    const int damaged = AddTask("damaged", 12, 30, kTogether);
    AddTask("a", 12, 30, kTogether);
    Execute("UPDATE task SET first_minute = 99999 WHERE id = " + std::to_string(damaged));
    SetNow("2026-05-01 12:30:00");
    TakeLog();
    EXPECT_EQ(Work(), Utc("2026-05-02 12:30:00"));
    SetNow("2026-05-02 12:30:00");
    Work();
    scheduler->ClockWasSet();
    RestartAndRecover();
    Work();
    EXPECT_THAT(TakeLog(), ElementsAre("task store " + DatabasePath() +
                                       ": task 1: column first_minute holds 99999: it is not "
                                       "started any more"));
    EXPECT_THAT(Started(), ElementsAre("a", "a"));
    EXPECT_EQ(NextStart(damaged), "-");
}

TEST_F(SchedulerFaultsTest, ATaskThatIsDamagedBeforeItsTimeDoesNotStopTheOthers) {
    AddTask("a", 18, 0, kTogether);
    const int damaged = AddTask("damaged", 18, 30, kTogether);
    AddTask("b", 19, 0, kTogether);
    Execute("UPDATE task SET date = 'never' WHERE id = " + std::to_string(damaged));
    ::setenv("TZ", "Europe/Berlin", 1);
    EXPECT_EQ(Work(), Utc("2026-05-01 16:00:00"));
    ::setenv("TZ", "UTC", 1);
    EXPECT_EQ(NextStart(damaged), "-");
    EXPECT_EQ(NextStart(3), "05-01 17:00");
}

TEST_F(SchedulerFaultsTest, ANextStartThatIsNoNumberWakesNobody) {
    const int damaged = AddTask("damaged", 12, 30, kTogether);
    Work();
    Execute("UPDATE task SET next_start = 'soon' WHERE id = " + std::to_string(damaged));
    EXPECT_EQ(Work(), absl::InfiniteFuture());
    RestartAndRecover();
    EXPECT_EQ(Work(), Utc("2026-05-01 12:30:00"));
}

TEST_F(SchedulerFaultsTest, ANextStartFarBeforeAllTimeIsMissed) {
    const int damaged = AddTask("a", 12, 30);
    Execute("UPDATE task SET next_start = -9223372036854775808 WHERE id = " +
            std::to_string(damaged));
    EXPECT_EQ(Work(), Utc("2026-05-01 12:30:00"));
    EXPECT_THAT(History(), ElementsAre("a 04-30 12:30 schedule skipped missed"));
}

TEST_F(SchedulerFaultsTest, TheWalkOverOldRunsEndsWhateverADamagedRowHolds) {
    constexpr int kPlenty = 1000;
    for (const char* task : {"1", "'x'", "4294967297"}) {
        Execute(
            "INSERT INTO run (task, reason, state, queued_at, asked_program, asked_account) "
            "VALUES (" +
            std::string(task) + ", 'hand', 'ended', 0, '', '')");
    }
    int steps = 0;
    while (steps < kPlenty && scheduler->RemoveOldRuns()) {
        ++steps;
    }
    EXPECT_LT(steps, kPlenty);
    EXPECT_EQ(Find(1), std::nullopt);
}

TEST_F(SchedulerFaultsTest, ARunOfATaskThatIsDamagedMeanwhileEndsWithTheReason) {
    options.mostRuns = 1;
    RestartAndRecover();
    AddTask("a", 12, 30, kTogether);
    const int damaged = AddTask("b", 12, 30, kTogether);
    AddTask("c", 12, 30, kTogether);
    SetNow("2026-05-01 12:30:00");
    Work();
    Execute("UPDATE task SET first_minute = 99999 WHERE id = " + std::to_string(damaged));
    End(1);
    Work();
    EXPECT_THAT(Started(), ElementsAre("a", "c"));
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule ended -",
                                       "b 05-01 12:30 schedule ended its task is damaged",
                                       "c 05-01 12:30 schedule running -"));
}

}  // namespace
