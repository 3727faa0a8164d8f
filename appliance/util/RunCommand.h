#pragma once

#include <chrono>
#include <string>
#include <vector>

namespace orva {

// A program to be run to its end.
struct Command {
    // The program, looked for in PATH unless it has a slash, and its arguments.
    std::vector<std::string> arguments;
    // Where it runs; empty: where this process does.
    std::string directory;
    // Its output goes nowhere, instead of where this process's goes.
    bool quiet = false;
    std::chrono::milliseconds limit{60'000};
    // How long it may take to end after TERM, before KILL.
    std::chrono::milliseconds grace{5'000};
};

// A command line for /bin/sh.
std::vector<std::string> ShellArguments(const std::string& commandLine);

struct CommandEnd {
    enum class Kind {
        kExited,       // by itself: `number` is its exit status
        kSignalled,    // by the signal `number`
        kTimedOut,     // killed because the limit was over
        kNotStarted,   // `number` is the errno
        kInterrupted,  // this process was told to end by the signal `number`, and so was it
    };
    Kind kind = Kind::kExited;
    int number = 0;

    bool Succeeded() const { return kind == Kind::kExited && number == 0; }
};

// Runs a command and waits for it, not for what it leaves in the background. It gets no input, and
// a process group of its own, which ends with it when the limit is over or this process is told to
// end (TERM, INT, HUP): the caller then puts in order what it has to, and calls EndBySignal.
[[nodiscard]] CommandEnd RunCommand(const Command& command);

// "exit status 5", "ended by signal 9 (Killed)", "did not end within 60 seconds", ...
std::string DescribeEnd(const CommandEnd& end, const Command& command);

}  // namespace orva
