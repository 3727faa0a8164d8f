#include "appliance/scheduler/Planner.h"

#include <gmock/gmock.h>

#include <vector>

#include "tests/appliance/scheduler/Instants.h"

namespace orva {

void PrintTo(const PlannedStart& start, std::ostream* out) {
    *out << absl::FormatTime("%Y-%m-%d %H:%M", absl::FromUnixSeconds(start.occurrence),
                             absl::UTCTimeZone())
         << " " << RunReasonText(start.reason) << " \"" << start.why << "\"";
}

}  // namespace orva

namespace {

using orva::DuePlan;
using orva::Moment;
using orva::PlannedStart;
using orva::RunReason;
using orva::TaskData;
using testing::ElementsAre;

// Daily at 06:30.
TaskData SampleTask() {
    TaskData task;
    task.id = 1;
    task.name = "sample";
    task.app = "app";
    task.command = "true";
    task.schedule.firstMinute = 6 * 60 + 30;
    return task;
}

Moment At(const std::string& utc) {
    Moment moment;
    moment.now = Utc(utc);
    moment.zone = absl::UTCTimeZone();
    moment.machineStarted = Utc("2026-01-01 00:00:00");
    return moment;
}

PlannedStart Planned(const std::string& utc, RunReason reason, std::string_view why = {}) {
    return {UtcSecond(utc), reason, why};
}

DuePlan Plan(const TaskData& task, const std::string& due, const Moment& moment,
             const std::string& since = "1970-01-01 00:00:00") {
    return orva::PlanDueTask(task, UtcSecond(due), UtcSecond(since), moment);
}

TEST(PlannerTest, AStartOfThisSecondIsMadeAndTheNextOneFollows) {
    const DuePlan plan = Plan(SampleTask(), "2026-05-01 06:30:00", At("2026-05-01 06:30:00.004"));
    EXPECT_THAT(plan.starts, ElementsAre(Planned("2026-05-01 06:30:00", RunReason::kSchedule)));
    EXPECT_EQ(plan.next, UtcSecond("2026-05-02 06:30:00"));
}

TEST(PlannerTest, AStartThatIsAMinuteLateIsMadeAnOlderOneWasMissed) {
    EXPECT_THAT(Plan(SampleTask(), "2026-05-01 06:30:00", At("2026-05-01 06:31:00")).starts,
                ElementsAre(Planned("2026-05-01 06:30:00", RunReason::kSchedule)));
    EXPECT_THAT(Plan(SampleTask(), "2026-05-01 06:30:00", At("2026-05-01 06:31:01")).starts,
                ElementsAre(Planned("2026-05-01 06:30:00", RunReason::kSchedule, "missed")));
}

TEST(PlannerTest, AStartFromBeforeTheMachineWasStartedIsRecordedAsThat) {
    Moment moment = At("2026-05-01 09:00:00");
    moment.machineStarted = Utc("2026-05-01 06:30:01");
    EXPECT_THAT(Plan(SampleTask(), "2026-05-01 06:30:00", moment).starts,
                ElementsAre(Planned("2026-05-01 06:30:00", RunReason::kSchedule, "machine off")));
}

TEST(PlannerTest, TheLatestMissedStartIsMadeUpForWithinADay) {
    TaskData task = SampleTask();
    task.schedule.runMissed = true;
    const DuePlan plan = Plan(task, "2026-04-20 06:30:00", At("2026-05-01 06:00:00"));
    EXPECT_THAT(plan.starts, ElementsAre(Planned("2026-04-30 06:30:00", RunReason::kMissed)));
    EXPECT_EQ(plan.next, UtcSecond("2026-05-01 06:30:00"));

    task.schedule.weekDays = 1 << 3;  // Wednesday, 29 April
    EXPECT_THAT(Plan(task, "2026-04-22 06:30:00", At("2026-04-30 06:30:00")).starts,
                ElementsAre(Planned("2026-04-29 06:30:00", RunReason::kMissed)));
    EXPECT_THAT(Plan(task, "2026-04-22 06:30:00", At("2026-04-30 06:30:01")).starts,
                ElementsAre(Planned("2026-04-29 06:30:00", RunReason::kSchedule, "missed")));
}

TEST(PlannerTest, WhatCameBeforeTheTaskWasSavedIsNotMadeUpForBySavingIt) {
    TaskData task = SampleTask();
    task.schedule.runMissed = true;
    const Moment moment = At("2026-05-01 09:00:00");
    EXPECT_THAT(Plan(task, "2026-05-01 05:00:00", moment, "2026-05-01 08:00:00").starts,
                ElementsAre(Planned("2026-05-01 05:00:00", RunReason::kSchedule, "missed")));
    EXPECT_THAT(Plan(task, "2026-05-01 05:00:00", moment, "2026-05-01 06:00:00").starts,
                ElementsAre(Planned("2026-05-01 06:30:00", RunReason::kMissed)));
    // Of its own time all the same.
    EXPECT_THAT(Plan(task, "2026-05-01 08:59:30", moment, "2026-05-01 08:59:40").starts,
                ElementsAre(Planned("2026-05-01 08:59:30", RunReason::kSchedule)));
}

TEST(PlannerTest, ATimeOfSavingThatIsStillToComeSaysNothing) {
    TaskData task = SampleTask();
    task.schedule.runMissed = true;
    const Moment moment = At("2026-05-01 09:00:00");
    EXPECT_THAT(Plan(task, "2026-04-30 06:30:00", moment, "2026-05-01 09:01:01").starts,
                ElementsAre(Planned("2026-05-01 06:30:00", RunReason::kMissed)));
    // The task was saved just now.
    EXPECT_THAT(Plan(task, "2026-04-30 06:30:00", moment, "2026-05-01 09:00:59").starts,
                ElementsAre(Planned("2026-04-30 06:30:00", RunReason::kSchedule, "missed")));
}

TEST(PlannerTest, OfManyMissedStartsTheLatestGoesOnRecord) {
    const DuePlan plan = Plan(SampleTask(), "2026-04-20 06:30:00", At("2026-05-01 12:00:00"));
    EXPECT_THAT(plan.starts,
                ElementsAre(Planned("2026-05-01 06:30:00", RunReason::kSchedule, "missed")));
    EXPECT_EQ(plan.next, UtcSecond("2026-05-02 06:30:00"));
}

TEST(PlannerTest, AMissedStartBeforeOneThatIsMadeGoesOnRecordToo) {
    const DuePlan plan = Plan(SampleTask(), "2026-04-20 06:30:00", At("2026-05-01 06:30:05"));
    EXPECT_THAT(plan.starts,
                ElementsAre(Planned("2026-04-30 06:30:00", RunReason::kSchedule, "missed"),
                            Planned("2026-05-01 06:30:00", RunReason::kSchedule)));
}

TEST(PlannerTest, ATaskThatWasDisabledAfterItsStartCameHasThatStartSkipped) {
    TaskData task = SampleTask();
    task.Set(orva::kEnabled, false);
    const DuePlan plan = Plan(task, "2026-05-01 06:30:00", At("2026-05-03 06:30:00"));
    EXPECT_THAT(plan.starts,
                ElementsAre(Planned("2026-05-01 06:30:00", RunReason::kSchedule, "disabled")));
    EXPECT_EQ(plan.next, orva::kNoStart);
}

TEST(PlannerTest, NothingIsStartedByAClockThatIsNotTrusted) {
    Moment moment = At("2026-05-01 06:30:00");
    moment.clockTrusted = false;
    TaskData task = SampleTask();
    task.schedule.runMissed = true;
    const DuePlan plan = Plan(task, "2026-05-01 06:30:00", moment);
    EXPECT_THAT(plan.starts, ElementsAre(Planned("2026-05-01 06:30:00", RunReason::kSchedule,
                                                 "clock not trusted")));
    EXPECT_EQ(plan.next, UtcSecond("2026-05-02 06:30:00"));
}

TEST(PlannerTest, ATaskWithoutACommandIsNotStarted) {
    TaskData task = SampleTask();
    task.command.clear();
    EXPECT_THAT(Plan(task, "2026-05-01 06:30:00", At("2026-05-01 06:30:00")).starts,
                ElementsAre(Planned("2026-05-01 06:30:00", RunReason::kSchedule, "no command")));
}

TEST(PlannerTest, ATaskThatIsOverHasNoNextStart) {
    TaskData task = SampleTask();
    task.schedule.mode = orva::Schedule::Mode::kDate;
    task.schedule.date = absl::CivilDay(2026, 5, 1);
    const DuePlan plan = Plan(task, "2026-05-01 06:30:00", At("2026-05-01 06:30:00"));
    EXPECT_EQ(plan.starts.size(), 1U);
    EXPECT_EQ(plan.next, orva::kNoStart);
}

TEST(PlannerTest, WhatWaitsIsStillStartedWithinAnHour) {
    Moment moment = At("2026-05-01 07:30:00");
    EXPECT_EQ(orva::WhyNoLongerStarted(Utc("2026-05-01 06:30:00"), moment), "");
    EXPECT_EQ(orva::WhyNoLongerStarted(Utc("2026-05-01 06:29:59"), moment), "missed");
    moment.machineStarted = Utc("2026-05-01 06:29:59.5");
    EXPECT_EQ(orva::WhyNoLongerStarted(Utc("2026-05-01 06:29:59"), moment), "machine off");
}

TEST(RunningTasksTest, ATaskRunsTwiceAtOnceOnlyWhereThatIsAllowed) {
    orva::RunningTasks running;
    const std::uint16_t never = 0;
    const std::uint16_t taskMay = orva::kCanRunTaskSameTime;
    EXPECT_EQ(running.WhyNotBeside(1, "app", never), "");
    running.Add(1, "app");
    EXPECT_EQ(running.WhyNotBeside(1, "app", never), "overlap");
    EXPECT_EQ(running.WhyNotBeside(1, "app", orva::kCanRunAppSameTime), "overlap");
    // Its own runs are no other task of its application.
    EXPECT_EQ(running.WhyNotBeside(1, "app", taskMay), "");
}

TEST(RunningTasksTest, TasksOfOneApplicationRunAtOnceOnlyWhereThatIsAllowed) {
    orva::RunningTasks running;
    running.Add(1, "app");
    EXPECT_EQ(running.WhyNotBeside(2, "app", 0), "overlap");
    EXPECT_EQ(running.WhyNotBeside(2, "app", orva::kCanRunTaskSameTime), "overlap");
    EXPECT_EQ(running.WhyNotBeside(2, "app", orva::kCanRunAppSameTime), "");
    EXPECT_EQ(running.WhyNotBeside(2, "other app", 0), "");
}

TEST(RunningTasksTest, ATaskThatHasEndedIsInNobodysWay) {
    orva::RunningTasks running;
    running.Add(1, "app");
    running.Add(1, "app");
    running.Add(2, "app");
    EXPECT_EQ(running.Count(), 3U);
    running.Remove(1, "app");
    EXPECT_EQ(running.WhyNotBeside(1, "app", orva::kCanRunAppSameTime), "overlap");
    running.Remove(1, "app");
    EXPECT_EQ(running.WhyNotBeside(1, "app", orva::kCanRunAppSameTime), "");
    EXPECT_EQ(running.WhyNotBeside(1, "app", 0), "overlap");
    running.Remove(2, "app");
    EXPECT_EQ(running.WhyNotBeside(1, "app", 0), "");
    EXPECT_EQ(running.Count(), 0U);
    running.Remove(2, "app");
    EXPECT_EQ(running.Count(), 0U);
}

TEST(PlannerTest, ADisabledTaskIsStillStartedByHand) {
    TaskData task = SampleTask();
    task.Set(orva::kEnabled, false);
    const orva::RunningTasks nothing;
    EXPECT_EQ(orva::WhyNotStarted(task, RunReason::kSchedule, nothing), "disabled");
    EXPECT_EQ(orva::WhyNotStarted(task, RunReason::kMissed, nothing), "disabled");
    EXPECT_EQ(orva::WhyNotStarted(task, RunReason::kByHand, nothing), "");
    task.command.clear();
    EXPECT_EQ(orva::WhyNotStarted(task, RunReason::kByHand, nothing), "no command");
}

}  // namespace
