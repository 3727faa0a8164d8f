// What systemd hears of the daemons.
#include <gtest/gtest.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <array>
#include <cstring>
#include <string>

#include "appliance/util/FileDescriptor.h"
#include "tests/system/Process.h"
#include "tests/system/RunningScheduler.h"
#include "tests/system/RunningServer.h"

namespace {

using orva::test::ServerProcess;

class ServiceManagerTest : public testing::Test {
  protected:
    ServiceManagerTest()
        : path((folder.Path() / "notify").string()),
          socket(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0)) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        std::strncpy(address.sun_path, path.c_str(), sizeof address.sun_path - 1);
        EXPECT_EQ(::bind(socket.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address),
                  0);
    }

    // The next message; "nothing" when none comes.
    std::string Heard() const {
        pollfd watched{socket.Get(), POLLIN, 0};
        if (::poll(&watched, 1, 20'000) != 1) {
            return "nothing";
        }
        std::array<char, 4096> buffer{};
        const ssize_t got = ::recv(socket.Get(), buffer.data(), buffer.size(), 0);
        return {buffer.data(), static_cast<std::size_t>(got > 0 ? got : 0)};
    }

    const orva::test::Sandbox folder;
    const std::string path;
    const orva::FileDescriptor socket;
};

TEST_F(ServiceManagerTest, HearsWhenTheServerListensAndWhenItEnds) {
    const orva::test::RunningServer server({ORVA_LIB_DIR "/ORVA.Core.TaskScheduler.so"});
    ServerProcess process(server.Arguments("127.0.0.1:0"), "listening on ",
                          {{"NOTIFY_SOCKET", path}});
    ASSERT_TRUE(process.Ready());
    EXPECT_EQ(Heard(), "READY=1");
    EXPECT_EQ(process.Stop(), 0);
    EXPECT_EQ(Heard(), "STOPPING=1");
}

TEST_F(ServiceManagerTest, HearsNothingOfAServerThatCannotListen) {
    const orva::test::RunningServer server({ORVA_LIB_DIR "/ORVA.Core.TaskScheduler.so"});
    const std::string listen = "unix:" + (folder.Path() / "api").string();
    ServerProcess first(server.Arguments(listen));
    ASSERT_TRUE(first.Ready());
    ServerProcess second(server.Arguments(listen), "listening on ", {{"NOTIFY_SOCKET", path}});
    EXPECT_FALSE(second.Ready());
    EXPECT_NE(second.Wait(), 0);
    EXPECT_EQ(::recv(socket.Get(), nullptr, 0, MSG_DONTWAIT), -1);
}

TEST_F(ServiceManagerTest, HearsWhenTheSchedulerIsAtWorkAndWhenItEnds) {
    const orva::test::RunningScheduler appliance;
    ServerProcess process(appliance.Arguments(), "", {{"NOTIFY_SOCKET", path}});
    ASSERT_TRUE(process.Ready());
    EXPECT_EQ(Heard(), "READY=1");
    EXPECT_EQ(process.Stop(), 0);
    EXPECT_EQ(Heard(), "STOPPING=1");
}

}  // namespace
