// Clocks that jump, ends in the middle of a step, a store that fails.
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
using testing::SizeIs;

using SchedulerFaultsTest = SchedulerTest;

constexpr std::uint16_t kTogether = orva::kCanRunAppSameTime | orva::kCanRunTaskSameTime;

// What a kill is to the scheduler's own steps.
struct Killed : std::exception {};

TEST_F(SchedulerFaultsTest, AClockPutBackAnHourStartsNothingTwice) {
    orva::TaskData task = SampleTask("a");
    task.flags |= kTogether;
    task.schedule.intervalMinutes = 20;
    task.schedule.firstMinute = 0;
    const int id = AddTask(task);
    for (const char* now : {"2026-05-01 12:20:00", "2026-05-01 12:40:00", "2026-05-01 13:00:00"}) {
        SetNow(now);
        Work();
    }
    EXPECT_EQ(host.started.size(), 3U);
    SetNow("2026-05-01 12:10:00");
    scheduler->ClockWasSet();
    Work();
    EXPECT_EQ(NextStart(id), "05-01 12:20");
    for (const char* now : {"2026-05-01 12:20:00", "2026-05-01 12:40:00", "2026-05-01 13:00:00"}) {
        SetNow(now);
        Work();
    }
    EXPECT_EQ(host.started.size(), 3U);
    SetNow("2026-05-01 13:20:00");
    Work();
    EXPECT_EQ(host.started.size(), 4U);
    EXPECT_THAT(History(), SizeIs(4));
}

TEST_F(SchedulerFaultsTest, AClockPutForwardADayRecordsWhatItJumpedOver) {
    AddTask("plain", 18, 0, kTogether);
    orva::TaskData task = SampleTask("made up for");
    task.flags |= kTogether;
    task.schedule.firstMinute = 19 * 60;
    task.schedule.runMissed = true;
    AddTask(task);
    SetNow("2026-05-02 12:00:00");
    scheduler->ClockWasSet();
    EXPECT_EQ(Work(), Utc("2026-05-02 18:00:00"));
    EXPECT_THAT(History(), ElementsAre("plain 05-01 18:00 schedule skipped missed",
                                       "made up for 05-01 19:00 missed running -"));
}

TEST_F(SchedulerFaultsTest, AfterAMistakenYearNextStartsAreThoseOfTheRightOne) {
    const int id = AddTask("a", 18, 0, kTogether);
    SetNow("2027-05-01 12:00:00");
    scheduler->ClockWasSet();
    Work();
    EXPECT_EQ(NextStart(id), "05-01 18:00");
    SetNow("2026-05-01 13:00:00");
    scheduler->ClockWasSet();
    EXPECT_EQ(Work(), Utc("2026-05-01 18:00:00"));
    SetNow("2026-05-01 18:00:00");
    Work();
    EXPECT_THAT(Started(), ElementsAre("a"));
}

TEST_F(SchedulerFaultsTest, AClockThatStandsBeforeTheProgramWasMadeStartsNothing) {
    options.programMade = Utc("2026-04-01 00:00:00");
    SetNow("2000-01-01 00:00:00");
    RestartAndRecover();
    const int id = AddTask("a", 0, 1);
    SetNow("2000-01-01 00:01:00");
    Work();
    EXPECT_THAT(Started(), IsEmpty());
    EXPECT_THAT(History(), ElementsAre("a 01-01 00:01 schedule skipped clock not trusted"));
    // A time service has asked around by now.
    SetNow("2026-05-01 12:00:00");
    scheduler->ClockWasSet();
    EXPECT_EQ(Work(), Utc("2026-05-02 00:01:00"));
    SetNow("2026-05-02 00:01:00");
    Work();
    EXPECT_THAT(Started(), ElementsAre("a"));
    EXPECT_EQ(NextStart(id), "05-03 00:01");
}

TEST_F(SchedulerFaultsTest, AClockThatStandsADayBeforeTheHistoryStartsNothing) {
    AddTask("a", 12, 30);
    SetNow("2026-05-01 12:30:00");
    Work();
    End(1);
    Work();
    SetNow("2026-04-28 12:00:00");
    RestartAndRecover();
    AddTask("b", 12, 30);
    SetNow("2026-04-28 12:30:00");
    Work();
    EXPECT_THAT(Started(), ElementsAre("a"));
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule ended -",
                                       "b 04-28 12:30 schedule skipped clock not trusted"));
}

TEST_F(SchedulerFaultsTest, AChangedTimeZoneMovesTheStartsToItsOwnTimes) {
    const int id = AddTask("a", 18, 0);
    Work();
    EXPECT_EQ(NextStart(id), "05-01 18:00");
    ::setenv("TZ", "Europe/Berlin", 1);
    EXPECT_EQ(Work(), Utc("2026-05-01 16:00:00"));
    EXPECT_EQ(NextStart(id), "05-01 16:00");
    ::setenv("TZ", "UTC", 1);
}

TEST_F(SchedulerFaultsTest, AZoneThatChangedWhileNoSchedulerRanIsNoticedAtTheStart) {
    const int id = AddTask("a", 18, 0);
    ::setenv("TZ", "Europe/Berlin", 1);
    RestartAndRecover();
    EXPECT_EQ(Work(), Utc("2026-05-01 16:00:00"));
    EXPECT_EQ(NextStart(id), "05-01 16:00");
    ::setenv("TZ", "UTC", 1);
}

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

}  // namespace
