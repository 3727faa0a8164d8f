#include <fcntl.h>
#include <syslog.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <iterator>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "appliance/package/PackageFile.h"
#include "appliance/root/Root.h"
#include "appliance/util/DirectoryCache.h"
#include "appliance/util/Error.h"
#include "appliance/util/FileCache.h"
#include "appliance/util/FileDescriptor.h"
#include "appliance/util/Name.h"
#include "platform/package.h"

namespace ORVAPackageTool {
namespace {

constexpr std::string_view kDescription = "/package.json";
// More than any appliance has installed; a parsed description takes some hundred bytes.
constexpr orva::FileCacheLimits kLimits{
    .files = 8192, .totalBytes = 64 << 20, .fileBytes = 1 << 20};

std::optional<PackageInfo> ParseAndLog(const std::string& content, const std::string& path) {
    std::string error;
    std::optional<PackageInfo> info = orva::ParsePackageFile(content, error);
    if (!info) {
        ::syslog(LOG_ERR, "%s: %s", path.c_str(), error.c_str());
    }
    return info;
}

}  // namespace

// The directory of installed packages as init() found it.
struct PackageManager::Directory {
    std::string path;
    orva::FileDescriptor descriptor;
};

bool PackageManager::init() {
    static orva::DirectoryCache folders;
    ids.clear();
    directory = nullptr;
    const std::string path = orva::ResolvePath(orva::kPackages);
    int error = 0;
    const auto names = folders.Get(path, error);
    if (error == ENOENT) {
        return true;
    }
    if (error != 0) {
        orva::Fail(orva::kErrSystem);
        return false;
    }
    std::copy_if(names->begin(), names->end(), std::back_inserter(ids), orva::IsSafeName);
    orva::FileDescriptor opened(::open(path.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (opened.IsOpen()) {
        directory = std::make_shared<const Directory>(Directory{path, std::move(opened)});
    }
    return true;
}

std::list<std::string> PackageManager::enumPackages(const PackageFilter* /*filter*/) const {
    return ids;
}

bool PackageManager::getPackageInfo(const std::string& id, PackageInfo& info,
                                    const PackageQuery* /*query*/) const {
    static orva::FileCache<std::optional<PackageInfo>> cache(kLimits, true, ParseAndLog);
    if (!orva::IsSafeName(id)) {
        orva::Fail(orva::kErrBadArgument);
        return false;
    }
    std::string path = directory != nullptr ? directory->path : orva::ResolvePath(orva::kPackages);
    const std::size_t idAt = path.size() + 1;
    path.reserve(idAt + id.size() + kDescription.size());
    path.append("/").append(id).append(kDescription);
    const auto found = directory != nullptr
                           ? cache.Get(path, directory->descriptor.Get(), path.c_str() + idAt)
                           : cache.Get(path);
    if (found == nullptr) {
        orva::Fail(orva::kErrNotFound);
        return false;
    }
    if (!found->has_value()) {
        orva::Fail(orva::kErrBadDocument);
        return false;
    }
    info = **found;
    return true;
}

}  // namespace ORVAPackageTool
