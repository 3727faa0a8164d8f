#include "appliance/modules/ProgramLines.h"

#include <errno.h>
#include <gmock/gmock.h>
#include <signal.h>

#include <chrono>
#include <fstream>
#include <string>
#include <thread>
#include <vector>

namespace orva {
namespace {

using std::chrono::milliseconds;
using testing::ElementsAre;

constexpr milliseconds kPatience{60'000};

struct Read {
    ProgramEnd end;
    std::vector<std::string> lines;
};

Read ReadScript(const std::string& script, milliseconds limit = kPatience) {
    Read read;
    read.end = ReadProgramLines({"/bin/sh", "-c", script}, limit, 100,
                                [&](std::string_view line) { read.lines.emplace_back(line); });
    return read;
}

TEST(ProgramLines, EveryLineIsHandedOverWithoutItsEnd) {
    const Read read = ReadScript("printf 'a\\n\\nb'; exit 3");
    EXPECT_THAT(read.lines, ElementsAre("a", "", "b"));
    EXPECT_EQ(read.end.kind, ProgramEnd::Kind::kExited);
    EXPECT_EQ(read.end.number, 3);
}

TEST(ProgramLines, MoreThanAPipeHoldsArrivesWhole) {
    const Read read = ReadScript("i=0; while [ $i -lt 50000 ]; do i=$((i+1)); echo $i; done");
    ASSERT_EQ(read.lines.size(), 50000U);
    EXPECT_EQ(read.lines[49999], "50000");
    EXPECT_EQ(read.end.number, 0);
}

TEST(ProgramLines, OnlyTheStartOfALongLineIsKept) {
    const Read read = ReadScript("printf '%0150d\\nx\\n' 0");
    EXPECT_THAT(read.lines, ElementsAre(std::string(100, '0'), "x"));
}

TEST(ProgramLines, StandardErrorAndInputAreNotTheCallers) {
    const Read read = ReadScript("echo lost >&2; cat; echo end");
    EXPECT_THAT(read.lines, ElementsAre("end"));
}

TEST(ProgramLines, ASignalIsToldApartFromAnExit) {
    const Read read = ReadScript("kill -TERM $$");
    EXPECT_EQ(read.end.kind, ProgramEnd::Kind::kSignalled);
    EXPECT_EQ(read.end.number, SIGTERM);
}

TEST(ProgramLines, AProgramThatIsNotThereIsTold) {
    const ProgramEnd end =
        ReadProgramLines({"/no/such/program"}, kPatience, 100, [](std::string_view) {});
    EXPECT_EQ(end.kind, ProgramEnd::Kind::kNotStarted);
    EXPECT_EQ(end.number, ENOENT);
}

// Whether the process runs on, killed or not: a zombie does not.
bool IsRunning(const std::string& pid) {
    std::ifstream status("/proc/" + pid + "/status");
    for (std::string line; std::getline(status, line);) {
        if (line.starts_with("State:")) {
            return line.find_first_of("ZX") == std::string::npos;
        }
    }
    return false;
}

TEST(ProgramLines, WhoTakesTooLongIsKilledWithItsChildren) {
    const Read read = ReadScript("sleep 1000 & echo $!; wait", milliseconds(2000));
    EXPECT_EQ(read.end.kind, ProgramEnd::Kind::kTimedOut);
    ASSERT_EQ(read.lines.size(), 1U);
    // The kernel takes a moment to end what was killed.
    const auto deadline = std::chrono::steady_clock::now() + kPatience;
    while (IsRunning(read.lines[0]) && std::chrono::steady_clock::now() < deadline) {
        std::this_thread::yield();
    }
    EXPECT_FALSE(IsRunning(read.lines[0]));
}

TEST(ProgramLines, WhoClosesItsOutputAndStaysIsKilledToo) {
    const Read read = ReadScript("exec >/dev/null; exec sleep 1000", milliseconds(200));
    EXPECT_EQ(read.end.kind, ProgramEnd::Kind::kTimedOut);
}

TEST(ProgramLines, SignalsThatTheCallerIgnoresEndTheProgram) {
    const auto former = ::signal(SIGPIPE, SIG_IGN);
    const Read read = ReadScript("kill -PIPE $$");
    ::signal(SIGPIPE, former);
    EXPECT_EQ(read.end.kind, ProgramEnd::Kind::kSignalled);
    EXPECT_EQ(read.end.number, SIGPIPE);
}

}  // namespace
}  // namespace orva
