#include "appliance/recycle/BinOpener.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <thread>
#include <utility>

#include "appliance/recycle/DirectoryTree.h"

namespace orva {
namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::milliseconds kLockRetry{20};

BinOpening Refuse(const std::string& what, int error) {
    BinOpening refused;
    refused.problem = what + ": " + std::strerror(error);
    return refused;
}

// 0, or the errno: EWOULDBLOCK when others hold it until the deadline.
int Lock(int fd, int operation, Clock::time_point deadline, const std::function<void()>& waiting) {
    bool told = false;
    while (::flock(fd, operation | LOCK_NB) != 0) {
        if (errno == EINTR) {
            continue;
        }
        if (errno != EWOULDBLOCK) {
            return errno;
        }
        if (!told) {
            waiting();
            told = true;
        }
        if (Clock::now() >= deadline) {
            return EWOULDBLOCK;
        }
        std::this_thread::sleep_for(kLockRetry);
    }
    return 0;
}

BinOpening Held(std::chrono::milliseconds patience) {
    const auto seconds = std::chrono::ceil<std::chrono::seconds>(patience).count();
    BinOpening refused;
    refused.problem = "another process has held the recycle bin for " + std::to_string(seconds) +
                      (seconds == 1 ? " second" : " seconds");
    return refused;
}

}  // namespace

BinOpening OpenAndLockBin(const std::string& directory, bool preview,
                          const std::function<void()>& waiting,
                          std::chrono::milliseconds patience) {
    const auto deadline = Clock::now() + patience;
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
        const int error = Lock(opened.bin.Get(), preview ? LOCK_SH : LOCK_EX, deadline, waiting);
        if (error != 0) {
            return error == EWOULDBLOCK ? Held(patience)
                                        : Refuse("cannot lock the recycle bin", error);
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
