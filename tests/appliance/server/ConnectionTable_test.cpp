#include "appliance/server/ConnectionTable.h"

#include <gtest/gtest.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <chrono>
#include <string_view>
#include <thread>
#include <vector>

#include "tests/system/Process.h"

namespace {

using orva::ConnectionTable;
using std::chrono::milliseconds;

constexpr milliseconds kShort{30};
constexpr milliseconds kNever{1'000'000};

// Both ends of a connection: the table's, and the client's.
struct SocketPair {
    int ends[2] = {-1, -1};

    SocketPair() {
        if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0) {
            throw std::runtime_error("socketpair");
        }
    }
    ~SocketPair() {
        ::close(ends[0]);
        ::close(ends[1]);
    }
    SocketPair(const SocketPair&) = delete;
    SocketPair& operator=(const SocketPair&) = delete;

    int Server() const { return ends[0]; }

    bool IsCut() const {
        pollfd watched{ends[1], POLLIN, 0};
        return ::poll(&watched, 1, 0) == 1;
    }
    bool WaitUntilCut() const {
        pollfd watched{ends[1], POLLIN, 0};
        return ::poll(&watched, 1, static_cast<int>(milliseconds(orva::test::kPatience).count())) ==
               1;
    }
};

ConnectionTable::Limits Limits(std::size_t connections, milliseconds request, milliseconds idle,
                               milliseconds answer) {
    return {connections, request, idle, answer};
}

void ServeOne(ConnectionTable& table, ConnectionTable::Connection* connection) {
    table.RequestBegins(connection);
    table.RequestArrived(connection);
    table.AnswerReady(connection);
    table.AnswerSent(connection);
}

TEST(ConnectionTable, CutsAConnectionThatSendsNoRequest) {
    ConnectionTable table(Limits(10, kShort, kNever, kNever));
    const SocketPair pair;
    auto* connection = table.Add(pair.Server());
    EXPECT_TRUE(pair.WaitUntilCut());
    table.Remove(connection);
}

TEST(ConnectionTable, CutsAFirstRequestThatDoesNotArriveInTime) {
    ConnectionTable table(Limits(10, kShort, kNever, kNever));
    const SocketPair pair;
    auto* connection = table.Add(pair.Server());
    table.RequestBegins(connection);
    EXPECT_TRUE(pair.WaitUntilCut());
    table.Remove(connection);
}

TEST(ConnectionTable, CutsALaterRequestThatDoesNotArriveInTime) {
    ConnectionTable table(Limits(10, milliseconds(500), kNever, kNever));
    const SocketPair pair;
    auto* connection = table.Add(pair.Server());
    ServeOne(table, connection);
    table.RequestBegins(connection);
    EXPECT_TRUE(pair.WaitUntilCut());
    table.Remove(connection);
}

TEST(ConnectionTable, CutsAConnectionThatIsIdleTooLong) {
    ConnectionTable table(Limits(10, kNever, kShort, kNever));
    const SocketPair pair;
    auto* connection = table.Add(pair.Server());
    ServeOne(table, connection);
    EXPECT_TRUE(pair.WaitUntilCut());
    table.Remove(connection);
}

TEST(ConnectionTable, CutsAConnectionThatDoesNotTakeItsAnswer) {
    ConnectionTable table(Limits(10, kNever, kNever, kShort));
    const SocketPair pair;
    auto* connection = table.Add(pair.Server());
    table.RequestBegins(connection);
    table.RequestArrived(connection);
    table.AnswerReady(connection);
    EXPECT_TRUE(pair.WaitUntilCut());
    table.Remove(connection);
}

TEST(ConnectionTable, LeavesARunningMethodItsTime) {
    ConnectionTable table(Limits(10, milliseconds(500), kNever, kNever));
    const SocketPair serving;
    const SocketPair silent;
    auto* served = table.Add(serving.Server());
    table.RequestBegins(served);
    table.RequestArrived(served);
    // The silent one came later: when it is cut, the other's time would have been over too.
    auto* other = table.Add(silent.Server());
    EXPECT_TRUE(silent.WaitUntilCut());
    EXPECT_FALSE(serving.IsCut());
    table.Remove(served);
    table.Remove(other);
}

TEST(ConnectionTable, HasRoomBelowItsLimit) {
    ConnectionTable table(Limits(2, kNever, kNever, kNever));
    const SocketPair first;
    const SocketPair second;
    EXPECT_TRUE(table.MakeRoom());
    auto* one = table.Add(first.Server());
    EXPECT_TRUE(table.MakeRoom());
    auto* two = table.Add(second.Server());
    EXPECT_FALSE(first.IsCut());
    EXPECT_FALSE(second.IsCut());
    table.Remove(one);
    EXPECT_TRUE(table.MakeRoom());
    EXPECT_FALSE(second.IsCut());
    table.Remove(two);
}

TEST(ConnectionTable, CutsTheOldestSilentConnectionForANewOne) {
    ConnectionTable table(Limits(3, kNever, kNever, kNever));
    const SocketPair pairs[3];
    std::vector<ConnectionTable::Connection*> connections;
    for (const SocketPair& pair : pairs) {
        connections.push_back(table.Add(pair.Server()));
    }
    // The oldest of all has been served; it may be idle, but it has shown that it is a client.
    ServeOne(table, connections[0]);
    EXPECT_TRUE(table.MakeRoom());
    EXPECT_FALSE(pairs[0].IsCut());
    EXPECT_TRUE(pairs[1].IsCut());
    EXPECT_FALSE(pairs[2].IsCut());
    for (auto* connection : connections) {
        table.Remove(connection);
    }
}

TEST(ConnectionTable, CutsAnIdleConnectionWhenNoneIsSilent) {
    ConnectionTable table(Limits(2, kNever, kNever, kNever));
    const SocketPair busy;
    const SocketPair idle;
    auto* one = table.Add(busy.Server());
    auto* two = table.Add(idle.Server());
    ServeOne(table, one);
    ServeOne(table, two);
    table.RequestBegins(one);
    EXPECT_TRUE(table.MakeRoom());
    EXPECT_FALSE(busy.IsCut());
    EXPECT_TRUE(idle.IsCut());
    table.Remove(one);
    table.Remove(two);
}

TEST(ConnectionTable, HasNoRoomWhileAllAreServed) {
    ConnectionTable table(Limits(1, kNever, kNever, kNever));
    const SocketPair pair;
    auto* connection = table.Add(pair.Server());
    table.RequestBegins(connection);
    table.RequestArrived(connection);
    EXPECT_FALSE(table.MakeRoom());
    EXPECT_FALSE(pair.IsCut());
    table.Remove(connection);
}

TEST(ConnectionTable, CutsOneConnectionForEveryNewOne) {
    ConnectionTable table(Limits(2, kNever, kNever, kNever));
    const SocketPair first;
    const SocketPair second;
    auto* one = table.Add(first.Server());
    auto* two = table.Add(second.Server());
    EXPECT_TRUE(table.MakeRoom());
    const SocketPair third;
    auto* three = table.Add(third.Server());
    EXPECT_TRUE(table.MakeRoom());
    EXPECT_TRUE(first.IsCut());
    EXPECT_TRUE(second.IsCut());
    EXPECT_FALSE(third.IsCut());
    table.Remove(one);
    table.Remove(two);
    table.Remove(three);
}

TEST(ConnectionTable, StopsTheWaitingOnesAndLeavesTheOthers) {
    ConnectionTable table(Limits(10, kNever, kNever, kNever));
    const SocketPair waiting;
    const SocketPair arriving;
    auto* one = table.Add(waiting.Server());
    auto* two = table.Add(arriving.Server());
    table.RequestBegins(two);
    EXPECT_FALSE(table.IsStopping());
    table.StopWaiting();
    EXPECT_TRUE(table.IsStopping());
    char byte = 0;
    EXPECT_EQ(::recv(waiting.Server(), &byte, 1, MSG_DONTWAIT), 0);
    EXPECT_EQ(::recv(arriving.Server(), &byte, 1, MSG_DONTWAIT), -1);
    table.RequestArrived(two);
    table.AnswerReady(two);
    table.AnswerSent(two);
    EXPECT_EQ(::recv(arriving.Server(), &byte, 1, MSG_DONTWAIT), 0);
    const SocketPair late;
    auto* three = table.Add(late.Server());
    EXPECT_EQ(::recv(late.Server(), &byte, 1, MSG_DONTWAIT), 0);
    table.Remove(one);
    table.Remove(two);
    table.Remove(three);
}

TEST(ConnectionTable, LetsAStoppedConnectionReadWhatHasBeenSent) {
    ConnectionTable table(Limits(10, kNever, kNever, kNever));
    const SocketPair pair;
    auto* connection = table.Add(pair.Server());
    ASSERT_EQ(::send(pair.ends[1], "GET", 3, 0), 3);
    table.StopWaiting();
    char bytes[8];
    EXPECT_EQ(::recv(pair.Server(), bytes, sizeof bytes, MSG_DONTWAIT), 3);
    EXPECT_EQ(::recv(pair.Server(), bytes, sizeof bytes, MSG_DONTWAIT), 0);
    table.Remove(connection);
}

TEST(ConnectionTable, WaitsUntilAllConnectionsAreGone) {
    ConnectionTable table(Limits(10, kNever, kNever, kNever));
    const SocketPair pair;
    auto* connection = table.Add(pair.Server());
    EXPECT_FALSE(table.WaitUntilEmpty(milliseconds(0)));
    std::thread other([&] { table.Remove(connection); });
    EXPECT_TRUE(table.WaitUntilEmpty(orva::test::kPatience));
    other.join();
}

}  // namespace
