#include "appliance/package/PackageControl.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <thread>

#include "appliance/util/FileDescriptor.h"
#include "tests/appliance/util/Sandbox.h"

namespace orva {
namespace {

constexpr std::chrono::seconds kPatience{60};

class PackageControlTest : public Sandbox {
  protected:
    void Install(const std::string& id, const std::string& members) const {
        Write("/usr/orva/packages/" + id + "/package.json",
              R"({"display_name": "A Package", "startable": true)" + members + "}");
    }
    // A package that "runs" while there is a file in its folder.
    void InstallFlag(const std::string& id) const {
        Install(id, R"(, "start": "echo start >>calls; : >flag", "status": "test -e flag",
                         "stop": "echo stop >>calls; rm flag")");
    }
    std::string Calls(const std::string& id) const {
        return Read("/usr/orva/packages/" + id + "/calls");
    }

    // What its start, respectively stop, reports, after "done: " or "failed: ".
    static std::string Start(const std::string& id, const PackageControl::Limits& limits = {}) {
        return Change(id, limits, &PackageControl::Start);
    }
    static std::string Stop(const std::string& id, const PackageControl::Limits& limits = {}) {
        return Change(id, limits, &PackageControl::Stop);
    }

  private:
    static std::string Change(const std::string& id, const PackageControl::Limits& limits,
                              bool (PackageControl::*change)(std::string&) const) {
        PackageControl package(id, limits);
        std::string report;
        EXPECT_TRUE(package.Load(report)) << report;
        const bool done = (package.*change)(report);
        return (done ? "done: " : "failed: ") + report;
    }
};

TEST_F(PackageControlTest, StartsAndStopsByTheCommandsOfThePackage) {
    InstallFlag("a b");
    PackageControl package("a b");
    std::string report;
    ASSERT_TRUE(package.Load(report));
    EXPECT_EQ(package.Info().displayName, "A Package");
    EXPECT_EQ(package.State(), PackageState::kStopped);
    EXPECT_EQ(Start("a b"), "done: started");
    EXPECT_EQ(package.State(), PackageState::kRunning);
    EXPECT_EQ(Stop("a b"), "done: stopped");
    EXPECT_EQ(package.State(), PackageState::kStopped);
    EXPECT_EQ(Calls("a b"), "start\nstop\n");
}

TEST_F(PackageControlTest, LeavesAPackageAloneThatIsAsItShouldBe) {
    InstallFlag("p");
    EXPECT_EQ(Stop("p"), "done: is not running");
    EXPECT_EQ(Start("p"), "done: started");
    EXPECT_EQ(Start("p"), "done: is running already");
    EXPECT_EQ(Calls("p"), "start\n");
}

TEST_F(PackageControlTest, APackageWithoutAStatusIsToldEachTime) {
    Install("p", R"(, "start": "echo start >>calls", "stop": "echo stop >>calls")");
    EXPECT_EQ(Start("p"), "done: started");
    EXPECT_EQ(Start("p"), "done: started");
    EXPECT_EQ(Stop("p"), "done: stopped");
    EXPECT_EQ(Calls("p"), "start\nstart\nstop\n");
    PackageControl package("p");
    std::string report;
    ASSERT_TRUE(package.Load(report));
    EXPECT_EQ(package.State(), PackageState::kUnknown);
}

TEST_F(PackageControlTest, SaysWhyAPackageCannotBeLoaded) {
    Write("/usr/orva/packages/broken/package.json", "{");
    std::string report;
    EXPECT_FALSE(PackageControl("broken").Load(report));
    EXPECT_EQ(report, "its description is damaged");
    for (const char* id : {"nope", "", "../packages/broken", "-h"}) {
        EXPECT_FALSE(PackageControl(id).Load(report));
        EXPECT_EQ(report, "is not installed");
    }
}

TEST_F(PackageControlTest, RefusesWhatCannotBeStarted) {
    Write("/usr/orva/packages/p/package.json",
          R"({"display_name": "P", "start": "touch x", "stop": "touch x", "status": "false"})");
    EXPECT_EQ(Start("p"), "failed: cannot be started: it is not made to be started and stopped");
    EXPECT_EQ(Stop("p"), "failed: cannot be stopped: it is not made to be started and stopped");
    EXPECT_FALSE(std::filesystem::exists(RootPath() + "/usr/orva/packages/p/x"));
    Install("q", "");
    EXPECT_EQ(Start("q"), "failed: cannot be started: it gives no start command");
    EXPECT_EQ(Stop("q"), "failed: cannot be stopped: it gives no stop command");
}

TEST_F(PackageControlTest, AFailedCommandIsReported) {
    Install("p", R"(, "start": "exit 4", "stop": "kill -KILL $$")");
    EXPECT_EQ(Start("p"), "failed: its start command: exit status 4");
    EXPECT_EQ(Stop("p"), "failed: its stop command: ended by signal 9 (Killed)");
}

TEST_F(PackageControlTest, ACommandThatDoesNotEndIsEnded) {
    Install("p", R"(, "start": "exec sleep 600", "stop": "true", "status": "exec sleep 600")");
    PackageControl::Limits limits;
    limits.status = std::chrono::milliseconds(10);
    PackageControl::Limits hasty = limits;
    hasty.command = std::chrono::milliseconds(10);
    EXPECT_EQ(Start("p", hasty), "failed: its start command: did not end within 1 second");
    EXPECT_EQ(Stop("p", limits), "failed: its status command does not work after its stop");
    PackageControl package("p", limits);
    std::string report;
    ASSERT_TRUE(package.Load(report));
    EXPECT_EQ(package.State(), PackageState::kUnknown);
}

TEST_F(PackageControlTest, WaitsUntilItsStatusShowsTheStart) {
    // The status looks three times before it finds it running.
    Install("p", R"json(, "start": "echo 0 >looks", "stop": "true",
        "status": "test -e looks && n=$(($(cat looks) + 1)) && echo $n >looks && test $n -ge 3")json");
    EXPECT_EQ(Start("p"), "done: started");
    EXPECT_EQ(Read("/usr/orva/packages/p/looks"), "3\n");
}

TEST_F(PackageControlTest, ACommandThatSucceedsWithoutEffectIsAFailure) {
    Install("p", R"(, "start": "true", "stop": "true", "status": "test -e flag")");
    PackageControl::Limits limits;
    limits.settling = std::chrono::milliseconds(1);
    EXPECT_EQ(Start("p", limits), "failed: does not run although its start command succeeded");
    Write("/usr/orva/packages/p/flag", "");
    EXPECT_EQ(Stop("p", limits), "failed: still runs although its stop command succeeded");
}

TEST_F(PackageControlTest, WhatIsLeftRunningOutlivesTheStartAndHoldsNothing) {
    Install("p", R"json(, "start": "setsid sh -c 'echo $$ >pid; exec sleep 600' >log 2>&1 &",
        "status": "test -s pid && kill -0 $(cat pid)",
        "stop": "kill $(cat pid); rm pid")json");
    EXPECT_EQ(Start("p"), "done: started");
    // It would wait for ever if the process that was left behind held the package's lock.
    EXPECT_EQ(Start("p"), "done: is running already");
    EXPECT_EQ(Stop("p"), "done: stopped");
    EXPECT_EQ(Stop("p"), "done: is not running");
}

TEST_F(PackageControlTest, TwoStartsAtOnceTakeTurns) {
    Install("p", R"(, "start": "echo begin >>calls; sleep 0.1; echo end >>calls; : >flag",
        "status": "test -e flag", "stop": "rm flag")");
    std::vector<pid_t> children;
    for (int number = 0; number < 4; ++number) {
        const pid_t child = ::fork();
        if (child == 0) {
            const std::string report = Start("p");
            std::_Exit(report == "done: started" ? 1 : 0);
        }
        children.push_back(child);
    }
    std::vector<int> statuses;
    for (const pid_t child : children) {
        int status = 0;
        ::waitpid(child, &status, 0);
        statuses.push_back(WEXITSTATUS(status));
    }
    EXPECT_THAT(statuses, testing::UnorderedElementsAre(1, 0, 0, 0));
    EXPECT_EQ(Calls("p"), "begin\nend\n");
}

TEST_F(PackageControlTest, WhoeverMayReadThePackagesFolderCannotHoldUpAStart) {
    InstallFlag("p");
    const FileDescriptor folder(
        ::open((RootPath() + "/usr/orva/packages/p").c_str(), O_RDONLY | O_CLOEXEC));
    ASSERT_EQ(::flock(folder.Get(), LOCK_EX), 0);
    EXPECT_EQ(Start("p"), "done: started");
    struct stat status {};
    ASSERT_EQ(::stat((RootPath() + "/run/orva/packages").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0700U);
    ASSERT_EQ(::stat((RootPath() + "/run/orva/packages/p").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0600U);
}

TEST_F(PackageControlTest, DoesNotWaitForItsTurnForEver) {
    InstallFlag("p");
    Write("/run/orva/packages/p", "");
    const FileDescriptor other(
        ::open((RootPath() + "/run/orva/packages/p").c_str(), O_RDONLY | O_CLOEXEC));
    ASSERT_EQ(::flock(other.Get(), LOCK_EX), 0);
    PackageControl::Limits limits;
    limits.turn = std::chrono::milliseconds(1);
    EXPECT_EQ(Start("p", limits),
              "failed: another start or stop of it did not end within 1 second");
    EXPECT_EQ(Calls("p"), "");
}

TEST_F(PackageControlTest, APackageThatCannotBeLockedIsLeftAlone) {
    InstallFlag("p");
    Write("/run/orva/packages", "a file");
    EXPECT_EQ(Start("p"),
              "failed: cannot be locked: " + RootPath() + "/run/orva/packages/p: Not a directory");
    EXPECT_EQ(Calls("p"), "");
}

TEST_F(PackageControlTest, ASignalEndsTheCommandAndTheProgram) {
    Install("p", R"(, "stop": "true", "start":
        "trap 'echo stopped >>calls; exit 0' TERM; echo begun >>calls; sleep 600 & wait")");
    const pid_t child = ::fork();
    if (child == 0) {
        Start("p");
        std::_Exit(0);
    }
    const auto deadline = std::chrono::steady_clock::now() + kPatience;
    while (Calls("p").empty() && std::chrono::steady_clock::now() < deadline) {
        std::this_thread::yield();
    }
    ::kill(child, SIGTERM);
    int status = 0;
    ::waitpid(child, &status, 0);
    EXPECT_TRUE(WIFSIGNALED(status));
    EXPECT_EQ(WTERMSIG(status), SIGTERM);
    EXPECT_EQ(Calls("p"), "begun\nstopped\n");
}

}  // namespace
}  // namespace orva
