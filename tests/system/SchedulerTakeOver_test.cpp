// What a real scheduler makes of what it finds, when that is not what was left.
#include <SQLiteCpp/SQLiteCpp.h>
#include <absl/time/clock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>

#include "appliance/root/Root.h"
#include "appliance/store/SchedulerLink.h"
#include "appliance/supervisor/RunFolder.h"
#include "tests/system/RunningScheduler.h"

namespace {

using orva::RunFolder;
using orva::RunState;
using orva::SchedulerLink;
using orva::TaskStore;
using orva::test::ReadWholeFile;
using orva::test::RunningScheduler;
using orva::test::WaitFor;

namespace fs = std::filesystem;

class SchedulerTakeOverTest : public testing::Test {
  protected:
    std::string Mark(const std::string& name) const {
        return (appliance.Root().Path() / name).string();
    }
    bool WaitForMark(const std::string& name) const {
        return WaitFor([&] { return fs::exists(Mark(name)); });
    }
    // Adds a byte to the mark `name` and waits for the mark "go NAME".
    std::string WaitingCommand(const std::string& name) const {
        return "printf x >>" + Mark(name) + "; until [ -e '" + Mark("go " + name) +
               "' ]; do sleep 0.01; done";
    }
    void LetGo(const std::string& name) const { appliance.Root().Write("go " + name, ""); }

    static std::string DatabaseFile() { return orva::ResolvePath(TaskStore::kDatabaseFile); }
    // Whether a process has this id that has not ended.
    static bool Lives(pid_t process) {
        const std::string status = ReadWholeFile("/proc/" + std::to_string(process) + "/stat");
        const std::size_t nameEnd = status.rfind(')');
        return nameEnd != std::string::npos && status.substr(nameEnd + 2, 1) != "Z";
    }

    RunningScheduler appliance;
};

TEST_F(SchedulerTakeOverTest, ARunWhoseFolderSomebodyHasRemovedIsNotStartedAgain) {
    appliance.Start();
    const int task = appliance.AddTask(WaitingCommand("a") + "; : >" + Mark("over"));
    appliance.MakeDueNow(task);
    appliance.Wake();
    ASSERT_TRUE(WaitForMark("a"));
    appliance.Kill();
    fs::remove_all(orva::ResolvePath(RunFolder::kRunsFolder));
    appliance.Start();
    appliance.WaitUntilIdle();
    EXPECT_EQ(appliance.OnlyRunOf(task).state, RunState::kLost);
    EXPECT_EQ(ReadWholeFile(Mark("a")), "x");
    LetGo("a");
    EXPECT_TRUE(WaitForMark("over"));
}

TEST_F(SchedulerTakeOverTest, AStopThatComesBeforeTheSchedulerKnowsWhatGoesOnIsToldThat) {
    appliance.Start();
    const int task = appliance.AddTask(WaitingCommand("a"));
    TaskStore::Current()->QueueRun(task);
    ASSERT_TRUE(WaitForMark("a"));
    const std::int64_t run = appliance.OnlyRunOf(task).id;
    appliance.Kill();
    {
        SQLite::Database other(DatabaseFile(), SQLite::OPEN_READWRITE, 60'000);
        other.exec("BEGIN IMMEDIATE");
        appliance.Launch();
        EXPECT_TRUE(WaitFor(
            [&] { return appliance.ErrorText().find("database is locked") != std::string::npos; }));
        EXPECT_EQ(SchedulerLink::Stop(run), "the scheduler is only just starting; try again");
        other.exec("ROLLBACK");
    }
    appliance.WaitUntilReady();
    EXPECT_EQ(SchedulerLink::Stop(run), std::nullopt);
    EXPECT_TRUE(appliance.WaitForState(run, RunState::kEnded));
}

TEST_F(SchedulerTakeOverTest, ARunOfADatabaseThatWasReplacedDoesNotEndInTheOtherOne) {
    appliance.Start();
    const int former = appliance.AddTask(WaitingCommand("former") + "; exit 9");
    const int later = appliance.AddTask(WaitingCommand("later") + "; exit 5");
    appliance.Execute("VACUUM INTO '" + Mark("kept") + "'");
    TaskStore::Current()->QueueRun(former);
    ASSERT_TRUE(WaitForMark("former"));
    ASSERT_EQ(appliance.OnlyRunOf(former).id, 1);
    const pid_t supervisor = RunFolder(1).Process()->supervisor;

    for (const char* log : {"-wal", "-shm"}) {
        fs::remove(DatabaseFile() + log);
    }
    fs::rename(Mark("kept"), DatabaseFile());
    TaskStore::Current()->QueueRun(later);
    ASSERT_TRUE(WaitForMark("later"));
    // The same id, for another run.
    EXPECT_EQ(appliance.OnlyRunOf(later).id, 1);
    LetGo("former");
    EXPECT_TRUE(WaitFor([&] { return !Lives(supervisor); }));
    EXPECT_EQ(RunFolder(1).Look(), RunFolder::State::kSupervised);
    EXPECT_EQ(appliance.OnlyRunOf(later).state, RunState::kRunning);
    LetGo("later");
    EXPECT_TRUE(appliance.WaitForState(1, RunState::kEnded));
    EXPECT_EQ(appliance.OnlyRunOf(later).exitStatus, 5);
    // It has gone on as if nothing were.
    TaskStore::Current()->QueueRun(former);
    EXPECT_TRUE(appliance.WaitForState(2, RunState::kEnded));
    EXPECT_EQ(appliance.OnlyRunOf(former).exitStatus, 9);
}

}  // namespace
