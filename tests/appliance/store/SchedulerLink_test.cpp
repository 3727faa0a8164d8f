#include "appliance/store/SchedulerLink.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <poll.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <cstring>
#include <filesystem>
#include <stdexcept>

#include "appliance/root/Root.h"
#include "appliance/util/FileDescriptor.h"
#include "tests/appliance/store/StoreTest.h"

namespace {

using orva::SchedulerLink;

// Plays the scheduler's part of the link.
class FakeScheduler {
  public:
    explicit FakeScheduler(const std::string& root)
        : lock(
              ::open((root + "/run/orva/schedd.lock").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600)),
          socket(::socket(AF_UNIX, SOCK_DGRAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0)) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        const std::string path = root + "/run/orva/schedd.sock";
        std::strncpy(address.sun_path, path.c_str(), sizeof address.sun_path - 1);
        if (::flock(lock.Get(), LOCK_EX | LOCK_NB) != 0 ||
            ::bind(socket.Get(), reinterpret_cast<sockaddr*>(&address), sizeof address) != 0) {
            throw std::runtime_error("cannot play the scheduler");
        }
    }

    // How many messages have come since the last call.
    int Wakeups() {
        int count = 0;
        char message[16];
        while (::recv(socket.Get(), message, sizeof message, 0) >= 0) {
            ++count;
        }
        return count;
    }

  private:
    orva::FileDescriptor lock;
    orva::FileDescriptor socket;
};

class SchedulerLinkTest : public StoreTest {
  protected:
    SchedulerLinkTest() { MakeDirectory("/run/orva"); }
};

TEST_F(SchedulerLinkTest, ASchedulerIsAliveWhileItHoldsItsLock) {
    EXPECT_FALSE(SchedulerLink::IsAlive());
    {
        const FakeScheduler scheduler(RootPath());
        EXPECT_TRUE(SchedulerLink::IsAlive());
        EXPECT_TRUE(SchedulerLink::IsAlive());
    }
    // The files that it leaves behind do not make it live.
    EXPECT_TRUE(std::filesystem::exists(RootPath() + "/run/orva/schedd.lock"));
    EXPECT_FALSE(SchedulerLink::IsAlive());
}

TEST_F(SchedulerLinkTest, LookingDoesNotKeepTheLock) {
    { const FakeScheduler scheduler(RootPath()); }
    std::filesystem::remove(RootPath() + "/run/orva/schedd.sock");
    EXPECT_FALSE(SchedulerLink::IsAlive());
    EXPECT_NO_THROW(FakeScheduler{RootPath()});
}

TEST_F(SchedulerLinkTest, EveryChangeOfTheTasksWakesTheScheduler) {
    FakeScheduler scheduler(RootPath());
    orva::TaskStore& store = *orva::TaskStore::Current();
    const int id = store.Save(SampleTask("a"));
    EXPECT_EQ(scheduler.Wakeups(), 1);
    store.QueueRun(id);
    EXPECT_EQ(scheduler.Wakeups(), 1);
    store.Remove(id);
    EXPECT_EQ(scheduler.Wakeups(), 1);
    store.SaveAll({SampleTask("a"), SampleTask("b")});
    EXPECT_EQ(scheduler.Wakeups(), 1);
    EXPECT_THROW(store.Remove(id), std::exception);
    store.CurrentSnapshot();
    EXPECT_EQ(scheduler.Wakeups(), 0);
}

TEST_F(SchedulerLinkTest, ASchedulerThatTookTheFormerOnesPlaceIsWoken) {
    for (int round = 0; round < 3; ++round) {
        FakeScheduler scheduler(RootPath());
        SchedulerLink::Wake();
        SchedulerLink::Wake();
        EXPECT_EQ(scheduler.Wakeups(), 2);
        std::filesystem::remove(RootPath() + "/run/orva/schedd.sock");
    }
    const std::string second = RootPath() + "/second";
    MakeDirectory("/second/run/orva");
    FakeScheduler here(RootPath());
    SchedulerLink::Wake();
    orva::SetRoot(second);
    FakeScheduler there(second);
    SchedulerLink::Wake();
    EXPECT_EQ(here.Wakeups(), 1);
    EXPECT_EQ(there.Wakeups(), 1);
    EXPECT_THAT(TakeLog(), testing::IsEmpty());
}

TEST_F(SchedulerLinkTest, NobodyWaitsForASchedulerThatIsBehind) {
    FakeScheduler scheduler(RootPath());
    for (int count = 0; count < 2000; ++count) {
        SchedulerLink::Wake();
    }
    EXPECT_GT(scheduler.Wakeups(), 0);
    EXPECT_THAT(TakeLog(), testing::IsEmpty());
}

TEST_F(SchedulerLinkTest, WithoutASchedulerNobodyIsWokenAndNothingIsLogged) {
    SchedulerLink::Wake();
    { const FakeScheduler scheduler(RootPath()); }
    SchedulerLink::Wake();
    EXPECT_THAT(TakeLog(), testing::IsEmpty());
}

TEST_F(SchedulerLinkTest, ARootTooDeepForASocketStillHasAStore) {
    const std::string deep = RootPath() + "/" + std::string(120, 'd');
    MakeDirectory("/" + std::string(120, 'd'));
    orva::SetRoot(deep);
    EXPECT_EQ(orva::TaskStore::Current()->Save(SampleTask("a")), 1);
}

}  // namespace
