// Clocks that jump or are wrong, zones that change.
#include <gmock/gmock.h>

#include <cstdlib>
#include <string>

#include "tests/appliance/scheduler/Instants.h"
#include "tests/appliance/scheduler/SchedulerTest.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

using SchedulerClocksTest = SchedulerTest;

constexpr std::uint16_t kTogether = orva::kCanRunAppSameTime | orva::kCanRunTaskSameTime;

TEST_F(SchedulerClocksTest, AClockPutBackAnHourStartsNothingTwice) {
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

TEST_F(SchedulerClocksTest, AClockPutBackStartsNothingTwiceWhoseRunIsNoLongerKept) {
    orva::TaskData task = SampleTask("a");
    task.flags |= kTogether;
    task.schedule.intervalMinutes = 1;
    task.schedule.firstMinute = 0;
    AddTask(task);
    const absl::Time noon = Utc("2026-05-01 12:00:00");
    const auto passMinutes = [&](int from, int until) {
        for (int minute = from; minute <= until; ++minute) {
            SetNow(absl::FormatTime("%Y-%m-%d %H:%M:%S", noon + absl::Minutes(minute),
                                    absl::UTCTimeZone()));
            Work();
            while (!host.goingOn.empty()) {
                End(*host.goingOn.begin());
            }
        }
    };
    passMinutes(1, 180);
    EXPECT_EQ(host.started.size(), 180U);
    EXPECT_THAT(History(), SizeIs(100));
    SetNow("2026-05-01 12:00:00");
    scheduler->ClockWasSet();
    Work();
    passMinutes(1, 180);
    EXPECT_EQ(host.started.size(), 180U);
    passMinutes(181, 181);
    EXPECT_EQ(host.started.size(), 181U);
}

TEST_F(SchedulerClocksTest, AMistakenYearDoesNotMakeTheSchedulerForgetTheRightOne) {
    orva::TaskData task = SampleTask("a");
    task.flags |= kTogether;
    task.schedule.intervalMinutes = 20;
    task.schedule.firstMinute = 0;
    AddTask(task);
    for (const char* now : {"2026-05-01 12:20:00", "2027-05-01 12:20:00", "2027-05-01 12:40:00"}) {
        SetNow(now);
        scheduler->ClockWasSet();
        Work();
    }
    EXPECT_EQ(host.started.size(), 3U);
    SetNow("2026-05-01 12:00:00");
    scheduler->ClockWasSet();
    Work();
    SetNow("2026-05-01 12:20:00");
    Work();
    EXPECT_EQ(host.started.size(), 3U);
    for (const char* now : {"2026-05-01 12:40:00", "2026-05-01 13:00:00"}) {
        SetNow(now);
        Work();
    }
    EXPECT_EQ(host.started.size(), 5U);
}

TEST_F(SchedulerClocksTest, AClockPutForwardADayRecordsWhatItJumpedOver) {
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

TEST_F(SchedulerClocksTest, AStartThatAWrongClockJumpedOverIsMadeWhenItsTimeComes) {
    AddTask("a", 18, 0);
    SetNow("2026-05-02 12:00:00");
    scheduler->ClockWasSet();
    Work();
    EXPECT_THAT(History(), ElementsAre("a 05-01 18:00 schedule skipped missed"));
    SetNow("2026-05-01 12:05:00");
    scheduler->ClockWasSet();
    Work();
    SetNow("2026-05-01 18:00:00");
    Work();
    EXPECT_THAT(Started(), ElementsAre("a"));
    EXPECT_THAT(History(), ElementsAre("a 05-01 18:00 schedule running -"));
    RestartAndRecover();
    SetNow("2026-05-01 17:30:00");
    scheduler->ClockWasSet();
    Work();
    SetNow("2026-05-01 18:00:00");
    Work();
    EXPECT_THAT(Started(), ElementsAre("a"));
}

TEST_F(SchedulerClocksTest, AfterAMistakenYearNextStartsAreThoseOfTheRightOne) {
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

TEST_F(SchedulerClocksTest, AClockThatStandsBeforeTheProgramWasMadeStartsNothing) {
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

TEST_F(SchedulerClocksTest, AClockThatStandsADayBeforeTheHistoryStartsNothing) {
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

TEST_F(SchedulerClocksTest, AClockThatWasSetIsStillTrustedAfterARestart) {
    const int id = AddTask("a", 12, 30);
    SetNow("2027-05-01 12:30:00");
    Work();
    End(host.started.back().run);
    Work();
    SetNow("2026-05-01 12:00:00");
    RestartAndRecover();
    Work();
    EXPECT_EQ(NextStart(id), "05-02 12:30");
    scheduler->ClockWasSet();
    EXPECT_EQ(Work(), Utc("2026-05-01 12:30:00"));
    RestartAndRecover();
    SetNow("2026-05-01 12:30:00");
    Work();
    EXPECT_EQ(host.started.size(), 2U);
    End(host.started.back().run);
    Work();
    // Not so that one is trusted which stands a day before what it was set to.
    SetNow("2026-04-29 12:00:00");
    RestartAndRecover();
    SetNow("2026-04-29 12:30:00");
    Execute("UPDATE task SET next_start = 1777465800");
    Work();
    EXPECT_EQ(host.started.size(), 2U);
}

// A service that has next to nothing to put right does not set the clock: it lets it run a bit
// faster or slower.
TEST_F(SchedulerClocksTest, AClockThatATimeServiceFindsRightIsTrustedWithinAMinute) {
    bool synchronised = false;
    options.clockSynchronised = [&] { return synchronised; };
    AddTask("a", 12, 30);
    SetNow("2027-05-01 12:30:00");
    Work();
    End(host.started.back().run);
    Work();
    SetNow("2026-05-01 12:00:00");
    RestartAndRecover();
    EXPECT_EQ(Work(), Utc("2026-05-01 12:01:00"));
    synchronised = true;
    SetNow("2026-05-01 12:01:00");
    EXPECT_EQ(Work(), Utc("2026-05-01 12:30:00"));
    SetNow("2026-05-01 12:30:00");
    Work();
    EXPECT_EQ(host.started.size(), 2U);
}

TEST_F(SchedulerClocksTest, AClockThatIsNotTrustedIsSaidInTheLog) {
    options.programMade = Utc("2026-04-01 00:00:00");
    SetNow("2000-01-01 00:00:00");
    RestartAndRecover();
    TakeLog();
    Work();
    Work();
    EXPECT_THAT(TakeLog(), ElementsAre("the clock shows 2000-01-01T00:00:00Z, which cannot be "
                                       "right: no task starts by itself until it is set"));
    SetNow("2026-05-01 12:00:00");
    scheduler->ClockWasSet();
    Work();
    Work();
    EXPECT_THAT(TakeLog(), ElementsAre("the clock is trusted again"));
}

TEST_F(SchedulerClocksTest, ATaskThatWasSavedByAClockAheadIsMadeUpForAllTheSame) {
    orva::TaskData task = SampleTask("a");
    task.flags |= kTogether;
    task.schedule.firstMinute = 18 * 60;
    const int id = AddTask(task);
    SetNow("2027-05-01 12:00:00");
    task = Stored(id);
    task.schedule.firstMinute = 19 * 60;
    task.schedule.runMissed = true;
    AddTask(task);
    SetNow("2026-05-01 12:10:00");
    scheduler->ClockWasSet();
    EXPECT_EQ(Work(), Utc("2026-05-01 19:00:00"));
    SetNow("2026-05-05 09:00:00");
    RestartAndRecover();
    Work();
    EXPECT_THAT(History(), ElementsAre("a 05-04 19:00 missed running -"));
}

TEST_F(SchedulerClocksTest, AClockThatWasSetToANonsensicalTimeIsNotRemembered) {
    options.programMade = Utc("2026-04-01 00:00:00");
    AddTask("a", 12, 30);
    SetNow("2026-05-01 12:30:00");
    RestartAndRecover();
    Work();
    SetNow("2000-01-01 00:00:00");
    scheduler->ClockWasSet();
    Work();
    SetNow("2026-04-20 12:00:00");
    RestartAndRecover();
    AddTask("b", 12, 30, kTogether);
    SetNow("2026-04-20 12:30:00");
    Work();
    EXPECT_EQ(host.started.size(), 1U);
}

TEST_F(SchedulerClocksTest, AChangedTimeZoneMovesTheStartsToItsOwnTimes) {
    const int id = AddTask("a", 18, 0);
    Work();
    EXPECT_EQ(NextStart(id), "05-01 18:00");
    ::setenv("TZ", "Europe/Berlin", 1);
    EXPECT_EQ(Work(), Utc("2026-05-01 16:00:00"));
    EXPECT_EQ(NextStart(id), "05-01 16:00");
    ::setenv("TZ", "UTC", 1);
}

TEST_F(SchedulerClocksTest, AZoneThatChangedWhileNoSchedulerRanIsNoticedAtTheStart) {
    const int id = AddTask("a", 18, 0);
    ::setenv("TZ", "Europe/Berlin", 1);
    RestartAndRecover();
    EXPECT_EQ(Work(), Utc("2026-05-01 16:00:00"));
    EXPECT_EQ(NextStart(id), "05-01 16:00");
    ::setenv("TZ", "UTC", 1);
}

}  // namespace
