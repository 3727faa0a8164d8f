#include "appliance/server/OpenBeneath.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/syscall.h>

#include <cerrno>

namespace orva {
namespace {

constexpr int kFlags = O_RDONLY | O_NONBLOCK | O_CLOEXEC;

}  // namespace

FileDescriptor OpenBeneath(int directory, const std::string& path) {
    open_how how{};
    how.flags = kFlags;
    how.resolve = RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS;
    const long fd = ::syscall(SYS_openat2, directory, path.c_str(), &how, sizeof how);
    // Filters of system calls that do not know this one answer EPERM.
    if (fd < 0 && (errno == ENOSYS || errno == EPERM)) {
        return OpenBeneathByHand(directory, path);
    }
    return FileDescriptor(static_cast<int>(fd));
}

FileDescriptor OpenBeneathByHand(int directory, const std::string& path) {
    FileDescriptor folder;
    std::size_t begin = 0;
    while (true) {
        const std::size_t slash = path.find('/', begin);
        const std::string name = path.substr(begin, slash - begin);
        const bool last = slash == std::string::npos;
        if (name.empty() || name == "." || name == "..") {
            errno = EXDEV;
            return {};
        }
        const int from = folder.IsOpen() ? folder.Get() : directory;
        const int flags = last ? kFlags : O_PATH | O_DIRECTORY | O_CLOEXEC;
        FileDescriptor next(::openat(from, name.c_str(), flags | O_NOFOLLOW));
        if (last || !next.IsOpen()) {
            return next;
        }
        folder = std::move(next);
        begin = slash + 1;
    }
}

}  // namespace orva
