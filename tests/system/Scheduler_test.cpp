// The scheduler as it runs: real processes, real clock, real database.
#include <SQLiteCpp/SQLiteCpp.h>
#include <absl/time/clock.h>
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <filesystem>
#include <string>

#include "appliance/root/Root.h"
#include "appliance/store/Accounts.h"
#include "appliance/store/SchedulerLink.h"
#include "appliance/supervisor/RunFolder.h"
#include "tests/system/RunningScheduler.h"

namespace {

using orva::RunReason;
using orva::RunState;
using orva::SchedulerLink;
using orva::TaskStore;
using orva::test::ProcessResult;
using orva::test::ReadWholeFile;
using orva::test::RunningScheduler;
using orva::test::RunProcess;
using testing::HasSubstr;

class SchedulerSystemTest : public testing::Test {
  protected:
    std::string Mark(const std::string& name) const {
        return (appliance.Root().Path() / name).string();
    }

    std::string DatabasePath() const { return orva::ResolvePath(TaskStore::kDatabaseFile); }

    RunningScheduler appliance;
};

TEST_F(SchedulerSystemTest, ADueTaskRunsAsItsOwnerAndItsOutputAndEndAreKept) {
    appliance.Start();
    const int task = appliance.AddTask("echo $USER; echo problem >&2; exit 3");
    appliance.MakeDue(task, absl::Now() + absl::Seconds(2));
    appliance.Wake();
    EXPECT_TRUE(orva::test::WaitFor([&] { return !appliance.Runs().empty(); }));
    appliance.WaitUntilIdle();
    const orva::Run run = appliance.OnlyRunOf(task);
    EXPECT_EQ(run.state, RunState::kEnded);
    EXPECT_EQ(run.reason, RunReason::kSchedule);
    EXPECT_EQ(run.exitStatus, 3);
    EXPECT_EQ(run.taskName, "task");
    EXPECT_GE(run.startedAt, run.occurrence);
    EXPECT_EQ(orva::RunStore::Current()->Output(run.id)->head, orva::OwnAccount() + "\nproblem\n");
    // Removed after that is stored.
    EXPECT_TRUE(orva::test::WaitFor([] { return orva::RunFolder::All().empty(); }));
    EXPECT_EQ(appliance.Stop(), 0) << appliance.ErrorText();
}

TEST_F(SchedulerSystemTest, ATaskThatIsRunByHandStartsAtOnce) {
    const int task = appliance.AddTask("touch " + Mark("ran"));
    EXPECT_THROW(TaskStore::Current()->QueueRun(task), std::exception);
    appliance.Start();
    TaskStore::Current()->QueueRun(task);
    EXPECT_TRUE(orva::test::WaitFor([&] { return std::filesystem::exists(Mark("ran")); }));
    appliance.WaitUntilIdle();
    const orva::Run run = appliance.OnlyRunOf(task);
    EXPECT_EQ(run.reason, RunReason::kByHand);
    EXPECT_EQ(run.state, RunState::kEnded);
    EXPECT_EQ(run.askedAccount, orva::OwnAccount());
    EXPECT_EQ(run.askedProgram, "scheduler_system_test");
}

TEST_F(SchedulerSystemTest, TwoHundredTasksOfOneSecondAllRunOnce) {
    appliance.Start();
    std::string due = "BEGIN;";
    for (int count = 0; count < 200; ++count) {
        const int task = appliance.AddTask("echo x >>" + Mark("marks"));
        due += "UPDATE task SET next_start = " + std::to_string(absl::ToUnixSeconds(absl::Now())) +
               " WHERE id = " + std::to_string(task) + ";";
    }
    appliance.Execute(due + "COMMIT");
    appliance.Wake();
    appliance.WaitUntilIdle();
    EXPECT_EQ(ReadWholeFile(Mark("marks")).size(), 400U);
    EXPECT_EQ(orva::RunStore::Current()->List({{}, RunState::kEnded}, 0, 0).total, 200);
}

TEST_F(SchedulerSystemTest, ARunCanBeStopped) {
    appliance.Start();
    const int task = appliance.AddTask("touch " + Mark("ran") + "; sleep 1000");
    TaskStore::Current()->QueueRun(task);
    ASSERT_TRUE(orva::test::WaitFor([&] { return std::filesystem::exists(Mark("ran")); }));
    const std::int64_t id = appliance.OnlyRunOf(task).id;
    EXPECT_EQ(SchedulerLink::Stop(id), std::nullopt);
    ASSERT_TRUE(appliance.WaitForState(id, RunState::kEnded));
    EXPECT_EQ(appliance.OnlyRunOf(task).signal, SIGTERM);
    EXPECT_EQ(SchedulerLink::Stop(id), "it is not running");
    EXPECT_EQ(SchedulerLink::Stop(id + 1), "no such run");
}

TEST_F(SchedulerSystemTest, ARunThatWillNotEndIsKilledAfterTenSeconds) {
    appliance.Start();
    const int task =
        appliance.AddTask("trap '' TERM; touch " + Mark("ran") + "; while :; do sleep 0.1; done");
    TaskStore::Current()->QueueRun(task);
    ASSERT_TRUE(orva::test::WaitFor([&] { return std::filesystem::exists(Mark("ran")); }));
    const std::int64_t id = appliance.OnlyRunOf(task).id;
    const absl::Time asked = absl::Now();
    EXPECT_EQ(SchedulerLink::Stop(id), std::nullopt);
    ASSERT_TRUE(appliance.WaitForState(id, RunState::kEnded));
    EXPECT_EQ(appliance.OnlyRunOf(task).signal, SIGKILL);
    EXPECT_GE(absl::Now() - asked, absl::Seconds(10));
}

TEST_F(SchedulerSystemTest, ASecondSchedulerOfTheSameRootIsRefused) {
    appliance.Start();
    const ProcessResult second = RunProcess(appliance.Arguments());
    EXPECT_EQ(second.status, 3);
    EXPECT_THAT(second.err,
                HasSubstr("another scheduler (process " + std::to_string(appliance.Pid()) +
                          ") is running for root " + appliance.Root().Path().string()));
    EXPECT_TRUE(SchedulerLink::IsAlive());
    const int task = appliance.AddTask("true");
    TaskStore::Current()->QueueRun(task);
    appliance.WaitUntilIdle();
    EXPECT_EQ(appliance.OnlyRunOf(task).exitStatus, 0);
}

TEST_F(SchedulerSystemTest, AStopLeavesRunsAloneAndTheNextSchedulerTakesThemIn) {
    appliance.Start();
    const int task = appliance.AddTask("touch " + Mark("ran") + "; until [ -e " + Mark("go") +
                                       " ]; do sleep 0.01; done; echo done; exit 5");
    TaskStore::Current()->QueueRun(task);
    ASSERT_TRUE(orva::test::WaitFor([&] { return std::filesystem::exists(Mark("ran")); }));
    EXPECT_EQ(appliance.Stop(), 0) << appliance.ErrorText();
    EXPECT_FALSE(SchedulerLink::IsAlive());
    EXPECT_FALSE(std::filesystem::exists(orva::ResolvePath(SchedulerLink::kSocket)));
    const orva::Run run = appliance.OnlyRunOf(task);
    EXPECT_EQ(run.state, RunState::kRunning);
    appliance.Start();
    EXPECT_EQ(appliance.OnlyRunOf(task).state, RunState::kRunning);
    appliance.Root().Write("go", "");
    ASSERT_TRUE(appliance.WaitForState(run.id, RunState::kEnded));
    EXPECT_EQ(appliance.OnlyRunOf(task).exitStatus, 5);
    EXPECT_EQ(orva::RunStore::Current()->Output(run.id)->head, "done\n");
}

TEST_F(SchedulerSystemTest, TheLimitOnRunsIsReadAgainAtASignal) {
    appliance.Root().Write("usr/orva/etc/orva.conf", "schedmaxruns=\"1\"\n");
    appliance.Start();
    const std::string wait = "until [ -e " + Mark("go") + " ]; do sleep 0.01; done";
    const int first = appliance.AddTask("touch " + Mark("first") + "; " + wait);
    const int second = appliance.AddTask("touch " + Mark("second") + "; " + wait);
    TaskStore::Current()->QueueRun(first);
    ASSERT_TRUE(orva::test::WaitFor([&] { return std::filesystem::exists(Mark("first")); }));
    TaskStore::Current()->QueueRun(second);
    // Answered after the message about the queued run, so the scheduler has seen that by then.
    EXPECT_EQ(SchedulerLink::Stop(1000), "no such run");
    EXPECT_EQ(appliance.OnlyRunOf(second).state, RunState::kQueued);
    appliance.Root().Write("usr/orva/etc/orva.conf", "schedmaxruns=\"2\"\n");
    appliance.Signal(SIGHUP);
    EXPECT_TRUE(orva::test::WaitFor([&] { return std::filesystem::exists(Mark("second")); }));
    appliance.Root().Write("usr/orva/etc/orva.conf", "schedmaxruns=\"many\"\n");
    appliance.Signal(SIGHUP);
    EXPECT_TRUE(orva::test::WaitFor([&] {
        return appliance.ErrorText().find(
                   "schedmaxruns: \"many\" is no number from 1 to 10000; using 64") !=
               std::string::npos;
    }));
    appliance.Root().Write("go", "");
    appliance.WaitUntilIdle();
}

TEST_F(SchedulerSystemTest, RunsForWhichThereIsNoFileDescriptorWaitForTheirTurn) {
    appliance.Start();
    const rlimit few{70, 70};
    ASSERT_EQ(::prlimit(appliance.Pid(), RLIMIT_NOFILE, &few, nullptr), 0);
    appliance.Signal(SIGHUP);
    EXPECT_TRUE(orva::test::WaitFor([&] {
        return appliance.ErrorText().find(
                   "schedmaxruns: 6 runs at once, not 64: the limit on open files is 70") !=
               std::string::npos;
    }));
    const int task = appliance.AddTask("until [ -e " + Mark("go") +
                                       " ]; do sleep 0.05; done; echo x >>" + Mark("marks"));
    for (int count = 0; count < 70; ++count) {
        TaskStore::Current()->QueueRun(task);
    }
    EXPECT_EQ(SchedulerLink::Stop(1000), "no such run");
    appliance.Root().Write("go", "");
    appliance.WaitUntilIdle();
    for (const orva::Run& run : appliance.Runs()) {
        EXPECT_EQ(run.exitStatus, 0) << run.id << ": " << run.why;
    }
    EXPECT_EQ(ReadWholeFile(Mark("marks")).size(), 140U);
}

TEST_F(SchedulerSystemTest, ADatabaseThatIsLockedForTenSecondsDelaysAndLosesNothing) {
    appliance.Start();
    const int task = appliance.AddTask("echo x >>" + Mark("marks"));
    {
        SQLite::Database other(DatabasePath(), SQLite::OPEN_READWRITE, 60'000);
        other.exec("BEGIN IMMEDIATE; UPDATE task SET next_start = " +
                   std::to_string(absl::ToUnixSeconds(absl::Now())) +
                   " WHERE id = " + std::to_string(task) + "; COMMIT; BEGIN IMMEDIATE");
        appliance.Wake();
        // Each try takes two seconds and a half.
        const std::string line = "database is locked\n";
        EXPECT_TRUE(orva::test::WaitFor([&] {
            const std::string text = appliance.ErrorText();
            int lines = 0;
            for (std::size_t at = text.find(line); at != std::string::npos;
                 at = text.find(line, at + 1)) {
                ++lines;
            }
            return lines >= 5;
        }));
        other.exec("ROLLBACK");
    }
    appliance.WaitUntilIdle();
    EXPECT_EQ(ReadWholeFile(Mark("marks")), "x\n");
    EXPECT_EQ(appliance.OnlyRunOf(task).state, RunState::kEnded);
}

TEST_F(SchedulerSystemTest, ATaskOfSomebodyElseEndsWithTheReason) {
    if (::geteuid() == 0) {
        // Root may become anybody but one who is not there.
        const int task = appliance.AddTask("true");
        appliance.Execute("UPDATE task SET owner = 'nobody-here'");
        appliance.Start();
        TaskStore::Current()->QueueRun(task);
        appliance.WaitUntilIdle();
        EXPECT_EQ(appliance.OnlyRunOf(task).why, "the owner is gone");
        return;
    }
    const int task = appliance.AddTask("true");
    appliance.Execute("UPDATE task SET owner = 'root'");
    appliance.Start();
    TaskStore::Current()->QueueRun(task);
    appliance.WaitUntilIdle();
    EXPECT_EQ(appliance.OnlyRunOf(task).why, "not permitted");
}

TEST_F(SchedulerSystemTest, AnIdleSchedulerSleeps) {
    appliance.AddTask("true");
    appliance.Start();
    EXPECT_EQ(SchedulerLink::Stop(1), "no such run");
    const auto contextSwitches = [&] {
        const std::string status =
            ReadWholeFile("/proc/" + std::to_string(appliance.Pid()) + "/status");
        const std::size_t at = status.find("voluntary_ctxt_switches:");
        return std::stol(status.substr(status.find_first_of("0123456789", at)));
    };
    // It may still be at its first work, or be told of changes in /etc. One that looks around once
    // a second would be seen.
    EXPECT_TRUE(orva::test::WaitFor([&] {
        const long before = contextSwitches();
        absl::SleepFor(absl::Seconds(3));
        return contextSwitches() - before == 0;
    }));
}

}  // namespace
