#include "appliance/share/RecycleBin.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "appliance/util/Error.h"
#include "appliance/util/FileDescriptor.h"

namespace orva {
namespace {

constexpr const char* kFolder = ".recycle";
constexpr int kOpenFolder = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;

ErrorCode CodeOf(int error) {
    if (error == ENOENT) {
        return kErrNotFound;
    }
    return error == ELOOP || error == ENOTDIR ? kErrNotAllowed : kErrSystem;
}

}  // namespace

int MakeRecycleBin(const std::string& directory) {
    const FileDescriptor share(::open(directory.c_str(), kOpenFolder));
    if (!share.IsOpen()) {
        return Fail(CodeOf(errno));
    }
    struct stat status {};
    if (::fstat(share.Get(), &status) != 0) {
        return Fail(kErrSystem);
    }
    // Closed to everybody else from its first moment; the share's group is let in below.
    const bool isNew = ::mkdirat(share.Get(), kFolder, 0700) == 0;
    if (!isNew && errno != EEXIST) {
        return Fail(CodeOf(errno));
    }
    const FileDescriptor bin(::openat(share.Get(), kFolder, kOpenFolder));
    if (!bin.IsOpen()) {
        return Fail(CodeOf(errno));
    }
    if (isNew) {
        // An ordinary user cannot give a folder away and need not: it is their own appliance.
        if (::fchown(bin.Get(), status.st_uid, status.st_gid) != 0 && errno != EPERM) {
            return Fail(kErrSystem);
        }
        const mode_t mode = 0700 | (status.st_mode & (S_ISGID | 0770));
        if (::fchmod(bin.Get(), mode) != 0 || ::fsync(share.Get()) != 0) {
            return Fail(kErrSystem);
        }
    }
    return 0;
}

}  // namespace orva
