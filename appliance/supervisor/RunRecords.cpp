#include "appliance/supervisor/RunRecords.h"

#include <fcntl.h>
#include <time.h>

#include <charconv>
#include <type_traits>

#include "appliance/util/FileDescriptor.h"

namespace orva {
namespace {

// The last record of a whole text: a file may have been cut off, or be longer than what it holds.
constexpr std::string_view kEnd = "end";
constexpr std::string_view kVariablePrefix = "env:";

void Add(std::string& records, std::string_view name, std::string_view value) {
    records.append(name);
    records += '=';
    records.append(value);
    records += '\0';
}

template <class Number>
std::enable_if_t<std::is_integral_v<Number>> Add(std::string& records, std::string_view name,
                                                 Number number) {
    Add(records, name, std::to_string(number));
}

void Add(std::string& records, std::string_view name, RunTime time) {
    Add(records, name, time.time_since_epoch().count());
}

// Takes the next whole record off `records`.
bool Next(std::string_view& records, std::string_view& name, std::string_view& value) {
    const std::size_t end = records.find('\0');
    if (end == std::string_view::npos) {
        return false;
    }
    const std::string_view record = records.substr(0, end);
    records.remove_prefix(end + 1);
    const std::size_t equals = record.find('=');
    if (equals == std::string_view::npos) {
        return false;
    }
    name = record.substr(0, equals);
    value = record.substr(equals + 1);
    return true;
}

template <class Number>
bool Read(std::string_view text, Number& number) {
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    return error == std::errc() && stop == end;
}

template <class Number>
bool Read(std::string_view text, std::optional<Number>& number) {
    return Read(text, number.emplace());
}

bool Read(std::string_view text, RunTime& time) {
    std::int64_t count = 0;
    const bool read = Read(text, count);
    time = RunTime(std::chrono::microseconds(count));
    return read;
}

bool Read(std::string_view text, std::string& value) {
    value = text;
    return true;
}

// The content of one of /proc's small files; empty when it cannot be read.
std::string ReadSmallFile(const std::string& path) {
    const FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    char buffer[4096];
    const ssize_t got = file.IsOpen() ? ::read(file.Get(), buffer, sizeof buffer) : 0;
    return got > 0 ? std::string(buffer, static_cast<std::size_t>(got)) : std::string();
}

}  // namespace

std::string ToRecords(const RunOrder& order) {
    std::string records;
    Add(records, "run", order.run);
    Add(records, "task", order.task);
    Add(records, "owner", order.owner);
    Add(records, "command", order.command);
    for (const auto& [name, value] : order.environment) {
        Add(records, std::string(kVariablePrefix) + name, value);
    }
    Add(records, kEnd, "");
    return records;
}

std::optional<RunOrder> OrderFromRecords(std::string_view records) {
    RunOrder order;
    bool good = true;
    for (std::string_view name, value; good && Next(records, name, value);) {
        if (name == kEnd) {
            return order;
        }
        if (name == "run") {
            good = Read(value, order.run);
        } else if (name == "task") {
            good = Read(value, order.task);
        } else if (name == "owner") {
            good = Read(value, order.owner);
        } else if (name == "command") {
            good = Read(value, order.command);
        } else if (name.starts_with(kVariablePrefix)) {
            order.environment.emplace_back(name.substr(kVariablePrefix.size()), value);
        } else {
            good = false;
        }
    }
    return std::nullopt;
}

std::string ToRecords(const RunEnding& ending) {
    std::string records;
    if (ending.started) {
        Add(records, "started", *ending.started);
    }
    Add(records, "ended", ending.ended);
    if (ending.exitStatus) {
        Add(records, "exit", *ending.exitStatus);
    }
    if (ending.signal) {
        Add(records, "signal", *ending.signal);
    }
    Add(records, "why", ending.why);
    Add(records, kEnd, "");
    return records;
}

std::optional<RunEnding> EndingFromRecords(std::string_view records) {
    RunEnding ending;
    bool good = true;
    for (std::string_view name, value; good && Next(records, name, value);) {
        if (name == kEnd) {
            return ending;
        }
        if (name == "started") {
            good = Read(value, ending.started.emplace());
        } else if (name == "ended") {
            good = Read(value, ending.ended);
        } else if (name == "exit") {
            good = Read(value, ending.exitStatus);
        } else if (name == "signal") {
            good = Read(value, ending.signal);
        } else if (name == "why") {
            good = Read(value, ending.why);
        } else {
            good = false;
        }
    }
    return std::nullopt;
}

std::string SupervisorRecords(const RunProcess& process) {
    std::string records;
    Add(records, "boot", process.bootId);
    Add(records, "start", process.supervisorStart);
    Add(records, "supervisor", process.supervisor);
    return records;
}

std::string CommandRecords(pid_t command, std::uint64_t start) {
    std::string records;
    Add(records, "commandStart", start);
    Add(records, "command", command);
    return records;
}

std::string StopRecord(std::uint64_t killAt) {
    std::string records;
    Add(records, "killAt", killAt);
    return records;
}

std::optional<RunProcess> ProcessFromRecords(std::string_view records) {
    RunProcess process;
    bool good = true;
    for (std::string_view name, value; good && Next(records, name, value);) {
        if (name == "boot") {
            good = Read(value, process.bootId);
        } else if (name == "start") {
            good = Read(value, process.supervisorStart);
        } else if (name == "supervisor") {
            good = Read(value, process.supervisor);
        } else if (name == "command") {
            good = Read(value, process.command);
        } else if (name == "commandStart") {
            good = Read(value, process.commandStart);
        } else if (name == "killAt") {
            good = Read(value, process.killAt);
        }
    }
    if (!good || process.bootId.empty() || process.supervisor <= 0 || process.command < 0) {
        return std::nullopt;
    }
    return process;
}

RunTime RunTimeNow() {
    return std::chrono::floor<std::chrono::microseconds>(std::chrono::system_clock::now());
}

std::uint64_t MonotonicNow() {
    timespec now{};
    ::clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<std::uint64_t>(now.tv_sec) * 1'000'000 +
           static_cast<std::uint64_t>(now.tv_nsec) / 1000;
}

std::string BootId() {
    std::string id = ReadSmallFile("/proc/sys/kernel/random/boot_id");
    while (!id.empty() && id.back() == '\n') {
        id.pop_back();
    }
    return id;
}

std::optional<std::uint64_t> ProcessStart(pid_t process) {
    constexpr int kStartField = 22;
    const std::string status = ReadSmallFile("/proc/" + std::to_string(process) + "/stat");
    // The second field is the program's name in parentheses; it may hold blanks and parentheses.
    const std::size_t nameEnd = status.rfind(')');
    if (nameEnd == std::string::npos) {
        return std::nullopt;
    }
    std::size_t begin = nameEnd + 1;
    for (int field = 2; field < kStartField; ++field) {
        begin = status.find(' ', begin);
        if (begin == std::string::npos) {
            return std::nullopt;
        }
        ++begin;
    }
    std::uint64_t ticks = 0;
    const std::string_view text(status);
    return Read(text.substr(begin, text.find(' ', begin) - begin), ticks) ? std::optional(ticks)
                                                                          : std::nullopt;
}

}  // namespace orva
