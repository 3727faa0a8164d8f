#include "appliance/store/DatabaseFile.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <thread>

#include "appliance/root/Root.h"
#include "appliance/store/StoreFailure.h"

namespace orva {
namespace {

constexpr mode_t kFileMode = 0660;
constexpr mode_t kDirectoryMode = 0770;
constexpr mode_t kParentMode = 0755;
constexpr std::chrono::milliseconds kLockRetry{5};

[[noreturn]] void FailBySystem(const std::string& doing, const char* file = __builtin_FILE(),
                               int line = __builtin_LINE()) {
    const int error = errno;
    const bool noSpace = error == ENOSPC || error == EDQUOT || error == EROFS;
    throw StoreFailure(noSpace ? kErrDatabaseFull : kErrDatabase,
                       doing + ": " + std::strerror(error), file, line);
}

std::string DirectoryOf(const std::string& file) {
    return std::filesystem::path(file).parent_path().string();
}

}  // namespace

void CreateDatabaseDirectory(const std::string& file) {
    const std::string directory = DirectoryOf(file);
    struct stat status {};
    if (::stat(directory.c_str(), &status) == 0) {
        return;
    }
    // A root that does not exist is a mistyped one; a tree grown there would hide that.
    if (::stat(Root().c_str(), &status) != 0) {
        FailBySystem("root " + Root());
    }
    std::filesystem::path made;
    for (const std::filesystem::path& part : std::filesystem::path(directory)) {
        made /= part;
        if (::stat(made.c_str(), &status) != 0 && ::mkdir(made.c_str(), kParentMode) != 0 &&
            errno != EEXIST) {
            FailBySystem("cannot create directory " + made.string());
        }
    }
    // Whatever the process's mask is: all who may use the database create log files beside it.
    if (::chmod(directory.c_str(), kDirectoryMode) != 0) {
        FailBySystem("cannot set the mode of " + directory);
    }
}

void CreateDatabaseFile(const std::string& file) {
    const FileDescriptor created(
        ::open(file.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, kFileMode));
    if (!created.IsOpen()) {
        if (errno == EEXIST) {
            return;
        }
        FailBySystem("cannot be created");
    }
    // Likewise: server and scheduler share the file through its group. SQLite gives its log files
    // the same mode.
    if (::fchmod(created.Get(), kFileMode) != 0) {
        FailBySystem("cannot set its mode");
    }
}

void CheckDatabaseFile(const std::string& file) {
    struct stat status {};
    if (::stat(file.c_str(), &status) != 0) {
        FailBySystem("cannot be found");
    }
    if (!S_ISREG(status.st_mode)) {
        throw StoreFailure(kErrDatabase, "is no regular file");
    }
    if (::faccessat(AT_FDCWD, file.c_str(), R_OK | W_OK, AT_EACCESS) != 0) {
        FailBySystem("cannot be written to");
    }
}

FileDescriptor OpenDatabaseDirectory(const std::string& file) {
    FileDescriptor directory(::open(DirectoryOf(file).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!directory.IsOpen()) {
        FailBySystem("cannot open its directory");
    }
    return directory;
}

FileDescriptor LockDatabaseDirectory(const std::string& file, std::chrono::milliseconds timeout) {
    FileDescriptor directory = OpenDatabaseDirectory(file);
    const auto deadline = std::chrono::steady_clock::now() + timeout;
    while (::flock(directory.Get(), LOCK_EX | LOCK_NB) != 0) {
        if (errno != EWOULDBLOCK && errno != EINTR) {
            FailBySystem("cannot lock its directory");
        }
        if (std::chrono::steady_clock::now() >= deadline) {
            throw StoreFailure(kErrDatabaseBusy, "is being set up by another process");
        }
        std::this_thread::sleep_for(kLockRetry);
    }
    return directory;
}

}  // namespace orva
