#include <syslog.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <system_error>
#include <vector>

#include "appliance/package/PackageFile.h"
#include "appliance/root/Root.h"
#include "appliance/util/DirectoryCache.h"
#include "appliance/util/Error.h"
#include "appliance/util/FileCache.h"
#include "appliance/util/Name.h"
#include "platform/package.h"

namespace ORVAPackageTool {
namespace {

constexpr const char* kPackages = "/usr/orva/packages";
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

bool PackageManager::init() {
    ids.clear();
    const std::string directory = orva::ResolvePath(kPackages);
    std::vector<std::string> names;
    const int error = orva::ListFolders(directory, names);
    if (error == ENOENT) {
        return true;
    }
    if (error != 0) {
        ::syslog(LOG_ERR, "%s: %s", directory.c_str(),
                 std::generic_category().message(error).c_str());
        orva::Fail(orva::kErrSystem);
        return false;
    }
    std::copy_if(names.begin(), names.end(), std::back_inserter(ids), orva::IsSafeName);
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
    const auto found = cache.Get(orva::ResolvePath(kPackages) + "/" + id + "/package.json");
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
