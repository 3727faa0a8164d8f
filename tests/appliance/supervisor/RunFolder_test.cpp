#include "appliance/supervisor/RunFolder.h"

#include <fcntl.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <filesystem>
#include <iterator>
#include <utility>

#include "tests/appliance/util/Sandbox.h"

namespace {

using namespace std::string_literals;

class RunFolderTest : public Sandbox {
  protected:
    RunFolderTest() { MakeDirectory("/usr/orva/var"); }

    orva::FileDescriptor Create(const orva::RunFolder& folder) {
        std::string error;
        std::optional<orva::FileDescriptor> lock = orva::RunFolder(folder).Create(kOrder, error);
        EXPECT_TRUE(lock) << error;
        return lock ? std::move(*lock) : orva::FileDescriptor();
    }

    static mode_t ModeOf(const std::string& path) {
        struct stat status {};
        EXPECT_EQ(::stat(path.c_str(), &status), 0) << path;
        return status.st_mode & 07777;
    }

    const orva::RunOrder kOrder{7, 3, "alice", "echo hello", {{"ORVA_ROOT", "/r"}}};
};

TEST_F(RunFolderTest, HoldsItsOrderAndNothingElseYet) {
    const orva::RunFolder folder(7);
    EXPECT_EQ(folder.Path(), RootPath() + "/usr/orva/var/runs/7");
    const orva::FileDescriptor lock = Create(folder);
    EXPECT_EQ(folder.Order(), kOrder);
    EXPECT_FALSE(folder.Process());
    EXPECT_FALSE(folder.Ending());
    EXPECT_FALSE(folder.Output());
    EXPECT_FALSE(folder.WatchSupervisor().IsOpen());
    EXPECT_FALSE(folder.SignalCommand(SIGTERM));
}

TEST_F(RunFolderTest, HasTheSpaceForWhatIsRecordedFromTheStart) {
    const orva::FileDescriptor lock = Create(orva::RunFolder(7));
    struct stat status {};
    for (const char* file : {"/ending.new", "/process"}) {
        ASSERT_EQ(::stat((RootPath() + "/usr/orva/var/runs/7" + file).c_str(), &status), 0);
        EXPECT_GE(status.st_blocks * 512, 4096) << file;
    }
    EXPECT_EQ(status.st_size, 0);
}

TEST_F(RunFolderTest, IsReadableByTheGroupWhateverTheMaskIs) {
    const mode_t mask = ::umask(0777);
    const orva::RunFolder folder(7);
    const orva::FileDescriptor lock = Create(folder);
    ::umask(mask);
    EXPECT_EQ(ModeOf(RootPath() + "/usr/orva/var/runs"), 02750U);
    EXPECT_EQ(ModeOf(folder.Path()), 02750U);
    for (const char* file : {"/order", "/process", "/ending.new"}) {
        EXPECT_EQ(ModeOf(folder.Path() + file), 0640U);
    }
}

TEST_F(RunFolderTest, BelongsToTheGroupOfTheStoresFolder) {
    constexpr gid_t kOther = 4711;
    if (::chown((RootPath() + "/usr/orva/var").c_str(), static_cast<uid_t>(-1), kOther) != 0) {
        // Only root may give the folder to a group that it is no member of.
        ASSERT_NE(::geteuid(), 0U);
        return;
    }
    const orva::FileDescriptor lock = Create(orva::RunFolder(7));
    // As the supervisor makes it.
    ASSERT_TRUE(orva::OutputWriter::Create(orva::RunFolder(7).Path() + "/output"));
    struct stat status {};
    for (const char* path : {"", "/7", "/7/output", "/7/order", "/7/process", "/7/ending.new"}) {
        ASSERT_EQ(::stat((RootPath() + "/usr/orva/var/runs" + path).c_str(), &status), 0);
        EXPECT_EQ(status.st_gid, kOther) << path;
    }
}

TEST_F(RunFolderTest, IsSupervisedForAsLongAsAnybodyHasTheLock) {
    const orva::RunFolder folder(7);
    EXPECT_FALSE(folder.IsSupervised());
    orva::FileDescriptor lock = Create(folder);
    EXPECT_TRUE(folder.IsSupervised());
    orva::FileDescriptor inherited(::dup(lock.Get()));
    lock = orva::FileDescriptor();
    EXPECT_TRUE(folder.IsSupervised());
    inherited = orva::FileDescriptor();
    EXPECT_FALSE(folder.IsSupervised());
}

TEST_F(RunFolderTest, WatchesTheSupervisorThatItNames) {
    const orva::RunFolder folder(7);
    const orva::FileDescriptor lock = Create(folder);
    const pid_t child = ::fork();
    if (child == 0) {
        ::pause();
        ::_exit(0);
    }
    const std::optional<std::uint64_t> start = orva::ProcessStart(child);
    ASSERT_TRUE(start);
    Write("/usr/orva/var/runs/7/process",
          orva::SupervisorRecords({orva::BootId(), child, *start, 0}));
    const orva::FileDescriptor watched = folder.WatchSupervisor();
    ASSERT_TRUE(watched.IsOpen());
    ::kill(child, SIGKILL);
    pollfd ended{watched.Get(), POLLIN, 0};
    EXPECT_EQ(::poll(&ended, 1, 60'000), 1);
    ::waitpid(child, nullptr, 0);
    EXPECT_FALSE(folder.WatchSupervisor().IsOpen());
}

TEST_F(RunFolderTest, WatchesNoProcessThatGotTheIdLaterOrBeforeThisStartOfTheMachine) {
    const orva::RunFolder folder(7);
    const orva::FileDescriptor lock = Create(folder);
    const std::optional<std::uint64_t> start = orva::ProcessStart(::getpid());
    ASSERT_TRUE(start);
    Write("/usr/orva/var/runs/7/process",
          orva::SupervisorRecords({orva::BootId(), ::getpid(), *start - 1, 0}));
    EXPECT_FALSE(folder.WatchSupervisor().IsOpen());
    Write("/usr/orva/var/runs/7/process",
          orva::SupervisorRecords({"00000000-0000-0000-0000-000000000000", ::getpid(), *start, 0}));
    EXPECT_FALSE(folder.WatchSupervisor().IsOpen());
}

TEST_F(RunFolderTest, SignalsTheCommandsGroupOnlyWhileItRuns) {
    const orva::RunFolder folder(7);
    orva::FileDescriptor lock = Create(folder);
    int ready[2];
    ASSERT_EQ(::pipe2(ready, O_CLOEXEC), 0);
    const pid_t child = ::fork();
    if (child == 0) {
        ::setpgid(0, 0);
        static_cast<void>(::write(ready[1], "r", 1));
        ::pause();
        ::_exit(0);
    }
    char byte = 0;
    ASSERT_EQ(::read(ready[0], &byte, 1), 1);
    Write("/usr/orva/var/runs/7/process",
          orva::SupervisorRecords({orva::BootId(), ::getpid(), 1, 0}) +
              orva::CommandRecords(child, 0));

    Write("/usr/orva/var/runs/7/ending", "ended=1\0why=\0end=\0"s);
    EXPECT_FALSE(folder.SignalCommand(SIGTERM));
    std::filesystem::remove(folder.Path() + "/ending");
    EXPECT_TRUE(folder.SignalCommand(SIGTERM));
    int status = 0;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGTERM);
    lock = orva::FileDescriptor();
    EXPECT_FALSE(folder.SignalCommand(SIGTERM));
    ::close(ready[0]);
    ::close(ready[1]);
}

TEST_F(RunFolderTest, TellsHowFarItsRunHasCome) {
    using State = orva::RunFolder::State;
    const orva::RunFolder folder(7);
    // Nor does anybody know what became of it.
    EXPECT_EQ(folder.Look(), State::kAbandoned);
    orva::FileDescriptor lock = Create(folder);
    EXPECT_EQ(folder.Look(), State::kSupervised);
    lock = orva::FileDescriptor();
    EXPECT_EQ(folder.Look(), State::kNotBegun);
    Write("/usr/orva/var/runs/7/process", orva::SupervisorRecords({"boot", 17, 4711, 0}));
    EXPECT_EQ(folder.Look(), State::kAbandoned);
    Write("/usr/orva/var/runs/7/ending", "ended=1\0why=\0end=\0"s);
    EXPECT_EQ(folder.Look(), State::kEnded);
    std::filesystem::remove(folder.Path() + "/ending");
    std::filesystem::remove(folder.Path() + "/process");
    EXPECT_EQ(folder.Look(), State::kAbandoned);
}

TEST_F(RunFolderTest, WithoutAFileDescriptorNobodyKnowsHowFarItsRunHasCome) {
    const orva::RunFolder folder(7);
    const orva::FileDescriptor lock = Create(folder);
    rlimit usual{};
    ASSERT_EQ(::getrlimit(RLIMIT_NOFILE, &usual), 0);
    const rlimit none{0, usual.rlim_max};
    ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &none), 0);
    const orva::RunFolder::State state = folder.Look();
    const int why = errno;
    ::setrlimit(RLIMIT_NOFILE, &usual);
    EXPECT_EQ(state, orva::RunFolder::State::kUnknown);
    EXPECT_EQ(why, EMFILE);
}

TEST_F(RunFolderTest, AProcessFileThatCannotBeOpenedSaysNothingAboutItsRun) {
    const orva::RunFolder folder(7);
    const orva::FileDescriptor lock = Create(folder);
    std::filesystem::remove(folder.Path() + "/process");
    std::filesystem::create_symlink("process", folder.Path() + "/process");
    EXPECT_EQ(folder.Look(), orva::RunFolder::State::kUnknown);
    EXPECT_EQ(errno, ELOOP);
}

TEST_F(RunFolderTest, HoldsTheTimeAtWhichAStoppedCommandIsKilled) {
    const orva::RunFolder folder(7);
    EXPECT_FALSE(folder.RecordStop(1));
    const orva::FileDescriptor lock = Create(folder);
    EXPECT_TRUE(folder.RecordStop(123'456'789));
    EXPECT_EQ(Read("/usr/orva/var/runs/7/process"), "killAt=123456789\0"s);
}

// A command in a process group of its own that answers each byte it is sent.
class Answering {
  public:
    Answering() {
        EXPECT_EQ(::pipe2(toCommand, O_CLOEXEC), 0);
        EXPECT_EQ(::pipe2(fromCommand, O_CLOEXEC), 0);
        pid = ::fork();
        if (pid == 0) {
            ::setpgid(0, 0);
            ::dup2(toCommand[0], STDIN_FILENO);
            ::dup2(fromCommand[1], STDOUT_FILENO);
            // The lock of the run's folder, too.
            ::close_range(STDERR_FILENO + 1, ~0U, 0);
            char byte = 0;
            while (::read(STDIN_FILENO, &byte, 1) == 1 && ::write(STDOUT_FILENO, &byte, 1) == 1) {
            }
            ::_exit(0);
        }
        ::close(std::exchange(toCommand[0], -1));
        ::close(std::exchange(fromCommand[1], -1));
        EXPECT_TRUE(Answers());
    }
    ~Answering() {
        ::close(toCommand[1]);
        ::close(fromCommand[0]);
        ::waitpid(pid, nullptr, 0);
    }
    Answering(const Answering&) = delete;
    Answering& operator=(const Answering&) = delete;

    pid_t Pid() const { return pid; }
    // False when it has been killed: it does not get as far as an answer then.
    bool Answers() const {
        char byte = 'x';
        return ::write(toCommand[1], &byte, 1) == 1 && ::read(fromCommand[0], &byte, 1) == 1;
    }

  private:
    int toCommand[2] = {-1, -1};
    int fromCommand[2] = {-1, -1};
    pid_t pid = -1;
};

class AbandonedCommandTest : public RunFolderTest {
  protected:
    AbandonedCommandTest() : lock(Create(folder)) { ::signal(SIGPIPE, SIG_IGN); }

    void Record(const std::string& bootId, std::uint64_t commandStart) const {
        Write("/usr/orva/var/runs/7/process",
              orva::SupervisorRecords({bootId, 17, 4711, 0}) +
                  orva::CommandRecords(command.Pid(), commandStart));
    }
    // How the command ended; 0 when it was not killed.
    int SignalThatEndedIt() const {
        siginfo_t info{};
        return ::waitid(P_PID, static_cast<id_t>(command.Pid()), &info, WEXITED | WNOWAIT) == 0 &&
                       info.si_code == CLD_KILLED
                   ? info.si_status
                   : 0;
    }

    const orva::RunFolder folder{7};
    orva::FileDescriptor lock;
    const Answering command;
    const std::uint64_t start = orva::ProcessStart(command.Pid()).value_or(0);
};

TEST_F(AbandonedCommandTest, IsKilledOnlyWhenItIsCertainlyTheSame) {
    Record(orva::BootId(), start);
    EXPECT_FALSE(folder.KillAbandonedCommand().IsOpen());
    lock = orva::FileDescriptor();
    Record(orva::BootId(), start - 1);
    EXPECT_FALSE(folder.KillAbandonedCommand().IsOpen());
    Record(orva::BootId(), 0);
    EXPECT_FALSE(folder.KillAbandonedCommand().IsOpen());
    Record("00000000-0000-0000-0000-000000000000", start);
    EXPECT_FALSE(folder.KillAbandonedCommand().IsOpen());
    EXPECT_TRUE(command.Answers());

    Record(orva::BootId(), start);
    const orva::FileDescriptor shell = folder.KillAbandonedCommand();
    ASSERT_TRUE(shell.IsOpen());
    pollfd ended{shell.Get(), POLLIN, 0};
    EXPECT_EQ(::poll(&ended, 1, 60'000), 1);
    ASSERT_FALSE(command.Answers());
    EXPECT_EQ(SignalThatEndedIt(), SIGKILL);
}

// From now on this process's kernel knows no signals to groups by a process descriptor, as before
// Linux 6.9.
bool ForgetGroupSignals() {
    constexpr unsigned kFlags = offsetof(seccomp_data, args) + 3 * sizeof(std::uint64_t);
    sock_filter filter[] = {
        BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
        BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_pidfd_send_signal, 0, 3),
        BPF_STMT(BPF_LD | BPF_W | BPF_ABS, kFlags),
        BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, 0, 1, 0),
        BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | EINVAL),
        BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
    };
    const sock_fprog program{static_cast<unsigned short>(std::size(filter)), filter};
    return ::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
           ::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) == 0;
}

TEST_F(AbandonedCommandTest, IsKilledOnKernelsWithoutSignalsToGroupsByDescriptor) {
    lock = orva::FileDescriptor();
    Record(orva::BootId(), start);
    const pid_t scheduler = ::fork();
    if (scheduler == 0) {
        ::_exit(ForgetGroupSignals() && folder.KillAbandonedCommand().IsOpen() ? 0 : 1);
    }
    int status = 0;
    ASSERT_EQ(::waitpid(scheduler, &status, 0), scheduler);
    EXPECT_EQ(status, 0);
    ASSERT_FALSE(command.Answers());
    EXPECT_EQ(SignalThatEndedIt(), SIGKILL);
}

TEST_F(RunFolderTest, ReplacesWhatStandsThereAlready) {
    const orva::RunFolder folder(7);
    Write("/usr/orva/var/runs/7/ending", "ended=1\0why=\0end=\0"s);
    ASSERT_TRUE(folder.Ending());
    const orva::FileDescriptor lock = Create(folder);
    EXPECT_FALSE(folder.Ending());
}

TEST_F(RunFolderTest, SaysWhyItCannotBeMadeAndLeavesNothing) {
    Write("/usr/orva/var/runs", "a file in the way");
    std::string error;
    EXPECT_FALSE(orva::RunFolder(7).Create(kOrder, error));
    EXPECT_EQ(error, RootPath() + "/usr/orva/var/runs/7: Not a directory");
}

TEST_F(RunFolderTest, ListsTheRunsThatHaveAFolderInOrder) {
    EXPECT_EQ(orva::RunFolder::All(), std::vector<std::int64_t>());
    for (const std::int64_t run : {12, 7, 100}) {
        MakeDirectory("/usr/orva/var/runs/" + std::to_string(run));
    }
    MakeDirectory("/usr/orva/var/runs/lost+found");
    MakeDirectory("/usr/orva/var/runs/007");
    EXPECT_EQ(orva::RunFolder::All(), (std::vector<std::int64_t>{7, 12, 100}));
}

TEST_F(RunFolderTest, IsRemovedWithAllThatIsInIt) {
    const orva::RunFolder folder(7);
    const orva::FileDescriptor lock = Create(folder);
    EXPECT_TRUE(folder.Remove());
    EXPECT_FALSE(std::filesystem::exists(folder.Path()));
    EXPECT_TRUE(folder.Remove());
}

}  // namespace
