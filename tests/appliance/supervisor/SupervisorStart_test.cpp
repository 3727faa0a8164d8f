#include "appliance/supervisor/SupervisorStart.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <sstream>

#include "tests/appliance/util/Sandbox.h"

namespace {

// Starts scripts in the supervisor's place. The folder is their first argument.
class SupervisorStartTest : public Sandbox {
  protected:
    SupervisorStartTest() : folder(7) { MakeDirectory("/usr/orva/var"); }

    orva::FileDescriptor Lock() {
        std::string error;
        std::optional<orva::FileDescriptor> lock = folder.Create({7, 1, "root", "true", {}}, error);
        EXPECT_TRUE(lock) << error;
        return lock ? std::move(*lock) : orva::FileDescriptor();
    }

    // The script's exit status.
    int Run(const std::string& script) {
        Write("/program", "#!/bin/sh\n" + script);
        std::filesystem::permissions(RootPath() + "/program", std::filesystem::perms(0755));
        std::string error;
        const std::optional<pid_t> pid =
            orva::StartSupervisor(RootPath() + "/program", folder, Lock(), error);
        EXPECT_TRUE(pid) << error;
        int status = 0;
        EXPECT_EQ(::waitpid(pid.value_or(-1), &status, 0), pid);
        return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }

    orva::RunFolder folder;
};

TEST_F(SupervisorStartTest, GetsTheFolderAndTheLockedProcessFile) {
    EXPECT_EQ(Run("[ \"$#\" = 1 ] && echo here >\"$1\"/mark && echo process >&3"), 0);
    EXPECT_EQ(Read("/usr/orva/var/runs/7/mark"), "here\n");
    EXPECT_EQ(Read("/usr/orva/var/runs/7/process"), "process\n");
}

TEST_F(SupervisorStartTest, HoldsTheLockForAsLongAsItLives) {
    Write("/program", "#!/bin/sh\nexec sleep 1000\n");
    std::filesystem::permissions(RootPath() + "/program", std::filesystem::perms(0755));
    std::string error;
    const std::optional<pid_t> pid =
        orva::StartSupervisor(RootPath() + "/program", folder, Lock(), error);
    ASSERT_TRUE(pid);
    EXPECT_TRUE(folder.IsSupervised());
    ::kill(*pid, SIGKILL);
    ::waitpid(*pid, nullptr, 0);
    EXPECT_FALSE(folder.IsSupervised());
}

TEST_F(SupervisorStartTest, IsASessionOfItsOwnWithNoSignalBlockedAndNothingElseOpen) {
    sigset_t signals;
    sigset_t former;
    ::sigemptyset(&signals);
    ::sigaddset(&signals, SIGTERM);
    ::sigaddset(&signals, SIGCHLD);
    ::sigprocmask(SIG_BLOCK, &signals, &former);
    Write("/secret", "secret");
    const int inherited = ::open((RootPath() + "/secret").c_str(), O_RDONLY);
    EXPECT_EQ(Run("cut -d' ' -f1,6 /proc/$$/stat >\"$1\"/session\n"
                  "ls -l /proc/$$/fd >\"$1\"/open\n"
                  "sed -n 's/^SigBlk:.//p' /proc/self/status >\"$1\"/blocked\n"),
              0);
    ::close(inherited);
    ::sigprocmask(SIG_SETMASK, &former, nullptr);
    std::istringstream session(Read("/usr/orva/var/runs/7/session"));
    int process = 0;
    int leader = 1;
    session >> process >> leader;
    EXPECT_EQ(process, leader);
    EXPECT_EQ(Read("/usr/orva/var/runs/7/blocked"), "0000000000000000\n");
    const std::string open = Read("/usr/orva/var/runs/7/open");
    EXPECT_NE(open.find("0 -> /dev/null\n"), std::string::npos);
    EXPECT_NE(open.find("3 -> " + folder.Path() + "/process\n"), std::string::npos);
    EXPECT_EQ(open.find("/secret"), std::string::npos) << open;
}

TEST_F(SupervisorStartTest, SaysThatItCannotBeStarted) {
    std::string error;
    EXPECT_FALSE(orva::StartSupervisor(RootPath() + "/none", folder, Lock(), error));
    EXPECT_EQ(error, "cannot start " + RootPath() + "/none: No such file or directory");
    EXPECT_FALSE(folder.IsSupervised());
}

}  // namespace
