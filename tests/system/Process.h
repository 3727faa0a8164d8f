// What system tests need around a program: a root of its own, a run of it to its end, and a server
// that is running while the test talks to it.
#pragma once

#include <sys/types.h>

#include <chrono>
#include <filesystem>
#include <map>
#include <string>
#include <string_view>
#include <vector>

namespace orva::test {

// How long a test waits for anything before it counts as failed. Generous: sanitizer builds share
// the machine with other tests.
inline constexpr std::chrono::seconds kPatience{60};

// A fresh directory, removed with everything in it at the end.
class Sandbox {
  public:
    Sandbox();
    ~Sandbox();
    Sandbox(const Sandbox&) = delete;
    Sandbox& operator=(const Sandbox&) = delete;

    const std::filesystem::path& Path() const { return path; }

    // Writes a file below the sandbox, with the directories above it; `name` is relative. Returns
    // its full path.
    std::string Write(const std::string& name, std::string_view content) const;

  private:
    std::filesystem::path path;
};

// The whole content of a file; empty when it cannot be read.
std::string ReadWholeFile(const std::filesystem::path& file);

struct ProcessResult {
    // What the program returned; 128 + signal number when a signal ended it, -1 when it had to be
    // killed because kPatience was over.
    int status = -1;
    std::string out;
    std::string err;
};

// Runs a program (argv[0] is its full path) to its end, with `input` as its standard input and
// `environment` added to this process's own.
ProcessResult RunProcess(const std::vector<std::string>& argv, std::string_view input = {},
                         const std::map<std::string, std::string>& environment = {});

// A program that runs until it is told to stop. Its standard output is read up to the line that
// says that it is ready. Killed at the end, if it still runs then.
class ServerProcess {
  public:
    // Starts it and waits for a line that begins with `readyText`; Ready() tells whether it came
    // before the program ended.
    explicit ServerProcess(const std::vector<std::string>& argv,
                           const std::string& readyText = "listening on ",
                           const std::map<std::string, std::string>& environment = {});
    ~ServerProcess();
    ServerProcess(const ServerProcess&) = delete;
    ServerProcess& operator=(const ServerProcess&) = delete;

    bool Ready() const { return ready; }
    // What follows `readyText` in that line.
    const std::string& ReadyDetail() const { return readyDetail; }
    pid_t Pid() const { return pid; }

    void Signal(int signalNumber) const;
    // Waits until it has ended. Its status as in ProcessResult.
    int Wait();
    // SIGTERM, then Wait().
    int Stop();

    // What it has written to standard error so far.
    std::string ErrorText() const;
    // Waits until standard error holds `text`; false when kPatience is over first.
    bool WaitForErrorText(const std::string& text) const;
    // Peak resident memory in bytes, while it runs; 0 when that cannot be told.
    std::size_t PeakMemory() const;

  private:
    pid_t pid = -1;
    int outputFd = -1;
    int errorFd = -1;
    int status = -1;
    bool ended = false;
    bool ready = false;
    std::string readyDetail;
};

}  // namespace orva::test
