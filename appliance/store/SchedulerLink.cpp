#include "appliance/store/SchedulerLink.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <syslog.h>

#include <cerrno>
#include <cstring>
#include <mutex>
#include <string>
#include <string_view>

#include "appliance/root/Root.h"
#include "appliance/util/FileDescriptor.h"

namespace orva {
namespace {

// A scheduler answers at once unless it waits for the database.
constexpr int kAnswerSeconds = 15;
constexpr int kMillisecondsPerLook = 1000;

// The address of the scheduler's socket; nothing when the root is too deep for one. No scheduler
// can listen there either; it says so when it is started.
std::optional<sockaddr_un> SchedulerAddress() {
    const std::string path = ResolvePath(SchedulerLink::kSocket);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.size() >= sizeof address.sun_path) {
        return std::nullopt;
    }
    std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
    return address;
}

FileDescriptor OpenSocket() {
    return FileDescriptor(::socket(AF_UNIX, SOCK_DGRAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0));
}

bool Send(const FileDescriptor& socket, const sockaddr_un& address, std::string_view message) {
    return ::sendto(socket.Get(), message.data(), message.size(), MSG_NOSIGNAL,
                    reinterpret_cast<const sockaddr*>(&address), sizeof address) >= 0;
}

bool NobodyListens(int error) { return error == ENOENT || error == ECONNREFUSED; }

// The way that all wake-up calls of this process go. It stays connected to the scheduler's socket:
// finding that anew is most of what a call costs.
class WakeLine {
  public:
    // 0, or the errno of what went wrong.
    int Call(const sockaddr_un& address) {
        const std::lock_guard lock(mutex);
        if (connectedTo == address.sun_path && TrySend() == 0) {
            return 0;
        }
        // The scheduler may be another one by now.
        connectedTo.clear();
        if (!socket.IsOpen()) {
            socket = OpenSocket();
        }
        if (!socket.IsOpen()) {
            return errno;
        }
        if (::connect(socket.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) !=
            0) {
            return errno;
        }
        connectedTo = address.sun_path;
        return TrySend();
    }

  private:
    int TrySend() {
        const std::string_view message = SchedulerLink::kWakeMessage;
        const bool sent = ::send(socket.Get(), message.data(), message.size(), MSG_NOSIGNAL) >= 0;
        // A scheduler with so many messages to read will look for changes anyway.
        return sent || errno == EAGAIN ? 0 : errno;
    }

    std::mutex mutex;
    FileDescriptor socket;
    std::string connectedTo;
};

}  // namespace

bool SchedulerLink::IsAlive() {
    const FileDescriptor file(::open(ResolvePath(kLockFile).c_str(), O_RDONLY | O_CLOEXEC));
    return file.IsOpen() && ::flock(file.Get(), LOCK_SH | LOCK_NB) != 0 && errno == EWOULDBLOCK;
}

void SchedulerLink::Wake() {
    // Never destroyed: threads may still save tasks while the program ends.
    static auto& line = *new WakeLine;
    const std::optional<sockaddr_un> address = SchedulerAddress();
    if (!address) {
        return;
    }
    if (const int error = line.Call(*address); error != 0 && !NobodyListens(error)) {
        syslog(LOG_WARNING, "cannot wake the scheduler at %s: %s", address->sun_path,
               std::strerror(error));
    }
}

std::optional<std::string> SchedulerLink::Stop(std::int64_t run) {
    const std::string nobody = "no scheduler is running";
    const std::optional<sockaddr_un> address = SchedulerAddress();
    if (!address) {
        return nobody;
    }
    const FileDescriptor socket = OpenSocket();
    // A name of the kernel's choosing, for the answer to come to.
    sockaddr_un own{};
    own.sun_family = AF_UNIX;
    if (!socket.IsOpen() ||
        ::bind(socket.Get(), reinterpret_cast<const sockaddr*>(&own), sizeof own.sun_family) != 0) {
        return std::string("cannot ask the scheduler: ") + std::strerror(errno);
    }
    if (!Send(socket, *address, kStopMessage + std::to_string(run))) {
        return NobodyListens(errno)
                   ? nobody
                   : std::string("cannot ask the scheduler: ") + std::strerror(errno);
    }
    pollfd watched{socket.Get(), POLLIN, 0};
    for (int second = 0; ::poll(&watched, 1, kMillisecondsPerLook) <= 0; ++second) {
        if (!IsAlive()) {
            return nobody;
        }
        if (second == kAnswerSeconds) {
            return "the scheduler does not answer";
        }
    }
    char answer[kLongestMessage];
    const ssize_t length = ::recv(socket.Get(), answer, sizeof answer, 0);
    if (length < 0) {
        return std::string("no answer of the scheduler: ") + std::strerror(errno);
    }
    if (length == 0) {
        return std::nullopt;
    }
    return std::string(answer, static_cast<std::size_t>(length));
}

}  // namespace orva
