// A scheduler that is killed: at each step of a run, and at random.
#include <SQLiteCpp/SQLiteCpp.h>
#include <absl/time/clock.h>
#include <gmock/gmock.h>
#include <signal.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <random>
#include <string>
#include <vector>

#include "appliance/root/Root.h"
#include "appliance/supervisor/RunFolder.h"
#include "tests/system/RunningScheduler.h"

namespace {

using orva::RunState;
using orva::TaskStore;
using orva::test::ReadWholeFile;
using orva::test::RunningScheduler;

class SchedulerKillTest : public testing::Test {
  protected:
    std::string Mark(const std::string& name) const {
        return (appliance.Root().Path() / name).string();
    }
    // A task that leaves a byte behind for every time that it runs.
    int AddMarkingTask(const std::string& name) {
        return appliance.AddTask("printf x >>" + Mark(name));
    }
    std::size_t TimesRun(const std::string& name) const { return ReadWholeFile(Mark(name)).size(); }

    RunningScheduler appliance;
};

TEST_F(SchedulerKillTest, BeforeTheRowTheStartIsMadeByTheNextScheduler) {
    appliance.Start();
    const int task = AddMarkingTask("a");
    {
        SQLite::Database other(orva::ResolvePath(TaskStore::kDatabaseFile), SQLite::OPEN_READWRITE,
                               60'000);
        other.exec("BEGIN IMMEDIATE; UPDATE task SET next_start = " +
                   std::to_string(absl::ToUnixSeconds(absl::Now())) + "; COMMIT; BEGIN IMMEDIATE");
        appliance.Wake();
        // It has tried by then.
        EXPECT_TRUE(orva::test::WaitFor(
            [&] { return appliance.ErrorText().find("database is locked") != std::string::npos; }));
        appliance.Kill();
        other.exec("ROLLBACK");
    }
    EXPECT_EQ(appliance.Runs().size(), 0U);
    appliance.Start();
    appliance.WaitUntilIdle();
    EXPECT_EQ(appliance.OnlyRunOf(task).state, RunState::kEnded);
    EXPECT_EQ(TimesRun("a"), 1U);
}

// The supervisor of the first of many kills the scheduler, which is mostly still starting the
// others: their rows and folders are stored by then and their processes are not started.
TEST_F(SchedulerKillTest, AfterTheRowAndBeforeTheStartEveryRunIsStartedOnce) {
    constexpr int kTasksPerRound = 30;
    constexpr int kMostRounds = 20;
    const auto hasNotBegun = [](std::int64_t run) {
        return orva::RunFolder(run).Look() == orva::RunFolder::State::kNotBegun;
    };
    std::vector<int> tasks;
    bool caught = false;
    for (int round = 0; round < kMostRounds && !caught; ++round) {
        appliance.ReplaceSupervisor("[ \"${1##*/}\" != " + std::to_string(tasks.size() + 1) +
                                    " ] || kill -9 $PPID\nexec $REAL \"$@\"\n");
        for (int count = 0; count < kTasksPerRound; ++count) {
            tasks.push_back(AddMarkingTask("mark" + std::to_string(tasks.size())));
        }
        appliance.Execute(
            "UPDATE task SET next_start = " + std::to_string(absl::ToUnixSeconds(absl::Now())) +
            " WHERE id > " + std::to_string(round * kTasksPerRound));
        appliance.Launch();
        EXPECT_EQ(appliance.WaitForEnd(), 128 + SIGKILL);
        appliance.RestoreSupervisor();
        EXPECT_EQ(orva::RunStore::Current()->List({{}, RunState::kRunning}, 0, 0).total,
                  kTasksPerRound);
        const std::vector<std::int64_t> runs = orva::RunFolder::All();
        EXPECT_EQ(runs.size(), std::size_t{kTasksPerRound});
        caught = std::any_of(runs.begin(), runs.end(), hasNotBegun);
        appliance.Start();
        appliance.WaitUntilIdle();
        EXPECT_TRUE(orva::test::WaitFor([] { return orva::RunFolder::All().empty(); }));
        ASSERT_EQ(appliance.Stop(), 0);
    }
    EXPECT_TRUE(caught);
    for (std::size_t index = 0; index < tasks.size(); ++index) {
        EXPECT_EQ(appliance.OnlyRunOf(tasks[index]).state, RunState::kEnded);
        EXPECT_EQ(TimesRun("mark" + std::to_string(index)), 1U) << index;
    }
}

TEST_F(SchedulerKillTest, AfterTheStartTheRunIsFollowedByTheNextScheduler) {
    // Long before the supervisor can say who it is.
    appliance.ReplaceSupervisor(
        "kill -9 $PPID\n"
        "until [ -e " +
        Mark("go") + " ]; do sleep 0.01; done\nexec $REAL \"$@\"\n");
    const int task = AddMarkingTask("a");
    appliance.MakeDueNow(task);
    appliance.Launch();
    EXPECT_EQ(appliance.WaitForEnd(), 128 + SIGKILL);
    appliance.RestoreSupervisor();
    appliance.Start();
    EXPECT_EQ(appliance.OnlyRunOf(task).state, RunState::kRunning);
    EXPECT_EQ(TimesRun("a"), 0U);
    appliance.Root().Write("go", "");
    appliance.WaitUntilIdle();
    EXPECT_EQ(appliance.OnlyRunOf(task).exitStatus, 0);
    EXPECT_EQ(TimesRun("a"), 1U);
}

TEST_F(SchedulerKillTest, ASupervisorThatDiedBeforeItsFirstStepHasRunNothingAndIsReplaced) {
    appliance.ReplaceSupervisor("kill -9 $PPID\n");
    const int task = AddMarkingTask("a");
    appliance.MakeDueNow(task);
    appliance.Launch();
    EXPECT_EQ(appliance.WaitForEnd(), 128 + SIGKILL);
    appliance.RestoreSupervisor();
    appliance.Start();
    appliance.WaitUntilIdle();
    EXPECT_EQ(appliance.OnlyRunOf(task).exitStatus, 0);
    EXPECT_EQ(TimesRun("a"), 1U);
}

TEST_F(SchedulerKillTest, BeforeTheEndIsStoredItIsTakenInByTheNextScheduler) {
    appliance.ReplaceSupervisor("$REAL \"$@\"\nkill -9 $PPID\n");
    const int task = appliance.AddTask("printf x >>" + Mark("a") + "; echo out; exit 6");
    appliance.MakeDueNow(task);
    appliance.Launch();
    EXPECT_EQ(appliance.WaitForEnd(), 128 + SIGKILL);
    appliance.RestoreSupervisor();
    EXPECT_EQ(appliance.OnlyRunOf(task).state, RunState::kRunning);
    appliance.Start();
    appliance.WaitUntilIdle();
    const orva::Run run = appliance.OnlyRunOf(task);
    EXPECT_EQ(run.exitStatus, 6);
    EXPECT_EQ(orva::RunStore::Current()->Output(run.id)->head, "out\n");
    EXPECT_EQ(TimesRun("a"), 1U);
}

TEST_F(SchedulerKillTest, WithItsSupervisorKilledTooARunIsLost) {
    appliance.Start();
    const int task = appliance.AddTask("printf x >>" + Mark("a") + "; echo out; sleep 1000");
    TaskStore::Current()->QueueRun(task);
    ASSERT_TRUE(orva::test::WaitFor([&] { return TimesRun("a") == 1; }));
    const std::int64_t id = appliance.OnlyRunOf(task).id;
    const std::optional<orva::RunProcess> process = orva::RunFolder(id).Process();
    ASSERT_TRUE(process);
    appliance.Kill();
    ::kill(process->supervisor, SIGKILL);
    ::kill(-process->command, SIGKILL);
    ASSERT_TRUE(orva::test::WaitFor([&] { return !orva::RunFolder(id).IsSupervised(); }));
    appliance.Start();
    appliance.WaitUntilIdle();
    EXPECT_EQ(appliance.OnlyRunOf(task).state, RunState::kLost);
    EXPECT_EQ(orva::RunStore::Current()->Output(id)->head, "out\n");
    EXPECT_EQ(TimesRun("a"), 1U);
}

// ORVA_KILL_ROUNDS says how often; by default as often as fits into a few seconds.
TEST_F(SchedulerKillTest, AtRandomEveryDueStartRunsOnce) {
    constexpr int kTasksPerRound = 4;
    const char* const asked = std::getenv("ORVA_KILL_ROUNDS");
    const int rounds = asked != nullptr ? std::atoi(asked) : 1'000'000;
    const absl::Time deadline =
        asked != nullptr ? absl::InfiniteFuture() : absl::Now() + absl::Seconds(12);
    std::mt19937 random(20261121);
    // From before it is ready to well after all runs of the round have ended.
    std::uniform_int_distribution<int> microseconds(0, 120'000);

    std::vector<int> tasks;
    int round = 0;
    for (; round < rounds && absl::Now() < deadline; ++round) {
        std::vector<int> ofRound;
        for (int count = 0; count < kTasksPerRound; ++count) {
            ofRound.push_back(AddMarkingTask("mark" + std::to_string(tasks.size())));
            tasks.push_back(ofRound.back());
        }
        const std::string now = std::to_string(absl::ToUnixSeconds(absl::Now()));
        // Half of them are due when the scheduler starts, half while it runs.
        const auto makeDue = [&](int from, int until) {
            appliance.Execute("UPDATE task SET next_start = " + now + " WHERE id BETWEEN " +
                              std::to_string(from) + " AND " + std::to_string(until));
        };
        makeDue(ofRound[0], ofRound[1]);
        appliance.Launch();
        const absl::Time kill = absl::Now() + absl::Microseconds(microseconds(random));
        makeDue(ofRound[2], ofRound[3]);
        appliance.Wake();
        absl::SleepFor(kill - absl::Now());
        appliance.Kill();
    }
    appliance.Start();
    appliance.WaitUntilIdle();

    for (std::size_t index = 0; index < tasks.size(); ++index) {
        ASSERT_NE(TaskStore::Current()->Find(tasks[index]), nullptr);
        const orva::Run run = appliance.OnlyRunOf(tasks[index]);
        // Supervisors live on, so nothing may be lost.
        EXPECT_EQ(run.state, RunState::kEnded) << tasks[index] << ": " << run.why;
        EXPECT_EQ(run.exitStatus, 0) << tasks[index] << ": " << run.why;
        EXPECT_EQ(TimesRun("mark" + std::to_string(index)), 1U) << tasks[index];
    }
    EXPECT_EQ(appliance.IntegrityCheck(), "ok");
    EXPECT_TRUE(orva::test::WaitFor([] { return orva::RunFolder::All().empty(); }));
    std::cout << round << " kills, " << tasks.size() << " starts\n";
}

}  // namespace
