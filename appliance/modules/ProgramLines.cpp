#include "appliance/modules/ProgramLines.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <optional>
#include <utility>

#include "appliance/util/FileDescriptor.h"

namespace orva {
namespace {

using Clock = std::chrono::steady_clock;

constexpr std::size_t kReadSize = std::size_t{64} * 1024;
constexpr const char* kNowhere = "/dev/null";

// Starts the program as the leader of a process group, with every signal as a fresh program expects
// it. 0 or the errno.
int Start(const std::vector<std::string>& arguments, int output, pid_t& pid) {
    std::vector<char*> words;
    words.reserve(arguments.size() + 1);
    for (const std::string& argument : arguments) {
        words.push_back(const_cast<char*>(argument.c_str()));
    }
    words.push_back(nullptr);
    sigset_t none;
    sigset_t all;
    ::sigemptyset(&none);
    ::sigfillset(&all);
    posix_spawn_file_actions_t actions;
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, kNowhere, O_RDONLY, 0);
    ::posix_spawn_file_actions_adddup2(&actions, output, STDOUT_FILENO);
    ::posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, kNowhere, O_WRONLY, 0);
    posix_spawnattr_t attributes;
    ::posix_spawnattr_init(&attributes);
    ::posix_spawnattr_setflags(
        &attributes, POSIX_SPAWN_SETPGROUP | POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF);
    ::posix_spawnattr_setsigmask(&attributes, &none);
    ::posix_spawnattr_setsigdefault(&attributes, &all);
    const int error = ::posix_spawn(&pid, words[0], &actions, &attributes, words.data(), environ);
    ::posix_spawnattr_destroy(&attributes);
    ::posix_spawn_file_actions_destroy(&actions);
    return error;
}

// Whether the descriptor becomes readable, or its other end goes, before the deadline.
bool WaitFor(int descriptor, Clock::time_point deadline) {
    for (;;) {
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now());
        pollfd watched{descriptor, POLLIN, 0};
        const int ready = ::poll(&watched, 1, static_cast<int>(std::max<long>(left.count(), 0)));
        if (ready >= 0 || errno != EINTR) {
            return ready > 0;
        }
    }
}

// Puts lines together from the parts in which they come.
class LineCutter {
  public:
    LineCutter(std::size_t longestLine, const std::function<void(std::string_view)>& takeLine)
        : longest(longestLine), take(takeLine) {}

    void Add(std::string_view part) {
        while (!part.empty()) {
            const std::size_t end = part.find('\n');
            const std::string_view text = part.substr(0, end);
            line.append(text.substr(0, longest - line.size()));
            if (end == std::string_view::npos) {
                return;
            }
            Finish();
            part.remove_prefix(end + 1);
        }
    }

    // A last line may lack its end.
    void End() {
        if (!line.empty()) {
            Finish();
        }
    }

  private:
    void Finish() {
        take(line);
        line.clear();
    }

    std::size_t longest;
    const std::function<void(std::string_view)>& take;
    std::string line;
};

// Reads until the pipe's other end is closed. False when the deadline comes first.
bool ReadLines(int pipe, Clock::time_point deadline, LineCutter& lines) {
    std::string buffer(kReadSize, '\0');
    while (WaitFor(pipe, deadline)) {
        const ssize_t length = ::read(pipe, buffer.data(), buffer.size());
        if (length > 0) {
            lines.Add(std::string_view(buffer).substr(0, static_cast<std::size_t>(length)));
        } else if (length == 0 || errno != EINTR) {
            lines.End();
            return true;
        }
    }
    return false;
}

ProgramEnd Reap(pid_t pid) {
    int status = 0;
    while (::waitpid(pid, &status, 0) < 0 && errno == EINTR) {
    }
    return WIFEXITED(status) ? ProgramEnd{ProgramEnd::Kind::kExited, WEXITSTATUS(status)}
                             : ProgramEnd{ProgramEnd::Kind::kSignalled, WTERMSIG(status)};
}

// Kills and reaps a program that nobody waits for any more.
class Child {
  public:
    explicit Child(pid_t id)
        : pid(id), process(static_cast<int>(::syscall(SYS_pidfd_open, id, 0))) {}
    ~Child() {
        if (pid > 0) {
            ::kill(-pid, SIGKILL);
            Reap(pid);
        }
    }
    Child(const Child&) = delete;
    Child& operator=(const Child&) = delete;

    // How it ended; nothing when it has not by the deadline.
    std::optional<ProgramEnd> WaitForEnd(Clock::time_point deadline) {
        if (!WaitFor(process.Get(), deadline)) {
            return std::nullopt;
        }
        return Reap(std::exchange(pid, -1));
    }

  private:
    pid_t pid;
    FileDescriptor process;
};

}  // namespace

ProgramEnd ReadProgramLines(const std::vector<std::string>& arguments,
                            std::chrono::milliseconds limit, std::size_t longest,
                            const std::function<void(std::string_view)>& take) {
    const Clock::time_point deadline = Clock::now() + limit;
    std::array<int, 2> ends{};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) {
        return {ProgramEnd::Kind::kNotStarted, errno};
    }
    const FileDescriptor reading(ends[0]);
    FileDescriptor writing(ends[1]);
    pid_t pid = -1;
    if (const int error = Start(arguments, writing.Get(), pid)) {
        return {ProgramEnd::Kind::kNotStarted, error};
    }
    Child child(pid);
    writing = FileDescriptor();
    LineCutter lines(longest, take);
    if (ReadLines(reading.Get(), deadline, lines)) {
        if (const std::optional<ProgramEnd> end = child.WaitForEnd(deadline)) {
            return *end;
        }
    }
    return {ProgramEnd::Kind::kTimedOut, 0};
}

}  // namespace orva
