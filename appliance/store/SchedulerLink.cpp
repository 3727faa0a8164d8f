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

// The socket that all wake-up calls of this process are sent from; none when none can be had.
const FileDescriptor* WakeSocket() {
    static std::mutex mutex;
    static FileDescriptor shared;
    const std::lock_guard lock(mutex);
    if (!shared.IsOpen()) {
        shared = OpenSocket();
    }
    return shared.IsOpen() ? &shared : nullptr;
}

bool Send(const FileDescriptor& socket, const sockaddr_un& address, std::string_view message) {
    return ::sendto(socket.Get(), message.data(), message.size(), MSG_NOSIGNAL,
                    reinterpret_cast<const sockaddr*>(&address), sizeof address) >= 0;
}

bool NobodyListens(int error) { return error == ENOENT || error == ECONNREFUSED; }

}  // namespace

bool SchedulerLink::IsAlive() {
    const FileDescriptor file(::open(ResolvePath(kLockFile).c_str(), O_RDONLY | O_CLOEXEC));
    return file.IsOpen() && ::flock(file.Get(), LOCK_SH | LOCK_NB) != 0 && errno == EWOULDBLOCK;
}

void SchedulerLink::Wake() {
    const std::optional<sockaddr_un> address = SchedulerAddress();
    const FileDescriptor* const socket = WakeSocket();
    if (!address || socket == nullptr) {
        return;
    }
    if (!Send(*socket, *address, kWakeMessage) && !NobodyListens(errno) && errno != EAGAIN) {
        syslog(LOG_WARNING, "cannot wake the scheduler at %s: %s", address->sun_path,
               std::strerror(errno));
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
