#include "appliance/util/AtomicFile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "appliance/util/Error.h"
#include "appliance/util/FileDescriptor.h"

namespace orva {
namespace {

int WriteAll(int file, std::string_view content) {
    while (!content.empty()) {
        const ssize_t written = ::write(file, content.data(), content.size());
        if (written < 0) {
            if (errno == EINTR) {
                continue;
            }
            return errno;
        }
        content.remove_prefix(static_cast<std::size_t>(written));
    }
    return 0;
}

// Gives the file at `temporary` the content, durably, with mode and owner of the one at `path`. 0
// or the errno.
int Prepare(const std::string& path, const std::string& temporary, std::string_view content) {
    constexpr mode_t kNewMode = 0644;
    // What a crash left there may belong to an account that lets nobody else write to it.
    ::unlink(temporary.c_str());
    const FileDescriptor file(
        ::open(temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kNewMode));
    if (!file.IsOpen()) {
        return errno;
    }
    struct stat former {};
    if (::stat(path.c_str(), &former) == 0) {
        // Only root can keep a stranger's ownership; for anybody else the file becomes their own.
        if (::fchown(file.Get(), former.st_uid, former.st_gid) != 0 && errno != EPERM) {
            return errno;
        }
        if (::fchmod(file.Get(), former.st_mode & 0777) != 0) {
            return errno;
        }
    }
    if (const int error = WriteAll(file.Get(), content)) {
        return error;
    }
    return ::fsync(file.Get()) == 0 ? 0 : errno;
}

int Failed(int error) {
    Fail(kErrSystem);
    errno = error;
    return -1;
}

}  // namespace

int WriteFileAtomically(const std::string& path, std::string_view content) {
    const std::string temporary = path + ".new";
    int error = Prepare(path, temporary, content);
    if (error == 0 && ::rename(temporary.c_str(), path.c_str()) != 0) {
        error = errno;
    }
    if (error != 0) {
        ::unlink(temporary.c_str());
        return Failed(error);
    }
    const std::string::size_type slash = path.rfind('/');
    const std::string directory = slash == std::string::npos ? "." : path.substr(0, slash + 1);
    const FileDescriptor folder(::open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!folder.IsOpen() || ::fsync(folder.Get()) != 0) {
        return Failed(errno);
    }
    return 0;
}

}  // namespace orva
