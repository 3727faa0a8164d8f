#include "appliance/supervisor/RunFolder.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>

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
    EXPECT_EQ(folder.Look(), State::kNotBegun);
    orva::FileDescriptor lock = Create(folder);
    EXPECT_EQ(folder.Look(), State::kSupervised);
    lock = orva::FileDescriptor();
    EXPECT_EQ(folder.Look(), State::kNotBegun);
    Write("/usr/orva/var/runs/7/process", orva::SupervisorRecords({"boot", 17, 4711, 0}));
    EXPECT_EQ(folder.Look(), State::kAbandoned);
    Write("/usr/orva/var/runs/7/ending", "ended=1\0why=\0end=\0"s);
    EXPECT_EQ(folder.Look(), State::kEnded);
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

TEST_F(RunFolderTest, KillsAnAbandonedCommandOnlyWhenItIsCertainlyTheSame) {
    const orva::RunFolder folder(7);
    orva::FileDescriptor lock = Create(folder);
    int ready[2];
    ASSERT_EQ(::pipe2(ready, O_CLOEXEC), 0);
    const pid_t child = ::fork();
    if (child == 0) {
        lock = orva::FileDescriptor();
        ::setpgid(0, 0);
        static_cast<void>(::write(ready[1], "r", 1));
        ::pause();
        ::_exit(0);
    }
    char byte = 0;
    ASSERT_EQ(::read(ready[0], &byte, 1), 1);
    ::close(ready[0]);
    ::close(ready[1]);
    const std::uint64_t start = orva::ProcessStart(child).value_or(0);
    const auto record = [&](const std::string& bootId, std::uint64_t commandStart) {
        Write("/usr/orva/var/runs/7/process", orva::SupervisorRecords({bootId, 17, 4711, 0}) +
                                                  orva::CommandRecords(child, commandStart));
    };
    record(orva::BootId(), start);
    EXPECT_FALSE(folder.KillAbandonedCommand().IsOpen());
    lock = orva::FileDescriptor();
    record(orva::BootId(), start - 1);
    EXPECT_FALSE(folder.KillAbandonedCommand().IsOpen());
    record(orva::BootId(), 0);
    EXPECT_FALSE(folder.KillAbandonedCommand().IsOpen());
    record("00000000-0000-0000-0000-000000000000", start);
    EXPECT_FALSE(folder.KillAbandonedCommand().IsOpen());
    EXPECT_EQ(::waitpid(child, nullptr, WNOHANG), 0);

    record(orva::BootId(), start);
    const orva::FileDescriptor shell = folder.KillAbandonedCommand();
    ASSERT_TRUE(shell.IsOpen());
    pollfd ended{shell.Get(), POLLIN, 0};
    EXPECT_EQ(::poll(&ended, 1, 60'000), 1);
    int status = 0;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL);
    EXPECT_FALSE(folder.KillAbandonedCommand().IsOpen());
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
