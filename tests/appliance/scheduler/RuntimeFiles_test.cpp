#include "appliance/scheduler/RuntimeFiles.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <grp.h>
#include <poll.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <memory>
#include <stdexcept>
#include <string>

#include "appliance/root/Root.h"
#include "appliance/store/SchedulerLink.h"
#include "tests/appliance/util/Sandbox.h"

namespace {

using orva::ControlSocket;
using orva::FileDescriptor;
using orva::LockAsScheduler;
using orva::SchedulerLink;

using RuntimeFilesTest = Sandbox;

TEST_F(RuntimeFilesTest, TheLockMakesASchedulerAlive) {
    std::string error;
    EXPECT_FALSE(SchedulerLink::IsAlive());
    {
        const FileDescriptor lock = LockAsScheduler(error);
        ASSERT_TRUE(lock.IsOpen()) << error;
        EXPECT_TRUE(SchedulerLink::IsAlive());
        EXPECT_EQ(Read("/run/orva/schedd.lock"), std::to_string(::getpid()) + "\n");
    }
    EXPECT_FALSE(SchedulerLink::IsAlive());
}

TEST_F(RuntimeFilesTest, ASecondSchedulerIsRefusedAndLearnsOfTheFirst) {
    std::string error;
    const FileDescriptor first = LockAsScheduler(error);
    ASSERT_TRUE(first.IsOpen());
    EXPECT_FALSE(LockAsScheduler(error).IsOpen());
    EXPECT_EQ(error, "another scheduler (process " + std::to_string(::getpid()) +
                         ") is running for root " + RootPath() + "; this one does not start");
}

// The account that whoever is not trusted stands for, and a group that is not this process's.
constexpr uid_t kStranger = 65534;
constexpr gid_t kOtherGroup = 12345;

struct stat LockStatus(const std::string& root) {
    struct stat status {};
    EXPECT_EQ(::stat((root + "/run/orva/schedd.lock").c_str(), &status), 0);
    return status;
}

TEST_F(RuntimeFilesTest, OnlyAccountAndGroupOfTheStoreMayAskWhetherASchedulerIsRunning) {
    MakeDirectory("/usr/orva/var");
    const bool isRoot = ::geteuid() == 0;
    const gid_t group = isRoot ? kOtherGroup : ::getegid();
    ASSERT_EQ(::chown((RootPath() + "/usr/orva/var").c_str(), static_cast<uid_t>(-1), group), 0);
    std::string error;
    const mode_t mask = ::umask(0077);
    const FileDescriptor lock = LockAsScheduler(error);
    ::umask(mask);
    ASSERT_TRUE(lock.IsOpen()) << error;
    EXPECT_EQ(LockStatus(RootPath()).st_mode & 07777, 0640U);
    EXPECT_EQ(LockStatus(RootPath()).st_gid, group);
}

TEST_F(RuntimeFilesTest, ALockThatEverybodyCouldReadIsPutRight) {
    MakeDirectory("/usr/orva/var");
    Write("/run/orva/schedd.lock", "");
    ASSERT_EQ(::chmod((RootPath() + "/run/orva/schedd.lock").c_str(), 0644), 0);
    std::string error;
    ASSERT_TRUE(LockAsScheduler(error).IsOpen()) << error;
    EXPECT_EQ(LockStatus(RootPath()).st_mode & 07777, 0640U);
}

// In a process of its own, as another account where this one may become one; otherwise by a file
// that not even its owner may open.
TEST_F(RuntimeFilesTest, WhoeverMayNotOpenTheLockCannotHoldItAndFindsNoScheduler) {
    MakeDirectory("/usr/orva/var");
    std::string error;
    FileDescriptor lock = LockAsScheduler(error);
    ASSERT_TRUE(lock.IsOpen()) << error;
    const std::string path = RootPath() + "/run/orva/schedd.lock";
    ASSERT_EQ(::chmod(RootPath().c_str(), 0755), 0);
    const bool isRoot = ::geteuid() == 0;
    if (!isRoot) {
        ASSERT_EQ(::chmod(path.c_str(), 0), 0);
    }
    const pid_t child = ::fork();
    if (child == 0) {
        if (isRoot && (::setgroups(0, nullptr) != 0 || ::setgid(kStranger) != 0 ||
                       ::setuid(kStranger) != 0)) {
            ::_exit(2);
        }
        const FileDescriptor opened(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
        ::_exit(opened.IsOpen() || SchedulerLink::IsAlive() ? 1 : 0);
    }
    int status = 0;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    EXPECT_TRUE(WIFEXITED(status));
    EXPECT_EQ(WEXITSTATUS(status), 0);
}

TEST_F(RuntimeFilesTest, ARootThatDoesNotExistIsNotMade) {
    orva::SetRoot(RootPath() + "/mistyped");
    std::string error;
    EXPECT_FALSE(LockAsScheduler(error).IsOpen());
    EXPECT_EQ(error, "root " + RootPath() + "/mistyped is no directory");
    EXPECT_FALSE(std::filesystem::exists(RootPath() + "/mistyped"));
}

class ControlSocketTest : public Sandbox {
  protected:
    ControlSocketTest() {
        std::string error;
        lock = LockAsScheduler(error);
        socket = ControlSocket::Open(error);
        if (socket == nullptr) {
            throw std::runtime_error(error);
        }
    }

    // Waits for a message.
    ControlSocket::Message Receive() {
        pollfd watched{socket->Descriptor(), POLLIN, 0};
        ::poll(&watched, 1, 60'000);
        return socket->Receive().value_or(ControlSocket::Message());
    }

    FileDescriptor lock;
    std::unique_ptr<ControlSocket> socket;
};

TEST_F(ControlSocketTest, AWakeUpArrives) {
    EXPECT_FALSE(socket->Receive());
    SchedulerLink::Wake();
    EXPECT_EQ(Receive().text, "w");
    EXPECT_FALSE(socket->Receive());
}

TEST_F(ControlSocketTest, NobodyButAccountAndGroupOfTheStoreMaySend) {
    struct stat status {};
    ASSERT_EQ(::stat((RootPath() + "/run/orva/schedd.sock").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0660U);
}

TEST_F(ControlSocketTest, ASocketThatWasLeftBehindIsReplacedAndTheOwnOneTakenAway) {
    socket.reset();
    EXPECT_FALSE(std::filesystem::exists(RootPath() + "/run/orva/schedd.sock"));
    Write("/run/orva/schedd.sock", "left");
    std::string error;
    socket = ControlSocket::Open(error);
    ASSERT_NE(socket, nullptr) << error;
    SchedulerLink::Wake();
    EXPECT_EQ(Receive().text, "w");
}

TEST_F(ControlSocketTest, ARootTooDeepForASocketIsRefused) {
    const std::string deep = "/" + std::string(120, 'd');
    MakeDirectory(deep + "/run/orva");
    orva::SetRoot(RootPath() + deep);
    std::string error;
    EXPECT_EQ(ControlSocket::Open(error), nullptr);
    EXPECT_EQ(error, RootPath() + deep +
                         "/run/orva/schedd.sock: is too long for a socket; choose a root with a "
                         "shorter path");
}

// Asks for the end of run 12 from a process of its own, and yields what that was told.
class Asker {
  public:
    explicit Asker(const FileDescriptor& lock) {
        if (::pipe(channel) != 0) {
            throw std::runtime_error("pipe");
        }
        child = ::fork();
        if (child == 0) {
            // It would live on in this process.
            ::close(lock.Get());
            const std::string told = SchedulerLink::Stop(12).value_or("done");
            ::_exit(::write(channel[1], told.data(), told.size()) < 0 ? 1 : 0);
        }
        ::close(channel[1]);
    }

    std::string Told() {
        std::string told(512, '\0');
        const ssize_t length = ::read(channel[0], told.data(), told.size());
        told.resize(length > 0 ? static_cast<std::size_t>(length) : 0);
        ::close(channel[0]);
        ::waitpid(child, nullptr, 0);
        return told;
    }

  private:
    int channel[2] = {-1, -1};
    pid_t child = -1;
};

TEST_F(ControlSocketTest, ARequestToStopARunIsAnswered) {
    Asker first(lock);
    ControlSocket::Message message = Receive();
    EXPECT_EQ(message.text, "stop 12");
    socket->Answer(message, "");
    EXPECT_EQ(first.Told(), "done");

    Asker second(lock);
    message = Receive();
    socket->Answer(message, "no such run");
    EXPECT_EQ(second.Told(), "no such run");
}

TEST_F(ControlSocketTest, WhoeverAsksASchedulerThatEndsIsTold) {
    Asker asker(lock);
    EXPECT_EQ(Receive().text, "stop 12");
    socket.reset();
    lock = FileDescriptor();
    EXPECT_EQ(asker.Told(), "no scheduler is running");
}

TEST_F(RuntimeFilesTest, WithoutASchedulerNoRunCanBeStopped) {
    EXPECT_EQ(SchedulerLink::Stop(12), "no scheduler is running");
}

}  // namespace
