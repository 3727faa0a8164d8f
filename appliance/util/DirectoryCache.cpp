#include "appliance/util/DirectoryCache.h"

#include <dirent.h>
#include <sys/stat.h>
#include <syslog.h>

#include <algorithm>
#include <cerrno>
#include <system_error>
#include <utility>

namespace orva {
namespace {

struct DirectoryCloser {
    void operator()(DIR* directory) const { ::closedir(directory); }
};

// `mayBeLink` is set where the answer is another place's, and left alone otherwise.
bool IsFolder(DIR* directory, const dirent& entry, bool& mayBeLink) {
    if (entry.d_type == DT_DIR) {
        return true;
    }
    if (entry.d_type != DT_LNK && entry.d_type != DT_UNKNOWN) {
        return false;
    }
    mayBeLink = true;
    struct stat status {};
    return ::fstatat(::dirfd(directory), entry.d_name, &status, 0) == 0 && S_ISDIR(status.st_mode);
}

// ListFolders that also tells whether the names depend on what links lead to.
int ReadFolders(const std::string& directory, std::vector<std::string>& names, bool& hasLinks) {
    names.clear();
    hasLinks = false;
    const std::unique_ptr<DIR, DirectoryCloser> opened(::opendir(directory.c_str()));
    if (opened == nullptr) {
        return errno;
    }
    while (true) {
        errno = 0;
        const dirent* entry = ::readdir(opened.get());
        if (entry == nullptr) {
            break;
        }
        if (entry->d_name[0] != '.' && IsFolder(opened.get(), *entry, hasLinks)) {
            names.emplace_back(entry->d_name);
        }
    }
    if (errno != 0) {
        return errno;
    }
    std::sort(names.begin(), names.end());
    return 0;
}

}  // namespace

int ListFolders(const std::string& directory, std::vector<std::string>& names) {
    bool hasLinks = false;
    return ReadFolders(directory, names, hasLinks);
}

std::shared_ptr<const std::vector<std::string>> DirectoryCache::Get(const std::string& directory) {
    int error = 0;
    return Get(directory, error);
}

std::shared_ptr<const std::vector<std::string>> DirectoryCache::Get(const std::string& directory,
                                                                    int& error) {
    FileIdentity now;
    error = GetFileIdentity(directory, now);
    const std::lock_guard lock(mutex);
    if (error == 0 && folders != nullptr && settled && path == directory && identity == now) {
        return folders;
    }
    if (path != directory) {
        loggedError = 0;
    }
    std::vector<std::string> names;
    bool hasLinks = false;
    // The identity was taken before the names: a change in between makes it the older one's, and
    // the next call reads again.
    if (error == 0) {
        error = ReadFolders(directory, names, hasLinks);
    }
    if (error != 0 && error != ENOENT && error != loggedError) {
        ::syslog(LOG_ERR, "%s: %s", directory.c_str(),
                 std::generic_category().message(error).c_str());
    }
    loggedError = error;
    path = directory;
    identity = now;
    settled = error == 0 && !hasLinks && now.IsSettled();
    if (folders == nullptr || *folders != names) {
        folders = std::make_shared<const std::vector<std::string>>(std::move(names));
    }
    return folders;
}

}  // namespace orva
