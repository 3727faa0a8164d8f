#include "appliance/server/ListenSocket.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <string>
#include <system_error>

#include "tests/system/HttpClient.h"
#include "tests/system/Process.h"

namespace {

using orva::ListenSocket;
using testing::HasSubstr;
using testing::MatchesRegex;

ListenSocket Open(const std::string& address) {
    std::string error;
    std::optional<ListenSocket> socket = ListenSocket::Open(address, error);
    if (!socket) {
        throw std::runtime_error(error);
    }
    return std::move(*socket);
}

std::string Refusal(const std::string& address) {
    std::string error;
    EXPECT_FALSE(ListenSocket::Open(address, error).has_value()) << address;
    return error;
}

TEST(ListenSocket, TellsThePortThatItGot) {
    const ListenSocket socket = Open("127.0.0.1:0");
    EXPECT_THAT(socket.Url(), MatchesRegex("http://127\\.0\\.0\\.1:[1-9][0-9]*"));
    EXPECT_NO_THROW(orva::test::HttpConnection{socket.Url()});
}

// Not every machine has IPv6; one without it must say so.
TEST(ListenSocket, ListensOnIpv6OrSaysWhyNot) {
    std::string error;
    const std::optional<ListenSocket> socket = ListenSocket::Open("[::1]:0", error);
    if (socket) {
        EXPECT_THAT(socket->Url(), MatchesRegex("http://\\[::1\\]:[1-9][0-9]*"));
        EXPECT_NO_THROW(orva::test::HttpConnection{socket->Url()});
    } else {
        EXPECT_THAT(error, MatchesRegex("cannot listen on \\[::1\\]:0: (Address family not "
                                        "supported by protocol|Cannot assign requested address)"));
    }
}

TEST(ListenSocket, RefusesWhatIsNoAddress) {
    for (const char* address :
         {"", ":", ":5080", "5080", "127.0.0.1", "127.0.0.1:", "127.0.0.1:x", "127.0.0.1:65536",
          "127.0.0.1:-1", "127.0.0.1: 80", "localhost:5080", "::1:5080", "[::1]", "[zz]:80",
          "[127.0.0.1]:80", "[:80"}) {
        EXPECT_EQ(Refusal(address),
                  "cannot listen on " + std::string(address) +
                      ": needed is ADDRESS:PORT with a numeric address, [ADDRESS]:PORT or "
                      "unix:PATH");
    }
}

TEST(ListenSocket, SaysWhenThePortIsTaken) {
    const ListenSocket first = Open("127.0.0.1:0");
    const std::string address = first.Url().substr(7);
    EXPECT_EQ(Refusal(address), "cannot listen on " + address + ": Address already in use");
}

TEST(ListenSocket, MakesAUnixSocketForOwnerAndGroup) {
    const orva::test::Sandbox sandbox;
    const std::string path = (sandbox.Path() / "s").string();
    const mode_t before = ::umask(077);
    const ListenSocket socket = Open("unix:" + path);
    ::umask(before);
    EXPECT_EQ(socket.Url(), "unix:" + path);
    struct stat status {};
    ASSERT_EQ(::stat(path.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777U, 0660U);
    EXPECT_NO_THROW(orva::test::HttpConnection{socket.Url()});
}

TEST(ListenSocket, RemovesItsFileAtTheEnd) {
    const orva::test::Sandbox sandbox;
    const std::string path = (sandbox.Path() / "s").string();
    { const ListenSocket socket = Open("unix:" + path); }
    EXPECT_FALSE(std::filesystem::exists(path));
}

TEST(ListenSocket, RefusesCallersOnceItHasStopped) {
    const orva::test::Sandbox sandbox;
    const std::string path = (sandbox.Path() / "s").string();
    ListenSocket internet = Open("127.0.0.1:0");
    ListenSocket local = Open("unix:" + path);
    internet.StopListening();
    local.StopListening();
    EXPECT_THROW(orva::test::HttpConnection{internet.Url()}, std::system_error);
    EXPECT_THROW(orva::test::HttpConnection{local.Url()}, std::system_error);
    EXPECT_FALSE(std::filesystem::exists(path));
}

TEST(ListenSocket, ReplacesTheSocketOfAServerThatIsGone) {
    const orva::test::Sandbox sandbox;
    const std::string path = (sandbox.Path() / "s").string();
    {
        // A moved socket closes without its file being removed, as after a crash.
        const ListenSocket crashed = Open("unix:" + path);
        std::filesystem::rename(path, path + ".kept");
    }
    std::filesystem::rename(path + ".kept", path);
    const ListenSocket socket = Open("unix:" + path);
    EXPECT_NO_THROW(orva::test::HttpConnection{socket.Url()});
}

TEST(ListenSocket, LeavesTheSocketOfARunningServerAlone) {
    const orva::test::Sandbox sandbox;
    const std::string path = (sandbox.Path() / "s").string();
    const ListenSocket first = Open("unix:" + path);
    EXPECT_EQ(Refusal("unix:" + path),
              "cannot listen on unix:" + path + ": another program listens there");
    EXPECT_NO_THROW(orva::test::HttpConnection{first.Url()});
}

TEST(ListenSocket, LeavesAFileThatIsNoSocketAlone) {
    const orva::test::Sandbox sandbox;
    const std::string path = sandbox.Write("s", "precious");
    EXPECT_EQ(Refusal("unix:" + path),
              "cannot listen on unix:" + path + ": there is a file that is no socket");
    EXPECT_EQ(orva::test::ReadWholeFile(path), "precious");
}

TEST(ListenSocket, RefusesAPathThatIsTooLong) {
    const std::string path = "/tmp/" + std::string(103, 'x');
    EXPECT_EQ(Refusal("unix:" + path),
              "cannot listen on unix:" + path +
                  ": the socket's path must have 1 to 107 bytes, this one has 108");
    EXPECT_THAT(Refusal("unix:"), HasSubstr("this one has 0"));
}

TEST(ListenSocket, SaysWhenTheDirectoryIsMissing) {
    EXPECT_EQ(Refusal("unix:/nowhere/at/all"),
              "cannot listen on unix:/nowhere/at/all: No such file or directory");
}

}  // namespace
