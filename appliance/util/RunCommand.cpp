#include "appliance/util/RunCommand.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/signalfd.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <system_error>

#include "appliance/util/FileDescriptor.h"
#include "appliance/util/StopSignals.h"

namespace orva {
namespace {

using Clock = std::chrono::steady_clock;

constexpr const char* kNowhere = "/dev/null";

// Starts the command as the leader of a process group. 0 or the errno.
int Start(const Command& command, const StopSignals& signals, pid_t& pid) {
    std::vector<char*> arguments;
    for (const std::string& argument : command.arguments) {
        arguments.push_back(const_cast<char*>(argument.c_str()));
    }
    arguments.push_back(nullptr);

    posix_spawn_file_actions_t actions;
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, kNowhere, O_RDONLY, 0);
    if (command.quiet) {
        ::posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, kNowhere, O_WRONLY, 0);
        ::posix_spawn_file_actions_adddup2(&actions, STDOUT_FILENO, STDERR_FILENO);
    }
    if (!command.directory.empty()) {
        ::posix_spawn_file_actions_addchdir_np(&actions, command.directory.c_str());
    }
    posix_spawnattr_t attributes;
    ::posix_spawnattr_init(&attributes);
    ::posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETPGROUP | POSIX_SPAWN_SETSIGMASK);
    ::posix_spawnattr_setpgroup(&attributes, 0);
    ::posix_spawnattr_setsigmask(&attributes, &signals.Former());
    const int error =
        ::posix_spawnp(&pid, arguments[0], &actions, &attributes, arguments.data(), environ);
    ::posix_spawnattr_destroy(&attributes);
    ::posix_spawn_file_actions_destroy(&actions);
    return error;
}

// A child that has been started, with what is watched while it runs.
class Child {
  public:
    Child(pid_t id, const StopSignals& signals)
        : pid(id),
          process(static_cast<int>(::syscall(SYS_pidfd_open, id, 0))),
          stop(::signalfd(-1, &signals.Held(), SFD_CLOEXEC | SFD_NONBLOCK)) {}

    // Waits for its end, or until `time` is over. True when it has ended. A signal that tells this
    // process to end is left in `signal`, and waited for no longer, when that is not null.
    bool WaitFor(std::chrono::milliseconds time, int* signal) {
        const Clock::time_point deadline = Clock::now() + time;
        std::array<pollfd, 2> watched{pollfd{process.Get(), POLLIN, 0},
                                      pollfd{signal == nullptr ? -1 : stop.Get(), POLLIN, 0}};
        for (;;) {
            const auto left =
                std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now()).count();
            const int ready =
                ::poll(watched.data(), watched.size(), static_cast<int>(std::max(left, 0L)));
            if (watched[0].revents != 0) {
                return true;
            }
            if (ready > 0 && TakeSignal(signal)) {
                return false;
            }
            if (ready == 0 || (ready < 0 && errno != EINTR)) {
                return false;
            }
        }
    }

    // Ends it and all of its group that is still there.
    void End(std::chrono::milliseconds grace) {
        ::kill(-pid, SIGTERM);
        WaitFor(grace, nullptr);
        ::kill(-pid, SIGKILL);
    }

    // Waits for its end, and gives its status as waitpid does.
    int Reap() const {
        int status = 0;
        while (::waitpid(pid, &status, 0) < 0 && errno == EINTR) {
        }
        return status;
    }

  private:
    bool TakeSignal(int* signal) const {
        signalfd_siginfo info{};
        if (::read(stop.Get(), &info, sizeof info) != sizeof info) {
            return false;
        }
        *signal = static_cast<int>(info.ssi_signo);
        return true;
    }

    pid_t pid;
    FileDescriptor process;
    FileDescriptor stop;
};

}  // namespace

std::vector<std::string> ShellArguments(const std::string& commandLine) {
    return {"/bin/sh", "-c", commandLine};
}

CommandEnd RunCommand(const Command& command) {
    const StopSignals signals;
    pid_t pid = -1;
    if (const int error = Start(command, signals, pid)) {
        return {CommandEnd::Kind::kNotStarted, error};
    }
    Child child(pid, signals);
    int signal = 0;
    const bool ended = child.WaitFor(command.limit, &signal);
    if (!ended) {
        child.End(command.grace);
    }
    const int status = child.Reap();
    if (signal != 0) {
        return {CommandEnd::Kind::kInterrupted, signal};
    }
    if (!ended) {
        return {CommandEnd::Kind::kTimedOut, 0};
    }
    return WIFEXITED(status) ? CommandEnd{CommandEnd::Kind::kExited, WEXITSTATUS(status)}
                             : CommandEnd{CommandEnd::Kind::kSignalled, WTERMSIG(status)};
}

std::string DescribeEnd(const CommandEnd& end, const Command& command) {
    switch (end.kind) {
        case CommandEnd::Kind::kExited:
            return "exit status " + std::to_string(end.number);
        case CommandEnd::Kind::kSignalled:
            return "ended by signal " + std::to_string(end.number) + " (" +
                   ::strsignal(end.number) + ")";
        case CommandEnd::Kind::kTimedOut: {
            const auto seconds = std::chrono::ceil<std::chrono::seconds>(command.limit).count();
            return "did not end within " + std::to_string(seconds) +
                   (seconds == 1 ? " second" : " seconds");
        }
        case CommandEnd::Kind::kNotStarted:
            return "cannot be started: " + std::generic_category().message(end.number);
        case CommandEnd::Kind::kInterrupted:
            return std::string("was interrupted (") + ::strsignal(end.number) + ")";
    }
    return {};
}

}  // namespace orva
