#include "appliance/supervisor/CommandStart.h"

#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "appliance/supervisor/Spawn.h"

namespace orva {
namespace {

constexpr const char* kSetpriv = "/usr/bin/setpriv";
constexpr const char* kShell = "/bin/sh";
constexpr mode_t kMask = 022;

// The second step's: where it reports, and the program itself, for an owner who may not look into
// the folder that it stands in.
constexpr int kReport = 3;
constexpr int kProgram = 4;
constexpr const char* kProgramPath = "/proc/self/fd/4";

// What the second step reports first; the errno follows when the shell cannot be run. The report's
// end alone says that the shell runs.
constexpr char kArrived = 'a';

std::vector<std::string> Arguments(const Owner& owner, const std::string& command) {
    std::vector<std::string> arguments;
    if (!IsOwner(owner)) {
        arguments = {kSetpriv, "--reuid=" + std::to_string(owner.user),
                     "--regid=" + std::to_string(owner.group), "--init-groups", "--"};
    }
    arguments.insert(arguments.end(), {kProgramPath, kCommandStep, command});
    return arguments;
}

std::string CannotStart(int error) {
    return std::string("cannot start a shell: ") + std::strerror(error);
}

}  // namespace

std::optional<StartedCommand> StartedCommand::Start(const Owner& owner, const std::string& command,
                                                    const std::vector<std::string>& environment,
                                                    int output, std::string& why) {
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) != 0) {
        why = CannotStart(errno);
        return std::nullopt;
    }
    FileDescriptor reading(ends[0]);
    const FileDescriptor writing(ends[1]);
    const FileDescriptor program(::open("/proc/self/exe", O_RDONLY | O_CLOEXEC));
    if (!program.IsOpen()) {
        why = CannotStart(errno);
        return std::nullopt;
    }
    // Out of the way of the numbers that they are given to.
    const FileDescriptor reportSource(::fcntl(writing.Get(), F_DUPFD_CLOEXEC, kProgram + 1));
    const FileDescriptor programSource(::fcntl(program.Get(), F_DUPFD_CLOEXEC, kProgram + 1));
    if (!reportSource.IsOpen() || !programSource.IsOpen()) {
        why = CannotStart(errno);
        return std::nullopt;
    }
    SpawnActions actions;
    ::posix_spawn_file_actions_adddup2(actions.Get(), output, STDOUT_FILENO);
    ::posix_spawn_file_actions_adddup2(actions.Get(), output, STDERR_FILENO);
    ::posix_spawn_file_actions_addopen(actions.Get(), STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    ::posix_spawn_file_actions_adddup2(actions.Get(), reportSource.Get(), kReport);
    ::posix_spawn_file_actions_adddup2(actions.Get(), programSource.Get(), kProgram);
    ::posix_spawn_file_actions_addclosefrom_np(actions.Get(), kProgram + 1);
    SpawnAttributes attributes;

    const std::vector<std::string> arguments = Arguments(owner, command);
    pid_t pid = -1;
    const int error =
        ::posix_spawn(&pid, arguments.front().c_str(), actions.Get(), attributes.Get(),
                      SpawnTexts(arguments).data(), SpawnTexts(environment).data());
    if (error != 0) {
        why = "cannot start " + arguments.front() + ": " + std::strerror(error);
        return std::nullopt;
    }
    FileDescriptor watched(static_cast<int>(::syscall(SYS_pidfd_open, pid, 0)));
    if (!watched.IsOpen()) {
        why = std::string("cannot watch the command: ") + std::strerror(errno);
        ::kill(-pid, SIGKILL);
        return std::nullopt;
    }
    return StartedCommand(pid, std::move(watched), std::move(reading));
}

bool StartedCommand::WaitForShell(std::string& why) {
    char bytes[1 + sizeof(int)];
    std::size_t filled = 0;
    while (filled < sizeof bytes) {
        const ssize_t got = ::read(report.Get(), bytes + filled, sizeof bytes - filled);
        if (got < 0 && errno == EINTR) {
            continue;
        }
        if (got <= 0) {
            break;
        }
        filled += static_cast<std::size_t>(got);
    }
    if (filled == 0) {
        why = "cannot become the owner";
        return false;
    }
    if (filled == sizeof bytes) {
        int error = 0;
        std::memcpy(&error, bytes + 1, sizeof error);
        why = CannotStart(error);
        return false;
    }
    return true;
}

int BecomeShell(const char* command) {
    ::fcntl(kReport, F_SETFD, FD_CLOEXEC);
    ::close(kProgram);
    ::umask(kMask);
    const char* const home = std::getenv("HOME");
    if (home == nullptr || ::chdir(home) != 0) {
        static_cast<void>(::chdir("/"));
    }
    if (::write(kReport, &kArrived, 1) != 1) {
        return EXIT_FAILURE;
    }
    ::execl(kShell, "sh", "-c", command, nullptr);
    const int error = errno;
    static_cast<void>(::write(kReport, &error, sizeof error));
    return EXIT_FAILURE;
}

}  // namespace orva
