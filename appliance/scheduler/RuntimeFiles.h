// What a running scheduler has in /run/orva: the lock that makes it the only one of its root, and
// the socket that SchedulerLink talks to.
#pragma once

#include <sys/socket.h>
#include <sys/un.h>

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "appliance/util/FileDescriptor.h"

namespace orva {

// Takes the lock for as long as the descriptor is open, and makes its directory when that is
// missing. Those who may write the task store's directory may ask by it whether a scheduler is
// running. Not open with `error` set when another scheduler holds it, or when it cannot be made.
[[nodiscard]] FileDescriptor LockAsScheduler(std::string& error);

// The scheduler's end of SchedulerLink. Does not block.
class ControlSocket {
  public:
    // Takes the place of what an earlier scheduler has left; the caller holds the lock. Those who
    // may write the task store's directory may send. Null with `error` set when that fails.
    static std::unique_ptr<ControlSocket> Open(std::string& error);
    // Takes the socket away.
    ~ControlSocket();
    ControlSocket(const ControlSocket&) = delete;
    ControlSocket& operator=(const ControlSocket&) = delete;

    int Descriptor() const { return socket.Get(); }

    struct Message {
        std::string text;
        sockaddr_un sender{};
        socklen_t senderLength = 0;
    };
    // The next message that has come; nothing when there is none.
    std::optional<Message> Receive();
    // Nobody waits for a sender that does not take its answer.
    void Answer(const Message& message, std::string_view answer);

  private:
    ControlSocket(FileDescriptor boundSocket, std::string socketPath)
        : socket(std::move(boundSocket)), path(std::move(socketPath)) {}

    FileDescriptor socket;
    std::string path;
};

}  // namespace orva
