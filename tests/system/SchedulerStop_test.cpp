// Stops of runs, and runs that nobody cares for any more, with real processes.
#include <absl/time/clock.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>

#include <cstdlib>
#include <filesystem>
#include <string>

#include "appliance/store/SchedulerLink.h"
#include "appliance/supervisor/RunFolder.h"
#include "tests/system/RunningScheduler.h"

namespace {

using orva::RunState;
using orva::SchedulerLink;
using orva::TaskStore;
using orva::test::ReadWholeFile;
using orva::test::RunningScheduler;

namespace fs = std::filesystem;

class SchedulerStopTest : public testing::Test {
  protected:
    std::string Mark(const std::string& name) const {
        return (appliance.Root().Path() / name).string();
    }
    bool WaitForMark(const std::string& name) const {
        return orva::test::WaitFor([&] { return fs::exists(Mark(name)); });
    }
    // Yields the run once its command has left the mark.
    std::int64_t RunUntilMark(int task, const std::string& name) const {
        TaskStore::Current()->QueueRun(task);
        EXPECT_TRUE(WaitForMark(name));
        return appliance.OnlyRunOf(task).id;
    }
    // Whether the process whose id stands in the mark lives.
    bool Lives(const std::string& name) const {
        const std::string id = ReadWholeFile(Mark(name));
        const std::string status = ReadWholeFile("/proc/" + id.substr(0, id.find('\n')) + "/stat");
        const std::size_t nameEnd = status.rfind(')');
        return nameEnd != std::string::npos && status.substr(nameEnd + 2, 1) != "Z";
    }
    // Prints its id into the mark and lives until it is killed.
    std::string Stubborn(const std::string& name) const {
        return "trap '' TERM; echo $$ >" + Mark("new") + "; mv " + Mark("new") + " " + Mark(name) +
               "; while :; do sleep 0.1; done";
    }

    RunningScheduler appliance;
};

TEST_F(SchedulerStopTest, AStopHoldsWhenTheSchedulerIsKilledMeanwhile) {
    appliance.Start();
    const int task = appliance.AddTask(Stubborn("up"));
    const std::int64_t run = RunUntilMark(task, "up");
    const absl::Time asked = absl::Now();
    EXPECT_EQ(SchedulerLink::Stop(run), std::nullopt);
    appliance.Kill();
    appliance.Start();
    EXPECT_TRUE(appliance.WaitForState(run, RunState::kEnded));
    EXPECT_EQ(appliance.OnlyRunOf(task).signal, SIGKILL);
    EXPECT_EQ(appliance.OnlyRunOf(task).why, "stopped");
    EXPECT_GE(absl::Now() - asked, absl::Seconds(10));
    EXPECT_FALSE(Lives("up"));
}

TEST_F(SchedulerStopTest, ASchedulerThatIsGoneBeforeItsFirstSignalLeavesThatToTheNextOne) {
    appliance.Start();
    const int task = appliance.AddTask("echo up >" + Mark("up") + "; exec sleep 1000");
    const std::int64_t run = RunUntilMark(task, "up");
    appliance.Kill();
    ASSERT_TRUE(orva::RunFolder(run).RecordStop(orva::MonotonicNow() + 1'000'000'000));
    appliance.Start();
    EXPECT_TRUE(appliance.WaitForState(run, RunState::kEnded));
    EXPECT_EQ(appliance.OnlyRunOf(task).signal, SIGTERM);
}

TEST_F(SchedulerStopTest, AStopWhoseTimeHasPassedMeanwhileIsCarriedOutAtOnce) {
    appliance.Start();
    const int task = appliance.AddTask(Stubborn("up"));
    const std::int64_t run = RunUntilMark(task, "up");
    appliance.Kill();
    ASSERT_TRUE(orva::RunFolder(run).RecordStop(1));
    appliance.Start();
    EXPECT_TRUE(appliance.WaitForState(run, RunState::kEnded));
    EXPECT_EQ(appliance.OnlyRunOf(task).signal, SIGKILL);
}

TEST_F(SchedulerStopTest, AStopEndsWhatItsShellLeavesBehindToo) {
    appliance.Start();
    appliance.Root().Write("stubborn", Stubborn("up"));
    const int task = appliance.AddTask("sh " + Mark("stubborn") + " & wait");
    const std::int64_t run = RunUntilMark(task, "up");
    EXPECT_EQ(SchedulerLink::Stop(run), std::nullopt);
    EXPECT_TRUE(appliance.WaitForState(run, RunState::kEnded));
    EXPECT_FALSE(Lives("up"));
    EXPECT_EQ(appliance.OnlyRunOf(task).signal, SIGTERM);
}

TEST_F(SchedulerStopTest, ACommandWhoseSupervisorWasKilledIsKilledBeforeItsRunIsLost) {
    appliance.Start();
    const int task = appliance.AddTask(Stubborn("up"));
    const std::int64_t run = RunUntilMark(task, "up");
    ::kill(orva::RunFolder(run).Process()->supervisor, SIGKILL);
    EXPECT_TRUE(appliance.WaitForState(run, RunState::kLost));
    EXPECT_FALSE(Lives("up"));
}

TEST_F(SchedulerStopTest, TheNextSchedulerKillsTheCommandOfARunThatNobodyCaresFor) {
    appliance.Start();
    const int task = appliance.AddTask(Stubborn("up"));
    const std::int64_t run = RunUntilMark(task, "up");
    appliance.Kill();
    ::kill(orva::RunFolder(run).Process()->supervisor, SIGKILL);
    ASSERT_TRUE(orva::test::WaitFor([&] { return !orva::RunFolder(run).IsSupervised(); }));
    appliance.Start();
    EXPECT_TRUE(appliance.WaitForState(run, RunState::kLost));
    EXPECT_FALSE(Lives("up"));
}

TEST_F(SchedulerStopTest, ARunWhoseFolderCannotBeReadForNowIsNotStartedAgain) {
    appliance.Start();
    const int task = appliance.AddTask("printf x >>" + Mark("up") + "; until [ -e " + Mark("go") +
                                       " ]; do sleep 0.01; done; exit 5");
    const std::int64_t run = RunUntilMark(task, "up");
    appliance.Kill();
    const std::string process = orva::RunFolder(run).Path() + "/process";
    fs::rename(process, process + ".away");
    fs::create_symlink("process", process);
    appliance.Start();
    EXPECT_EQ(SchedulerLink::Stop(1000), "no such run");
    EXPECT_EQ(appliance.OnlyRunOf(task).state, RunState::kRunning);
    fs::rename(process + ".away", process);
    appliance.Root().Write("go", "");
    EXPECT_TRUE(appliance.WaitForState(run, RunState::kEnded));
    EXPECT_EQ(appliance.OnlyRunOf(task).exitStatus, 5);
    EXPECT_EQ(ReadWholeFile(Mark("up")), "x");
}

}  // namespace
