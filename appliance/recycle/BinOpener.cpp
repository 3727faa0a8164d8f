#include "appliance/recycle/BinOpener.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cerrno>
#include <cstring>
#include <utility>

#include "appliance/recycle/DirectoryTree.h"

namespace orva {
namespace {

BinOpening Refuse(const std::string& what, int error) {
    BinOpening refused;
    refused.problem = what + ": " + std::strerror(error);
    return refused;
}

int Lock(int fd, int operation, const std::function<void()>& waiting) {
    if (::flock(fd, operation | LOCK_NB) == 0) {
        return 0;
    }
    if (errno == EWOULDBLOCK) {
        waiting();
        while (::flock(fd, operation) != 0) {
            if (errno != EINTR) {
                return errno;
            }
        }
        return 0;
    }
    return errno;
}

}  // namespace

BinOpening OpenAndLockBin(const std::string& directory, bool preview,
                          const std::function<void()>& waiting) {
    OpenBin opened;
    opened.share = FileDescriptor(OpenDirectoryAt(AT_FDCWD, directory.c_str()));
    if (!opened.share.IsOpen()) {
        const int error = errno;
        const bool link = error == ENOTDIR || error == ELOOP;
        BinOpening refused = Refuse(
            link ? "the share's folder is a link or no folder" : "cannot open the share's folder",
            error);
        refused.noFolder = error == ENOENT;
        return refused;
    }
    for (;;) {
        opened.bin = FileDescriptor(OpenDirectoryAt(opened.share.Get(), kBinFolder));
        if (!opened.bin.IsOpen()) {
            const int error = errno;
            const bool link = error == ENOTDIR || error == ELOOP;
            BinOpening refused = Refuse(
                link ? "the recycle bin is a link or no folder" : "cannot open the recycle bin",
                error);
            refused.noBin = error == ENOENT;
            return refused;
        }
        const int error = Lock(opened.bin.Get(), preview ? LOCK_SH : LOCK_EX, waiting);
        if (error != 0) {
            return Refuse("cannot lock the recycle bin", error);
        }
        // While we waited the folder may have been replaced; its lock would hold nobody then.
        FileInfo named;
        const int readError = ReadFileInfo(opened.bin.Get(), "", opened.info);
        if (readError != 0) {
            return Refuse("cannot read the recycle bin", readError);
        }
        if (ReadFileInfo(opened.share.Get(), kBinFolder, named) == 0 &&
            named.inode == opened.info.inode && named.device == opened.info.device) {
            break;
        }
    }
    BinOpening opening;
    opening.bin = std::move(opened);
    return opening;
}

}  // namespace orva
