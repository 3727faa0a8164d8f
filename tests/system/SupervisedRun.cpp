#include "tests/system/SupervisedRun.h"

#include <gtest/gtest.h>
#include <poll.h>
#include <signal.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <stdexcept>
#include <thread>

#include "appliance/root/Root.h"
#include "appliance/store/Accounts.h"
#include "appliance/supervisor/SupervisorStart.h"

namespace orva::test {

std::string OwnName() { return AccountName(::geteuid()); }

bool WaitUntil(const std::function<bool()>& condition) {
    const auto deadline = std::chrono::steady_clock::now() + kPatience;
    while (!condition()) {
        if (std::chrono::steady_clock::now() > deadline) {
            return condition();
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    return true;
}

SupervisedRun::SupervisedRun() {
    std::filesystem::create_directories(sandbox.Path() / "usr/orva/var");
    // For runs of other accounts.
    std::filesystem::permissions(sandbox.Path(), std::filesystem::perms(0755));
    SetRoot(sandbox.Path().string());
    folder.emplace(1);
}

SupervisedRun::~SupervisedRun() {
    if (supervisor > 0) {
        static_cast<void>(folder->SignalCommand(SIGKILL));
        ::kill(supervisor, SIGKILL);
        ::waitpid(supervisor, nullptr, 0);
    }
}

FileDescriptor SupervisedRun::Prepare(
    const std::string& command, const std::string& owner,
    std::vector<std::pair<std::string, std::string>> environment) {
    std::string error;
    std::optional<FileDescriptor> lock =
        folder->Create({1, 2, owner, command, std::move(environment)}, error);
    if (!lock) {
        throw std::runtime_error(error);
    }
    return std::move(*lock);
}

void SupervisedRun::Launch(FileDescriptor lock, const std::string& program) {
    std::string error;
    const std::optional<pid_t> started = StartSupervisor(program, *folder, std::move(lock), error);
    if (!started) {
        throw std::runtime_error(error);
    }
    supervisor = *started;
}

void SupervisedRun::LaunchScript(FileDescriptor lock, const std::string& script) {
    const std::string inner = sandbox.Write("inner", "RUN=" ORVA_BIN_DIR "/orva-run\n" + script);
    const std::string user = ::geteuid() == 0 ? "" : "--user --map-root-user ";
    const std::string outer = sandbox.Write(
        "outer", "#!/bin/sh\nexec unshare " + user + "--mount /bin/sh -e " + inner + " \"$1\"\n");
    std::filesystem::permissions(outer, std::filesystem::perms(0755));
    Launch(std::move(lock), outer);
}

void SupervisedRun::Start(const std::string& command, const std::string& owner,
                          std::vector<std::pair<std::string, std::string>> environment) {
    Launch(Prepare(command, owner, std::move(environment)));
}

int SupervisedRun::Wait() {
    const FileDescriptor watched(static_cast<int>(::syscall(SYS_pidfd_open, supervisor, 0)));
    pollfd ended{watched.Get(), POLLIN, 0};
    if (::poll(&ended, 1, static_cast<int>(std::chrono::milliseconds(kPatience).count())) != 1) {
        throw std::runtime_error("the supervisor does not end");
    }
    int status = 0;
    ::waitpid(supervisor, &status, 0);
    supervisor = -1;
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

RunEnding SupervisedRun::End() {
    EXPECT_EQ(Wait(), 0);
    EXPECT_FALSE(folder->IsSupervised());
    const std::optional<RunEnding> ending = folder->Ending();
    EXPECT_TRUE(ending);
    return ending.value_or(RunEnding());
}

RunEnding SupervisedRun::Run(const std::string& command, const std::string& owner,
                             std::vector<std::pair<std::string, std::string>> environment) {
    Start(command, owner, std::move(environment));
    return End();
}

std::string SupervisedRun::Printed() const {
    const std::optional<StoredOutput> output = folder->Output();
    return output && output->dropped == 0 ? output->head + output->tail : std::string();
}

}  // namespace orva::test
