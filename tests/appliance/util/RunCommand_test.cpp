#include "appliance/util/RunCommand.h"

#include <gmock/gmock.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <thread>

#include "appliance/util/StopSignals.h"
#include "tests/appliance/util/Sandbox.h"

namespace orva {
namespace {

using Kind = CommandEnd::Kind;
using testing::MatchesRegex;

constexpr std::chrono::seconds kPatience{60};

class RunCommandTest : public Sandbox {
  protected:
    Command Shell(const std::string& line) const {
        Command command;
        command.arguments = ShellArguments(line);
        command.directory = RootPath();
        return command;
    }

    template <class Condition>
    static bool WaitUntil(Condition condition) {
        const auto deadline = std::chrono::steady_clock::now() + kPatience;
        while (!condition()) {
            if (std::chrono::steady_clock::now() > deadline) {
                return false;
            }
            std::this_thread::yield();
        }
        return true;
    }

    // Whether the process that wrote its id into a file of the sandbox still runs.
    bool Runs(const std::string& file) const {
        std::string state = "Z";
        const std::string id = Read(file);
        std::ifstream status("/proc/" + id.substr(0, id.find('\n')) + "/stat");
        status >> state >> state >> state;
        return state != "Z" && state != "X";
    }
};

TEST_F(RunCommandTest, GivesTheExitStatus) {
    const CommandEnd end = RunCommand(Shell("exit 7"));
    EXPECT_EQ(end.kind, Kind::kExited);
    EXPECT_EQ(end.number, 7);
    EXPECT_FALSE(end.Succeeded());
    EXPECT_EQ(DescribeEnd(end, {}), "exit status 7");
    EXPECT_TRUE(RunCommand(Shell("true")).Succeeded());
}

TEST_F(RunCommandTest, GivesTheSignalThatEndedIt) {
    const CommandEnd end = RunCommand(Shell("kill -KILL $$"));
    EXPECT_EQ(end.kind, Kind::kSignalled);
    EXPECT_EQ(end.number, SIGKILL);
    EXPECT_FALSE(end.Succeeded());
    EXPECT_EQ(DescribeEnd(end, {}), "ended by signal 9 (Killed)");
}

TEST_F(RunCommandTest, SaysThatAProgramCannotBeStarted) {
    Command command;
    command.arguments = {"/no/such/program"};
    const CommandEnd end = RunCommand(command);
    EXPECT_EQ(end.kind, Kind::kNotStarted);
    EXPECT_EQ(DescribeEnd(end, command), "cannot be started: No such file or directory");
    command = Shell("true");
    command.directory = RootPath() + "/none";
    EXPECT_EQ(RunCommand(command).kind, Kind::kNotStarted);
}

TEST_F(RunCommandTest, RunsInTheGivenFolderWithoutInput) {
    ASSERT_TRUE(RunCommand(Shell("pwd >place; cat >input; echo end >>input")).Succeeded());
    EXPECT_EQ(Read("/place"), std::filesystem::canonical(RootPath()).string() + "\n");
    EXPECT_EQ(Read("/input"), "end\n");
}

TEST_F(RunCommandTest, ItsOutputGoesWhereOursGoesUnlessItIsQuiet) {
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    Command command = Shell("echo out; echo err >&2");
    EXPECT_TRUE(RunCommand(command).Succeeded());
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "out\n");
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "err\n");
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    command.quiet = true;
    EXPECT_TRUE(RunCommand(command).Succeeded());
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "");
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
}

TEST_F(RunCommandTest, EndsItAndItsChildrenWhenTheLimitIsOver) {
    Command command = Shell("sh -c 'echo $$ >child; exec sleep 600' & wait");
    command.limit = std::chrono::milliseconds(700);
    const CommandEnd end = RunCommand(command);
    EXPECT_EQ(end.kind, Kind::kTimedOut);
    EXPECT_EQ(DescribeEnd(end, command), "did not end within 1 second");
    command.limit = std::chrono::seconds(90);
    EXPECT_EQ(DescribeEnd(end, command), "did not end within 90 seconds");
    EXPECT_TRUE(WaitUntil([this] { return !Runs("/child"); }));
}

TEST_F(RunCommandTest, KillsWhatDoesNotListen) {
    Command command = Shell("trap '' TERM; echo $$ >self; while :; do sleep 600; done");
    command.limit = std::chrono::milliseconds(300);
    command.grace = std::chrono::milliseconds(1);
    EXPECT_EQ(RunCommand(command).kind, Kind::kTimedOut);
}

TEST_F(RunCommandTest, DoesNotWaitForWhatIsLeftInTheBackground) {
    const Command command =
        Shell("setsid sh -c 'echo $$ >left; exec sleep 600' & while ! [ -s left ]; do :; done");
    EXPECT_TRUE(RunCommand(command).Succeeded());
    EXPECT_TRUE(Runs("/left"));
    ::kill(std::stoi(Read("/left")), SIGKILL);
}

TEST_F(RunCommandTest, PassesOnTheSignalThatTellsUsToEnd) {
    for (const int signal : {SIGTERM, SIGINT, SIGHUP}) {
        Write("/begun", "");
        const pid_t child = ::fork();
        if (child == 0) {
            const CommandEnd end = RunCommand(Shell(
                "trap 'echo stopped >>begun; exit 0' TERM; echo $$ >begun; sleep 600 & wait"));
            Write("/end", DescribeEnd(end, {}));
            EndBySignal(end.number);
            std::_Exit(0);
        }
        EXPECT_TRUE(WaitUntil([this] { return Read("/begun") != ""; }));
        ::kill(child, signal);
        int status = 0;
        ::waitpid(child, &status, 0);
        EXPECT_TRUE(WIFSIGNALED(status));
        EXPECT_EQ(WTERMSIG(status), signal);
        EXPECT_THAT(Read("/begun"), MatchesRegex("[0-9]+\nstopped\n"));
        EXPECT_THAT(Read("/end"), MatchesRegex("was interrupted \\(.+\\)"));
    }
}

TEST_F(RunCommandTest, TheCommandListensToTheSignalsThatWeHoldBack) {
    EXPECT_EQ(RunCommand(Shell("kill -TERM $$")).number, SIGTERM);
}

}  // namespace
}  // namespace orva
