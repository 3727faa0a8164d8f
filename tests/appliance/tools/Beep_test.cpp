#include "appliance/tools/Beep.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <thread>

#include "tests/appliance/tools/BuzzerTest.h"

namespace orva {
namespace {

using testing::Each;
using testing::Ge;
using testing::IsEmpty;
using testing::SizeIs;

constexpr std::chrono::seconds kPatience{60};

// A terminal that nobody looks at but the test.
class Terminal {
  public:
    Terminal() : master(::posix_openpt(O_RDWR | O_NOCTTY | O_NONBLOCK)) {
        ::grantpt(master);
        ::unlockpt(master);
        slave = ::open(::ptsname(master), O_RDWR | O_NOCTTY);
    }
    ~Terminal() {
        ::close(slave);
        ::close(master);
    }
    Terminal(const Terminal&) = delete;
    Terminal& operator=(const Terminal&) = delete;

    int Get() const { return slave; }
    std::string Shown() const {
        char bytes[256];
        const ssize_t got = ::read(master, bytes, sizeof bytes);
        return {bytes, static_cast<std::size_t>(got > 0 ? got : 0)};
    }

  private:
    int master;
    int slave;
};

class BeepTest : public BuzzerTest {
  protected:
    // Its exit status; what it complained about is in `err`.
    int Run(const std::string& seconds, int terminal = -1) {
        testing::internal::CaptureStderr();
        const int status = Beep(seconds, Places(), terminal);
        err = testing::internal::GetCapturedStderr();
        return status;
    }

    // Starts to beep in a process of its own, which is told to end as soon as `hasBegun`. The
    // signal that it ended by; 0 when it ended by itself.
    template <class Condition>
    int BeepAndStop(int signal, int terminal, Condition hasBegun) {
        const pid_t child = ::fork();
        if (child == 0) {
            std::_Exit(Beep("600", Places(), terminal));
        }
        const auto deadline = std::chrono::steady_clock::now() + kPatience;
        while (!hasBegun() && std::chrono::steady_clock::now() < deadline) {
            std::this_thread::yield();
        }
        ::kill(child, signal);
        int status = 0;
        ::waitpid(child, &status, 0);
        return WIFSIGNALED(status) ? WTERMSIG(status) : 0;
    }

    std::string err;
};

TEST_F(BeepTest, SoundsForItsTimeAndIsSilentAfterwards) {
    AddInput("input0", "6", "event0");
    const auto begin = std::chrono::steady_clock::now();
    EXPECT_EQ(Run("1"), 0);
    EXPECT_GE(std::chrono::steady_clock::now() - begin, std::chrono::seconds(1));
    EXPECT_EQ(err, "");
    std::vector<std::string> sounds = Sounds("event0");
    // Told again meanwhile, because another beep may have ended.
    ASSERT_THAT(sounds, SizeIs(Ge(3U)));
    EXPECT_EQ(sounds.back(), "tone 0");
    sounds.pop_back();
    EXPECT_THAT(sounds, Each("tone 1000"));
}

TEST_F(BeepTest, TakesPlainNumbersFromOneToSixHundredOnly) {
    AddInput("input0", "6", "event0");
    for (const char* seconds : {"", "0", "601", "-1", "+1", "1.5", "1s", " 1", "1 ", "0x10", "one",
                                "99999999999999999999"}) {
        EXPECT_EQ(Run(seconds), 2) << seconds;
        EXPECT_EQ(err,
                  "orvaschedtool: --beep needs a number of seconds from 1 to 600 (see "
                  "orvaschedtool --help)\n");
    }
    EXPECT_THAT(Sounds("event0"), IsEmpty());
}

TEST_F(BeepTest, SaysThatTheMachineHasNoBuzzerAtOnce) {
    EXPECT_EQ(Run("600"), 3);
    EXPECT_EQ(err, "orvaschedtool: this machine has no buzzer\n");
}

TEST_F(BeepTest, RingsTheTerminalWhereThereIsNoBuzzer) {
    const Terminal terminal;
    EXPECT_EQ(Run("1", terminal.Get()), 3);
    EXPECT_EQ(err, "orvaschedtool: this machine has no buzzer\n");
    EXPECT_EQ(terminal.Shown(), "\a");
}

TEST_F(BeepTest, RingsTheTerminalWhereTheBuzzerMayNotBeUsed) {
    AddInput("input0", "6", "event0");
    std::filesystem::remove(NodeOf("event0"));
    const Terminal terminal;
    EXPECT_EQ(Run("1", terminal.Get()), 1);
    EXPECT_EQ(err, "orvaschedtool: the buzzer cannot be used: " + NodeOf("event0") +
                       ": No such file or directory\n");
    EXPECT_EQ(terminal.Shown(), "\a");
}

TEST_F(BeepTest, SaysThatTheBuzzerFailed) {
    AddInput("input0", "6", "event0");
    std::filesystem::remove(NodeOf("event0"));
    std::filesystem::create_symlink("/dev/full", NodeOf("event0"));
    EXPECT_EQ(Run("600"), 1);
    EXPECT_EQ(err, "orvaschedtool: the buzzer failed: No space left on device\n");
}

TEST_F(BeepTest, IsSilentWhenItIsToldToEndAndEndsByThatSignal) {
    for (const int signal : {SIGTERM, SIGINT, SIGHUP}) {
        AddInput("input0", "6", "event0");
        EXPECT_EQ(BeepAndStop(signal, -1, [this] { return !Sounds("event0").empty(); }), signal);
        const std::vector<std::string> sounds = Sounds("event0");
        ASSERT_FALSE(sounds.empty());
        EXPECT_EQ(sounds.front(), "tone 1000");
        EXPECT_EQ(sounds.back(), "tone 0");
    }
}

TEST_F(BeepTest, ATerminalStopsRingingWhenItIsToldToEnd) {
    const Terminal terminal;
    EXPECT_EQ(BeepAndStop(SIGTERM, terminal.Get(), [&terminal] { return terminal.Shown() != ""; }),
              SIGTERM);
}

}  // namespace
}  // namespace orva
