#include "tests/system/Process.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <spawn.h>
#include <sys/mman.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <sstream>
#include <stdexcept>
#include <system_error>
#include <thread>

namespace orva::test {
namespace {

using Clock = std::chrono::steady_clock;

[[noreturn]] void ThrowErrno(const char* what) {
    throw std::system_error(errno, std::generic_category(), what);
}

int MillisecondsUntil(Clock::time_point deadline) {
    const auto left =
        std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now()).count();
    return left > 0 ? static_cast<int>(left) : 0;
}

// A file in memory for a child's stream: it can neither fill up nor block.
int MemoryFile(const char* name) {
    const int fd = ::memfd_create(name, MFD_CLOEXEC);
    if (fd < 0) {
        ThrowErrno("memfd_create");
    }
    return fd;
}

std::string ReadMemoryFile(int fd) {
    std::string text;
    char buffer[4096];
    ssize_t got = 0;
    while ((got = ::pread(fd, buffer, sizeof buffer, static_cast<off_t>(text.size()))) > 0) {
        text.append(buffer, static_cast<std::size_t>(got));
    }
    return text;
}

pid_t Spawn(const std::vector<std::string>& argv, int in, int out, int err,
            const std::map<std::string, std::string>& environment) {
    std::vector<char*> arguments;
    for (const std::string& argument : argv) {
        arguments.push_back(const_cast<char*>(argument.c_str()));
    }
    arguments.push_back(nullptr);

    std::vector<std::string> variables;
    for (char** variable = environ; *variable != nullptr; ++variable) {
        const std::string text = *variable;
        if (environment.count(text.substr(0, text.find('='))) == 0) {
            variables.push_back(text);
        }
    }
    for (const auto& [name, value] : environment) {
        variables.push_back(name + "=" + value);
    }
    std::vector<char*> pointers;
    for (std::string& variable : variables) {
        pointers.push_back(variable.data());
    }
    pointers.push_back(nullptr);

    posix_spawn_file_actions_t actions;
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_adddup2(&actions, in, STDIN_FILENO);
    ::posix_spawn_file_actions_adddup2(&actions, out, STDOUT_FILENO);
    ::posix_spawn_file_actions_adddup2(&actions, err, STDERR_FILENO);
    pid_t pid = -1;
    const int error =
        ::posix_spawn(&pid, arguments[0], &actions, nullptr, arguments.data(), pointers.data());
    ::posix_spawn_file_actions_destroy(&actions);
    if (error != 0) {
        throw std::system_error(error, std::generic_category(), argv[0]);
    }
    return pid;
}

// Waits for the child by its pidfd and reaps it.
int WaitFor(pid_t pid) {
    const int pidFd = static_cast<int>(::syscall(SYS_pidfd_open, pid, 0));
    if (pidFd < 0) {
        ThrowErrno("pidfd_open");
    }
    const Clock::time_point deadline = Clock::now() + kPatience;
    pollfd watched{pidFd, POLLIN, 0};
    int polled = 0;
    do {
        polled = ::poll(&watched, 1, MillisecondsUntil(deadline));
    } while (polled < 0 && errno == EINTR);
    ::close(pidFd);
    if (polled == 0) {
        ::kill(pid, SIGKILL);
    }
    int status = 0;
    ::waitpid(pid, &status, 0);
    if (polled == 0) {
        return -1;
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

}  // namespace

Sandbox::Sandbox() {
    std::string pattern = (std::filesystem::temp_directory_path() / "orva-test-XXXXXX").string();
    if (::mkdtemp(pattern.data()) == nullptr) {
        ThrowErrno("mkdtemp");
    }
    path = pattern;
}

Sandbox::~Sandbox() {
    std::error_code ignored;
    std::filesystem::remove_all(path, ignored);
}

std::string Sandbox::Write(const std::string& name, std::string_view content) const {
    const std::filesystem::path file = path / name;
    std::filesystem::create_directories(file.parent_path());
    std::ofstream stream(file, std::ios::binary | std::ios::trunc);
    stream << content;
    stream.close();
    if (!stream) {
        throw std::runtime_error("cannot write " + file.string());
    }
    return file.string();
}

std::string ReadWholeFile(const std::filesystem::path& file) {
    std::ifstream stream(file, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(stream), std::istreambuf_iterator<char>());
}

ProcessResult RunProcess(const std::vector<std::string>& argv, std::string_view input,
                         const std::map<std::string, std::string>& environment) {
    const int in = MemoryFile("in");
    const int out = MemoryFile("out");
    const int err = MemoryFile("err");
    if (::write(in, input.data(), input.size()) != static_cast<ssize_t>(input.size())) {
        ThrowErrno("write");
    }
    ::lseek(in, 0, SEEK_SET);
    ProcessResult result;
    result.status = WaitFor(Spawn(argv, in, out, err, environment));
    result.out = ReadMemoryFile(out);
    result.err = ReadMemoryFile(err);
    ::close(in);
    ::close(out);
    ::close(err);
    return result;
}

ServerProcess::ServerProcess(const std::vector<std::string>& argv, const std::string& readyText,
                             const std::map<std::string, std::string>& environment) {
    const int nothing = ::open("/dev/null", O_RDONLY | O_CLOEXEC);
    int ends[2];
    if (nothing < 0 || ::pipe2(ends, O_CLOEXEC) != 0) {
        ThrowErrno("pipe2");
    }
    outputFd = ends[0];
    errorFd = MemoryFile("err");
    pid = Spawn(argv, nothing, ends[1], errorFd, environment);
    ::close(nothing);
    ::close(ends[1]);

    std::string text;
    const Clock::time_point deadline = Clock::now() + kPatience;
    while (!ready) {
        pollfd watched{outputFd, POLLIN, 0};
        if (::poll(&watched, 1, MillisecondsUntil(deadline)) <= 0) {
            break;
        }
        char buffer[512];
        const ssize_t got = ::read(outputFd, buffer, sizeof buffer);
        if (got <= 0) {
            break;
        }
        text.append(buffer, static_cast<std::size_t>(got));
        std::size_t at = text.rfind(readyText, 0) == 0 ? 0 : text.find("\n" + readyText);
        if (at != std::string::npos) {
            at += (text[at] == '\n' ? 1 : 0) + readyText.size();
            const std::size_t end = text.find('\n', at);
            ready = end != std::string::npos;
            readyDetail = text.substr(at, end - at);
        }
    }
}

ServerProcess::~ServerProcess() {
    if (!ended) {
        ::kill(pid, SIGKILL);
        ::waitpid(pid, nullptr, 0);
    }
    ::close(outputFd);
    ::close(errorFd);
}

void ServerProcess::Signal(int signalNumber) const {
    if (!ended) {
        ::kill(pid, signalNumber);
    }
}

int ServerProcess::Wait() {
    if (!ended) {
        status = WaitFor(pid);
        ended = true;
    }
    return status;
}

int ServerProcess::Stop() {
    Signal(SIGTERM);
    return Wait();
}

std::string ServerProcess::ErrorText() const { return ReadMemoryFile(errorFd); }

bool ServerProcess::WaitForErrorText(const std::string& text) const {
    const Clock::time_point deadline = Clock::now() + kPatience;
    while (ErrorText().find(text) == std::string::npos) {
        if (Clock::now() > deadline) {
            return false;
        }
        std::this_thread::yield();
    }
    return true;
}

std::size_t ServerProcess::PeakMemory() const {
    std::istringstream lines(ReadWholeFile("/proc/" + std::to_string(pid) + "/status"));
    for (std::string line; std::getline(lines, line);) {
        if (line.rfind("VmHWM:", 0) == 0) {
            return static_cast<std::size_t>(std::strtoull(line.c_str() + 6, nullptr, 10)) * 1024;
        }
    }
    return 0;
}

}  // namespace orva::test
