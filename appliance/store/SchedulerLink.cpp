#include "appliance/store/SchedulerLink.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <syslog.h>

#include <cerrno>
#include <cstring>
#include <string>

#include "appliance/root/Root.h"
#include "appliance/util/FileDescriptor.h"

namespace orva {
bool SchedulerLink::IsAlive() {
    const FileDescriptor file(::open(ResolvePath(kLockFile).c_str(), O_RDONLY | O_CLOEXEC));
    return file.IsOpen() && ::flock(file.Get(), LOCK_SH | LOCK_NB) != 0 && errno == EWOULDBLOCK;
}

void SchedulerLink::Wake() {
    const std::string path = ResolvePath(kSocket);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.size() >= sizeof address.sun_path) {
        // No scheduler can listen there either; it says so when it is started.
        return;
    }
    std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
    const FileDescriptor socket(::socket(AF_UNIX, SOCK_DGRAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0));
    if (!socket.IsOpen()) {
        return;
    }
    const char message = 'w';
    if (::sendto(socket.Get(), &message, sizeof message, MSG_NOSIGNAL,
                 reinterpret_cast<const sockaddr*>(&address), sizeof address) < 0 &&
        errno != ENOENT && errno != ECONNREFUSED && errno != EAGAIN) {
        syslog(LOG_WARNING, "cannot wake the scheduler at %s: %s", path.c_str(),
               std::strerror(errno));
    }
}

}  // namespace orva
