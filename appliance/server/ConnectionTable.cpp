#include "appliance/server/ConnectionTable.h"

#include <sys/socket.h>

#include <algorithm>

namespace orva {
namespace {

enum Phase : int { kWaiting, kArriving, kServing, kAnswering };

// How much later than its deadline a connection may be cut, as a part of the shortest limit.
constexpr int kTicksPerLimit = 10;

}  // namespace

struct ConnectionTable::Connection {
    int socket = -1;
    int phase = kWaiting;
    bool everServed = false;
    bool cut = false;
    Clock::time_point since;
    Clock::time_point deadline;
    std::list<Connection>::iterator self;
};

ConnectionTable::ConnectionTable(const Limits& givenLimits)
    : limits(givenLimits), reaper([this] { Reap(); }) {}

ConnectionTable::~ConnectionTable() {
    {
        const std::lock_guard lock(mutex);
        ending = true;
    }
    changed.notify_all();
    reaper.join();
}

bool ConnectionTable::MakeRoom() {
    const std::lock_guard lock(mutex);
    if (live < limits.connections) {
        return true;
    }
    Connection* chosen = nullptr;
    for (Connection& connection : connections) {
        const bool candidate =
            !connection.cut && (connection.phase == kWaiting ||
                                (connection.phase == kArriving && !connection.everServed));
        if (!candidate) {
            continue;
        }
        const bool better =
            chosen == nullptr || (chosen->everServed && !connection.everServed) ||
            (chosen->everServed == connection.everServed && connection.since < chosen->since);
        if (better) {
            chosen = &connection;
        }
    }
    if (chosen == nullptr) {
        return false;
    }
    CutLocked(*chosen);
    return true;
}

ConnectionTable::Connection* ConnectionTable::Add(int socket) {
    const std::lock_guard lock(mutex);
    Connection& connection = connections.emplace_back();
    connection.self = std::prev(connections.end());
    connection.socket = socket;
    ++live;
    const Clock::time_point now = Clock::now();
    EnterLocked(connection, kWaiting, now + limits.request);
    if (stopping) {
        ::shutdown(socket, SHUT_RD);
    }
    // The reaper sleeps without a limit while there is no connection.
    if (connections.size() == 1) {
        changed.notify_all();
    }
    return &connection;
}

void ConnectionTable::Remove(Connection* connection) {
    const std::lock_guard lock(mutex);
    if (!connection->cut) {
        --live;
    }
    connections.erase(connection->self);
    if (connections.empty()) {
        changed.notify_all();
    }
}

void ConnectionTable::RequestBegins(Connection* connection) {
    const std::lock_guard lock(mutex);
    // A first request has been arriving since the accept.
    const Clock::time_point deadline =
        connection->everServed ? Clock::now() + limits.request : connection->deadline;
    EnterLocked(*connection, kArriving, deadline);
}

void ConnectionTable::RequestArrived(Connection* connection) {
    const std::lock_guard lock(mutex);
    EnterLocked(*connection, kServing, Clock::time_point::max());
}

void ConnectionTable::AnswerReady(Connection* connection) {
    const std::lock_guard lock(mutex);
    EnterLocked(*connection, kAnswering, Clock::now() + limits.answer);
}

void ConnectionTable::AnswerSent(Connection* connection) {
    const std::lock_guard lock(mutex);
    connection->everServed = true;
    EnterLocked(*connection, kWaiting, Clock::now() + limits.idle);
    if (stopping) {
        ::shutdown(connection->socket, SHUT_RD);
    }
}

void ConnectionTable::StopWaiting() {
    const std::lock_guard lock(mutex);
    stopping = true;
    for (Connection& connection : connections) {
        if (connection.phase == kWaiting) {
            ::shutdown(connection.socket, SHUT_RD);
        }
    }
}

bool ConnectionTable::IsStopping() const {
    const std::lock_guard lock(mutex);
    return stopping;
}

bool ConnectionTable::WaitUntilEmpty(std::chrono::milliseconds patience) {
    std::unique_lock lock(mutex);
    return changed.wait_for(lock, patience, [this] { return connections.empty(); });
}

void ConnectionTable::EnterLocked(Connection& connection, int phase, Clock::time_point deadline) {
    connection.phase = phase;
    connection.since = Clock::now();
    connection.deadline = deadline;
}

void ConnectionTable::CutLocked(Connection& connection) {
    if (!connection.cut) {
        connection.cut = true;
        --live;
        ::shutdown(connection.socket, SHUT_RDWR);
    }
}

void ConnectionTable::Reap() {
    const auto tick =
        std::max(std::min({limits.request, limits.idle, limits.answer}) / kTicksPerLimit,
                 std::chrono::milliseconds(1));
    std::unique_lock lock(mutex);
    while (!ending) {
        if (connections.empty()) {
            changed.wait(lock, [this] { return ending || !connections.empty(); });
        } else {
            changed.wait_for(lock, tick, [this] { return ending; });
        }
        const Clock::time_point now = Clock::now();
        for (Connection& connection : connections) {
            if (connection.deadline < now) {
                CutLocked(connection);
            }
        }
    }
}

}  // namespace orva
