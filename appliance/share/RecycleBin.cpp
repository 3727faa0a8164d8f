#include "appliance/share/RecycleBin.h"

#include <fcntl.h>
#include <sys/random.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

#include "appliance/util/Error.h"
#include "appliance/util/FileDescriptor.h"

namespace orva {
namespace {

constexpr const char* kFolder = ".recycle";
constexpr std::string_view kUnfinished = ".recycle.new-";
constexpr std::size_t kSuffixLength = 16;
constexpr int kOpenFolder = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;

ErrorCode CodeOf(int error) {
    if (error == ENOENT) {
        return kErrNotFound;
    }
    return error == ELOOP || error == ENOTDIR ? kErrNotAllowed : kErrSystem;
}

// A name that nobody who may write to the share can have taken.
std::string UnfinishedName() {
    std::uint64_t number = 0;
    if (::getrandom(&number, sizeof number, 0) != sizeof number) {
        return {};
    }
    std::array<char, kSuffixLength + 1> digits{};
    std::snprintf(digits.data(), digits.size(), "%016llx", static_cast<unsigned long long>(number));
    return std::string(kUnfinished) + digits.data();
}

bool IsUnfinishedName(std::string_view name) {
    return name.size() == kUnfinished.size() + kSuffixLength &&
           name.substr(0, kUnfinished.size()) == kUnfinished &&
           name.find_first_not_of("0123456789abcdef", kUnfinished.size()) == std::string_view::npos;
}

// Removes the empty folders that makers who were cut off left behind in `directory`, which is open
// as `share`. To be called once the bin is there: a maker at work at the same time then finds it
// when its own folder is gone.
void RemoveUnfinished(int share, const std::string& directory) {
    std::vector<std::string> names;
    std::error_code error;
    std::filesystem::directory_iterator entry(directory, error);
    for (; !error && entry != std::filesystem::directory_iterator(); entry.increment(error)) {
        if (std::string name = entry->path().filename(); IsUnfinishedName(name)) {
            names.push_back(std::move(name));
        }
    }
    for (const std::string& name : names) {
        ::unlinkat(share, name.c_str(), AT_REMOVEDIR);
    }
}

// Gives `folder` the owner and group of its share. An ordinary user cannot give a folder away, but
// to a group of theirs they can; a bin of another owner still serves the share's group, and one of
// another group only where the share lets no group in anyway.
int GiveToShare(int folder, const struct stat& share, const std::string& directory) {
    if (::fchown(folder, share.st_uid, share.st_gid) == 0 ||
        (errno == EPERM && ::fchown(folder, static_cast<uid_t>(-1), share.st_gid) == 0)) {
        return 0;
    }
    if (errno != EPERM) {
        return Fail(kErrSystem);
    }
    struct stat status {};
    if (::fstat(folder, &status) != 0) {
        return Fail(kErrSystem);
    }
    if (status.st_gid != share.st_gid && (share.st_mode & S_IRWXG) != 0) {
        ::syslog(LOG_ERR,
                 "%s: no recycle bin: this account may not give a folder to the share's group %u",
                 directory.c_str(), static_cast<unsigned>(share.st_gid));
        return Fail(kErrNotAllowed);
    }
    return 0;
}

// Makes the folder `name` of the share ready to be seen under its final name.
int Prepare(int shareFolder, const std::string& name, const struct stat& share,
            const std::string& directory) {
    const FileDescriptor folder(::openat(shareFolder, name.c_str(), kOpenFolder));
    if (!folder.IsOpen()) {
        return Fail(CodeOf(errno));
    }
    if (GiveToShare(folder.Get(), share, directory) != 0) {
        return -1;
    }
    const mode_t mode = S_IRWXU | (share.st_mode & (S_ISGID | S_IRWXU | S_IRWXG));
    if (::fchmod(folder.Get(), mode) != 0 || ::fsync(folder.Get()) != 0) {
        return Fail(kErrSystem);
    }
    return 0;
}

// Gives the folder its final name unless something has that name. 0 or the errno.
int Publish(int share, const std::string& name) {
    if (::renameat2(share, name.c_str(), share, kFolder, RENAME_NOREPLACE) == 0) {
        return 0;
    }
    // Not every file system knows the flag; without it at most an empty folder is replaced.
    if (errno == EINVAL || errno == ENOSYS) {
        return ::renameat(share, name.c_str(), share, kFolder) == 0 ? 0 : errno;
    }
    return errno;
}

enum class Place { kBin, kFree, kTaken, kUnknown };

// What stands where the share's bin belongs.
Place LookAtPlace(int share) {
    struct stat status {};
    if (::fstatat(share, kFolder, &status, AT_SYMLINK_NOFOLLOW) != 0) {
        return errno == ENOENT ? Place::kFree : Place::kUnknown;
    }
    return S_ISDIR(status.st_mode) ? Place::kBin : Place::kTaken;
}

// Makes the bin under a name of its own and publishes it when it is complete: whoever sees it, also
// after a crash in between, sees the rights that it is to have.
int Make(int shareFolder, const struct stat& share, const std::string& directory) {
    const std::string name = UnfinishedName();
    if (name.empty() || ::mkdirat(shareFolder, name.c_str(), S_IRWXU) != 0) {
        return Fail(CodeOf(errno));
    }
    int result = Prepare(shareFolder, name, share, directory);
    if (result == 0) {
        if (const int error = Publish(shareFolder, name)) {
            result = Fail(CodeOf(error));
        }
    }
    if (result != 0) {
        ::unlinkat(shareFolder, name.c_str(), AT_REMOVEDIR);
        // Another maker may have been faster.
        return LookAtPlace(shareFolder) == Place::kBin ? 0 : result;
    }
    if (::fsync(shareFolder) != 0) {
        return Fail(kErrSystem);
    }
    RemoveUnfinished(shareFolder, directory);
    return 0;
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
    switch (LookAtPlace(share.Get())) {
        case Place::kBin:
            return 0;
        case Place::kTaken:
            return Fail(kErrNotAllowed);
        case Place::kUnknown:
            return Fail(kErrSystem);
        case Place::kFree:
            break;
    }
    return Make(share.Get(), status, directory);
}

}  // namespace orva
