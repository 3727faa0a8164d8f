#include "appliance/scheduler/Scheduler.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "tests/appliance/scheduler/Instants.h"
#include "tests/appliance/scheduler/SchedulerTest.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::uint16_t kTogether = orva::kCanRunAppSameTime | orva::kCanRunTaskSameTime;

TEST_F(SchedulerTest, ATaskIsStartedAtItsTimeAndNotBefore) {
    const int id = AddTask("a", 12, 30);
    EXPECT_EQ(Work(), Utc("2026-05-01 12:30:00"));
    SetNow("2026-05-01 12:29:59");
    EXPECT_EQ(Work(), Utc("2026-05-01 12:30:00"));
    EXPECT_THAT(Started(), IsEmpty());
    SetNow("2026-05-01 12:30:00");
    EXPECT_EQ(Work(), Utc("2026-05-02 12:30:00"));
    ASSERT_THAT(Started(), ElementsAre("a"));
    EXPECT_EQ(host.started[0].task, id);
    EXPECT_EQ(host.started[0].owner, "root");
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule running -"));
    EXPECT_EQ(NextStart(id), "05-02 12:30");
}

TEST_F(SchedulerTest, WithoutTasksThereIsNothingToWaitFor) {
    EXPECT_EQ(Work(), absl::InfiniteFuture());
}

TEST_F(SchedulerTest, HowARunEndedIsStoredAndItsTraceRemoved) {
    AddTask("a", 12, 30);
    SetNow("2026-05-01 12:30:00");
    Work();
    const std::int64_t run = host.started.at(0).run;
    host.outputs[run] = {"first", "last", 1000, 1009};
    End(run, 7);
    Work();
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule ended -"));
    const orva::Run stored = *Find(run);
    EXPECT_EQ(stored.exitStatus, 7);
    EXPECT_FALSE(stored.signal);
    EXPECT_EQ(stored.startedAt, Utc("2026-05-01 12:00:01"));
    EXPECT_EQ(stored.endedAt, Utc("2026-05-01 12:00:02"));
    EXPECT_EQ(stored.outputBytes, 1009U);
    const orva::RunOutput output = *orva::RunStore::Current()->Output(run);
    EXPECT_EQ(output.head, "first");
    EXPECT_EQ(output.tail, "last");
    EXPECT_EQ(output.dropped, 1000U);
    EXPECT_THAT(host.folders, IsEmpty());
    EXPECT_EQ(scheduler->RunsGoingOn(), 0U);
}

TEST_F(SchedulerTest, ARunThatCannotBeStartedEndsWithTheReason) {
    AddTask("a", 12, 30);
    host.refusal = "no space for output";
    SetNow("2026-05-01 12:30:00");
    Work();
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule ended no space for output"));
    const orva::Run stored = *Find(1);
    EXPECT_FALSE(stored.exitStatus || stored.signal);
    EXPECT_EQ(stored.endedAt, Utc("2026-05-01 12:30:00"));
}

TEST_F(SchedulerTest, MoreRunsThanAllowedWaitInOrderOfTheirTime) {
    options.mostRuns = 2;
    RestartAndRecover();
    AddTask("third", 12, 32, kTogether);
    AddTask("first", 12, 31, kTogether);
    AddTask("second", 12, 31, kTogether);
    AddTask("fourth", 12, 32, kTogether);
    SetNow("2026-05-01 12:32:00");
    Work();
    EXPECT_THAT(Started(), ElementsAre("first", "second"));
    End(host.started[1].run);
    Work();
    EXPECT_THAT(Started(), ElementsAre("first", "second", "third"));
    scheduler->SetMostRuns(3);
    Work();
    EXPECT_THAT(Started(), ElementsAre("first", "second", "third", "fourth"));
}

TEST_F(SchedulerTest, TwoHundredTasksDueInOneSecondAreEachStartedOnce) {
    options.mostRuns = 30;
    RestartAndRecover();
    for (int count = 0; count < 200; ++count) {
        AddTask("task " + std::to_string(count), 12, 30, kTogether);
    }
    SetNow("2026-05-01 12:30:00");
    Work();
    EXPECT_EQ(host.started.size(), 30U);
    std::size_t endedRuns = 0;
    while (endedRuns < host.started.size()) {
        End(host.started[endedRuns++].run);
        Work();
        ASSERT_LE(scheduler->RunsGoingOn(), 30U);
    }
    EXPECT_EQ(host.started.size(), 200U);
    std::set<int> tasks;
    for (const orva::RunOrder& order : host.started) {
        tasks.insert(order.task);
    }
    EXPECT_EQ(tasks.size(), 200U);
    EXPECT_EQ(orva::RunStore::Current()->List({{}, orva::RunState::kEnded}, 0, 0).total, 200);
}

TEST_F(SchedulerTest, AsManyStartsAsOneStepTakesLeaveNothingToDo) {
    for (int count = 0; count < 250; ++count) {
        AddTask("a", 18, 0);
    }
    SetNow("2026-05-03 12:00:00");
    EXPECT_EQ(Work(), Utc("2026-05-03 18:00:00"));
    EXPECT_EQ(History().size(), 250U);
}

TEST_F(SchedulerTest, ATaskThatStillRunsIsNotStartedAgain) {
    orva::TaskData task = SampleTask("a");
    task.schedule.firstMinute = 0;
    task.schedule.intervalMinutes = 1;
    AddTask(task);
    SetNow("2026-05-01 12:01:00");
    Work();
    SetNow("2026-05-01 12:02:00");
    Work();
    EXPECT_EQ(host.started.size(), 1U);
    End(host.started[0].run);
    SetNow("2026-05-01 12:03:00");
    Work();
    EXPECT_EQ(host.started.size(), 2U);
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:01 schedule ended -",
                                       "a 05-01 12:02 schedule skipped overlap",
                                       "a 05-01 12:03 schedule running -"));
}

TEST_F(SchedulerTest, TasksOfOneApplicationThatMayNotOverlapAreNotStartedTogether) {
    AddTask("a", 12, 30);
    AddTask("b", 12, 30);
    AddTask("c", 12, 30, kTogether);
    SetNow("2026-05-01 12:30:00");
    Work();
    EXPECT_THAT(Started(), ElementsAre("a", "c"));
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule running -",
                                       "b 05-01 12:30 schedule skipped overlap",
                                       "c 05-01 12:30 schedule running -"));
}

TEST_F(SchedulerTest, ATaskThatIsDisabledWhileItWaitsIsNotStarted) {
    options.mostRuns = 1;
    RestartAndRecover();
    AddTask("a", 12, 30, kTogether);
    const int waiting = AddTask("b", 12, 30, kTogether);
    SetNow("2026-05-01 12:30:00");
    Work();
    const orva::TaskData stored = Stored(waiting);
    orva::TaskData disabled = stored;
    disabled.Set(orva::kEnabled, false);
    orva::TaskStore::Current()->Change(stored, disabled);
    End(host.started[0].run);
    Work();
    EXPECT_THAT(Started(), ElementsAre("a"));
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule ended -",
                                       "b 05-01 12:30 schedule skipped disabled"));
    EXPECT_EQ(NextStart(waiting), "-");
}

TEST_F(SchedulerTest, ATaskThatIsRemovedWhileItWaitsIsNotStarted) {
    options.mostRuns = 1;
    RestartAndRecover();
    AddTask("a", 12, 30, kTogether);
    const int waiting = AddTask("b", 12, 30, kTogether);
    SetNow("2026-05-01 12:30:00");
    Work();
    orva::TaskStore::Current()->Remove(waiting);
    End(host.started[0].run);
    Work();
    EXPECT_THAT(Started(), ElementsAre("a"));
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule ended -",
                                       "b 05-01 12:30 schedule skipped deleted"));
}

// The scheduler sleeps, or is not running, when both happen.
TEST_F(SchedulerTest, AStartThatCameBeforeItsTaskWasChangedIsNotLost) {
    const int disabled = AddTask("a", 12, 30);
    const int moved = AddTask("b", 12, 30, kTogether);
    SetNow("2026-05-01 12:30:10");
    orva::TaskData stored = Stored(disabled);
    orva::TaskData changed = stored;
    changed.Set(orva::kEnabled, false);
    orva::TaskStore::Current()->Change(stored, changed);
    stored = Stored(moved);
    changed = stored;
    changed.schedule.firstMinute = 18 * 60;
    orva::TaskStore::Current()->Change(stored, changed);
    EXPECT_EQ(Work(), Utc("2026-05-01 18:00:00"));
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule skipped disabled",
                                       "b 05-01 12:30 schedule running -"));
    EXPECT_EQ(NextStart(disabled), "-");
    EXPECT_EQ(NextStart(moved), "05-01 18:00");
}

TEST_F(SchedulerTest, ARunByHandIsStartedAtOnceEvenOfADisabledTask) {
    orva::TaskData task = SampleTask("a");
    task.Set(orva::kEnabled, false);
    const int id = AddTask(task);
    EXPECT_EQ(Work(), absl::InfiniteFuture());
    Execute(
        "INSERT INTO run (task, task_name, reason, state, queued_at, asked_program, "
        "asked_account) VALUES (" +
        std::to_string(id) + ", 'a', 'hand', 'queued', 1777636800000, 'tester', 'root')");
    Work();
    EXPECT_THAT(Started(), ElementsAre("true"));
    EXPECT_THAT(History(), ElementsAre("a - hand running -"));
    End(1);
    Work();
    EXPECT_THAT(History(), ElementsAre("a - hand ended -"));
}

TEST_F(SchedulerTest, OnlyRunsThatGoOnCanBeStopped) {
    AddTask("a", 12, 30);
    SetNow("2026-05-01 12:30:00");
    Work();
    EXPECT_EQ(scheduler->Stop(1), std::nullopt);
    EXPECT_THAT(host.stopped, ElementsAre(1));
    EXPECT_EQ(scheduler->Stop(2), "no such run");
    End(1);
    EXPECT_EQ(scheduler->Stop(1), "it is not running");
    Work();
    EXPECT_EQ(scheduler->Stop(1), "it is not running");
    EXPECT_THAT(host.stopped, ElementsAre(1));
}

TEST_F(SchedulerTest, ARunThatIsStoppedWhileItWaitsIsNotStarted) {
    options.mostRuns = 1;
    RestartAndRecover();
    AddTask("a", 12, 30, kTogether);
    AddTask("b", 12, 30, kTogether);
    AddTask("c", 12, 30, kTogether);
    SetNow("2026-05-01 12:30:00");
    Work();
    EXPECT_EQ(scheduler->Stop(2), std::nullopt);
    EXPECT_EQ(scheduler->Stop(2), "it is not running");
    EXPECT_THAT(host.stopped, IsEmpty());
    End(1);
    Work();
    EXPECT_THAT(Started(), ElementsAre("a", "c"));
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule ended -",
                                       "b 05-01 12:30 schedule skipped stopped",
                                       "c 05-01 12:30 schedule running -"));
}

TEST_F(SchedulerTest, ATaskThatWaitsAlreadyIsNotQueuedAgain) {
    options.mostRuns = 1;
    RestartAndRecover();
    AddTask("long", 12, 0, kTogether);
    orva::TaskData task = SampleTask("often");
    task.flags |= orva::kCanRunAppSameTime;
    task.schedule.firstMinute = 0;
    task.schedule.intervalMinutes = 1;
    AddTask(task);
    task.name = "often and together";
    task.flags |= kTogether;
    AddTask(task);
    Execute("UPDATE task SET next_start = 1777636800 WHERE id = 1");
    Work();
    for (const char* now : {"2026-05-01 12:01:00", "2026-05-01 12:02:00"}) {
        SetNow(now);
        Work();
    }
    EXPECT_THAT(History(), ElementsAre("long 05-01 12:00 schedule running -",
                                       "often 05-01 12:01 schedule queued -",
                                       "often and together 05-01 12:01 schedule queued -",
                                       "often 05-01 12:02 schedule skipped overlap",
                                       "often and together 05-01 12:02 schedule queued -"));
    // By somebody who does not ask the scheduler.
    EXPECT_TRUE(orva::RunStore::Current()->Cancel(2));
    SetNow("2026-05-01 12:03:00");
    Work();
    EXPECT_EQ(Find(6)->state, orva::RunState::kQueued);
}

TEST_F(SchedulerTest, WhatHasWaitedForAnHourIsNotStartedAnyMore) {
    options.mostRuns = 1;
    RestartAndRecover();
    AddTask("long", 12, 10, kTogether);
    AddTask("waits", 12, 10, kTogether);
    AddTask("later", 13, 0, kTogether);
    SetNow("2026-05-01 12:10:00");
    Work();
    EXPECT_EQ(Find(2)->state, orva::RunState::kQueued);
    SetNow("2026-05-01 13:10:00");
    EXPECT_EQ(Work(), Utc("2026-05-01 13:10:01"));
    EXPECT_EQ(Find(2)->state, orva::RunState::kQueued);
    SetNow("2026-05-01 13:10:01");
    Work();
    EXPECT_THAT(History(), ElementsAre("long 05-01 12:10 schedule running -",
                                       "waits 05-01 12:10 schedule skipped missed",
                                       "later 05-01 13:00 schedule skipped missed"));
    End(1);
    Work();
    EXPECT_THAT(Started(), ElementsAre("long"));
}

TEST_F(SchedulerTest, AStartThatIsMadeUpForWaitsAsLongAsOthers) {
    options.mostRuns = 1;
    RestartAndRecover();
    orva::TaskData task = SampleTask("a");
    task.flags |= kTogether;
    task.schedule.runMissed = true;
    AddTask(task);
    AddTask(task);
    SetNow("2026-05-02 09:00:00");
    Work();
    SetNow("2026-05-02 09:30:00");
    RestartAndRecover();
    Work();
    End(1);
    Work();
    EXPECT_THAT(History(),
                ElementsAre("a 05-02 06:30 missed ended -", "a 05-02 06:30 missed running -"));
}

TEST_F(SchedulerTest, ASavedTaskIsNotStartedForATimeBeforeThat) {
    orva::TaskData task = SampleTask("a");
    task.schedule.runMissed = true;
    const int id = AddTask(task);
    // Two days without a scheduler.
    SetNow("2026-05-03 15:40:10");
    const orva::TaskData stored = Stored(id);
    orva::TaskData changed = stored;
    changed.schedule.firstMinute = 15 * 60 + 40;
    orva::TaskStore::Current()->Change(stored, changed);
    SetNow("2026-05-03 15:40:20");
    RestartAndRecover();
    EXPECT_EQ(Work(), Utc("2026-05-04 15:40:00"));
    EXPECT_THAT(History(), ElementsAre("a 05-02 06:30 schedule skipped missed"));
}

TEST_F(SchedulerTest, ATaskThatIsEnabledIsNotStartedForATimeBeforeThat) {
    orva::TaskData task = SampleTask("a");
    task.schedule.runMissed = true;
    const int id = AddTask(task);
    const auto enable = [&](bool on) {
        const orva::TaskData stored = Stored(id);
        orva::TaskData changed = stored;
        changed.Set(orva::kEnabled, on);
        orva::TaskStore::Current()->Change(stored, changed);
    };
    SetNow("2026-05-02 12:00:00");
    enable(false);
    SetNow("2026-05-03 12:00:00");
    enable(true);
    RestartAndRecover();
    EXPECT_EQ(Work(), Utc("2026-05-04 06:30:00"));
    EXPECT_THAT(History(), ElementsAre("a 05-02 06:30 schedule skipped missed"));
}

TEST_F(SchedulerTest, ASaveThatLeavesTheScheduleAsItIsLeavesWhatWasMissed) {
    orva::TaskData task = SampleTask("a");
    task.schedule.mode = orva::Schedule::Mode::kDate;
    task.schedule.date = absl::CivilDay(2026, 5, 2);
    task.schedule.repeat = orva::Schedule::Repeat::kDaily;
    task.schedule.runMissed = true;
    const int id = AddTask(task);
    SetNow("2026-05-03 15:40:10");
    const orva::TaskData stored = Stored(id);
    orva::TaskData changed = stored;
    changed.name = "b";
    changed.Set(orva::kCanRunTaskSameTime, true);
    orva::TaskStore::Current()->Change(stored, changed);
    RestartAndRecover();
    Work();
    EXPECT_THAT(History(), ElementsAre("b 05-03 06:30 missed running -"));
}

TEST_F(SchedulerTest, ADamagedRowThatWaitsEndsWithTheReason) {
    const int id = AddTask("a", 12, 30, kTogether);
    Execute(
        "INSERT INTO run (task, task_name, reason, state, queued_at, asked_program, "
        "asked_account) VALUES (" +
        std::to_string(id) + ", 'a', 'whim', 'queued', 1777636800000, '', ''), " +
        "(99, 'gone', 'hand', 'queued', 1777636800000, '', '')");
    Work();
    EXPECT_THAT(Started(), IsEmpty());
    Execute("UPDATE run SET reason = 'hand'");
    EXPECT_THAT(History(),
                ElementsAre("a - hand ended its row is damaged", "gone - hand skipped deleted"));
}

}  // namespace
