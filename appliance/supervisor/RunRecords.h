// What the scheduler and the supervisor of a run tell each other through the run's folder, and its
// form in files: records "name=value" that a NUL ends, since commands may hold any other byte.
//
// Threads: any.
#pragma once

#include <sys/types.h>

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace orva {

// The exact instant in microseconds, as runs are stored.
using RunTime = std::chrono::sys_time<std::chrono::microseconds>;

// What is to be run.
struct RunOrder {
    std::int64_t run = 0;
    int task = 0;
    std::string owner;
    std::string command;  // for /bin/sh -c
    // Variables beside those that every run gets, or in their place; names without '=' or NUL.
    std::vector<std::pair<std::string, std::string>> environment;

    bool operator==(const RunOrder&) const = default;
};

// Which process cares for a run. A process id alone is given to others after its process has ended.
struct RunProcess {
    std::string bootId;
    pid_t supervisor = 0;
    std::uint64_t supervisorStart = 0;  // in clock ticks since the machine started
    pid_t command = 0;                  // also its process group; 0 before it has started
    std::uint64_t commandStart = 0;     // as supervisorStart; 0 when it is not known
    // When a command that was asked to end is killed, in microseconds of the monotonic clock; 0
    // when it was not asked.
    std::uint64_t killAt = 0;

    bool operator==(const RunProcess&) const = default;
};

// What the history says of a run that somebody has stopped, before its start or after. Stored: it
// never changes.
inline constexpr const char* kWhyStopped = "stopped";

// How a run ended.
struct RunEnding {
    std::optional<RunTime> started;  // none: the command was not started
    RunTime ended;
    // Exactly one of the two when the command was started; none otherwise.
    std::optional<int> exitStatus;
    std::optional<int> signal;
    // Why it could not be started; kWhyStopped when it was and somebody has stopped it; else empty.
    std::string why;

    bool operator==(const RunEnding&) const = default;
};

// None for what the counterpart below has not written whole.
std::string ToRecords(const RunOrder& order);
std::optional<RunOrder> OrderFromRecords(std::string_view records);
std::string ToRecords(const RunEnding& ending);
std::optional<RunEnding> EndingFromRecords(std::string_view records);

// A process's records are written in parts: the supervisor's, the command's once it has been
// started, and one for a stop whenever that is asked for.
std::string SupervisorRecords(const RunProcess& process);
std::string CommandRecords(pid_t command, std::uint64_t start);
std::string StopRecord(std::uint64_t killAt);
std::optional<RunProcess> ProcessFromRecords(std::string_view records);

// The present instant of the machine's wall clock.
RunTime RunTimeNow();
// The present time of the monotonic clock, in microseconds.
std::uint64_t MonotonicNow();
// The running machine's boot id; empty when /proc does not tell it.
std::string BootId();
// When the process was started, in clock ticks since the machine started; none when there is no
// such process.
std::optional<std::uint64_t> ProcessStart(pid_t process);

}  // namespace orva
