#pragma once

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <list>
#include <mutex>
#include <thread>

namespace orva {

// The connections of a server and what each of them may take its time for. A connection that takes
// too long is cut: its socket is shut down, whereupon the thread that serves it ends.
//
// Threads: any. A socket is closed by its owner, and only after Remove().
class ConnectionTable {
  public:
    struct Limits {
        std::size_t connections = 300;
        // For a request to arrive whole: from the accept, or, on a connection that is used again,
        // from the end of its request line.
        std::chrono::milliseconds request{10'000};
        // Between an answer's end and the next request line.
        std::chrono::milliseconds idle{60'000};
        // For an answer to be taken by the client.
        std::chrono::milliseconds answer{60'000};
    };

    struct Connection;

    explicit ConnectionTable(const Limits& limits);
    ~ConnectionTable();
    ConnectionTable(const ConnectionTable&) = delete;
    ConnectionTable& operator=(const ConnectionTable&) = delete;

    // Whether one more connection may come. At the limit the one that has waited longest without
    // sending a request is cut for it, a connection that never sent one first; false when there is
    // none, because all are being served.
    bool MakeRoom();

    Connection* Add(int socket);
    void Remove(Connection* connection);

    // The stations of a request. From RequestArrived to AnswerReady nothing is cut: a method takes
    // the time that it needs.
    void RequestBegins(Connection* connection);
    void RequestArrived(Connection* connection);
    void AnswerReady(Connection* connection);
    void AnswerSent(Connection* connection);

    // Ends the receiving side of the connections that wait for a request, now and from now on: what
    // a client has already sent is still read and served, then the connection ends.
    void StopWaiting();
    bool IsStopping() const;
    // Waits until all connections have been removed. False when `patience` is over first.
    bool WaitUntilEmpty(std::chrono::milliseconds patience);

  private:
    using Clock = std::chrono::steady_clock;

    void EnterLocked(Connection& connection, int phase, Clock::time_point deadline);
    void CutLocked(Connection& connection);
    void Reap();

    const Limits limits;
    mutable std::mutex mutex;
    std::condition_variable changed;
    std::list<Connection> connections;
    // Those that have not been cut.
    std::size_t live = 0;
    bool stopping = false;
    bool ending = false;
    std::thread reaper;
};

}  // namespace orva
