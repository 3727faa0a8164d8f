#pragma once

#include <chrono>
#include <cstddef>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace orva {

// How a program that was read from has ended.
struct ProgramEnd {
    enum class Kind {
        kExited,      // `number` is its exit status
        kSignalled,   // by the signal `number`
        kTimedOut,    // killed, since the time was over
        kNotStarted,  // `number` is the errno
    };
    Kind kind = Kind::kExited;
    int number = 0;
};

// Runs a program, its full path first, and hands every line of its standard output to `take`
// without its line end; of a line longer than `longest` bytes only the start. It gets no input, and
// what it writes to standard error goes nowhere. When `limit` is over it is killed with all of its
// process group.
//
// Threads: any, in a process that leaves SIGCHLD alone.
[[nodiscard]] ProgramEnd ReadProgramLines(const std::vector<std::string>& arguments,
                                          std::chrono::milliseconds limit, std::size_t longest,
                                          const std::function<void(std::string_view)>& take);

}  // namespace orva
