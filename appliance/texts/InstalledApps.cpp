#include "appliance/texts/InstalledApps.h"

#include <syslog.h>

#include <algorithm>
#include <cstddef>
#include <mutex>
#include <string_view>
#include <unordered_map>
#include <utility>

#include "appliance/util/DirectoryCache.h"
#include "appliance/util/FileCache.h"
#include "appliance/util/StrictJson.h"

namespace orva {
namespace {

using Description = std::optional<AppDescription>;

constexpr FileCacheLimits kLimits{.files = 512, .totalBytes = 4 << 20, .fileBytes = 64 << 10};

// Whether `path` stays below the folder that it starts from.
bool LeadsDown(std::string_view path) {
    if (path.empty() || path.front() == '/') {
        return false;
    }
    while (!path.empty()) {
        const std::size_t end = std::min(path.find('/'), path.size());
        if (path.substr(0, end) == "..") {
            return false;
        }
        path.remove_prefix(std::min(end + 1, path.size()));
    }
    return true;
}

const Json::Value* FindText(const Json::Value& object, std::string_view name) {
    const Json::Value* value = object.find(name.data(), name.data() + name.size());
    return value != nullptr && value->isString() ? value : nullptr;
}

Description ParseAndLog(const std::string& content, const std::string& path) {
    std::string error;
    Description description = ParseAppDescription(content, error);
    if (!description) {
        ::syslog(LOG_ERR, "%s: %s", path.c_str(), error.c_str());
    }
    return description;
}

// The applications that `descriptions` (one for each of `folders`, null for a missing one) yield.
std::vector<InstalledApp> Choose(const std::string& directory,
                                 const std::vector<std::string>& folders,
                                 const std::vector<std::shared_ptr<const Description>>& found) {
    std::vector<InstalledApp> apps;
    std::unordered_map<std::string, std::size_t> placeOfId;
    for (std::size_t i = 0; i < folders.size(); ++i) {
        if (found[i] == nullptr || !found[i]->has_value()) {
            continue;
        }
        const AppDescription& description = **found[i];
        const auto [place, isNew] = placeOfId.emplace(description.id, apps.size());
        if (!isNew) {
            ::syslog(LOG_ERR, "%s/%s/app.json: the id \"%s\" belongs to \"%s\" already",
                     directory.c_str(), folders[i].c_str(), description.id.c_str(),
                     apps[place->second].folder.c_str());
            continue;
        }
        apps.push_back({folders[i], description});
    }
    return apps;
}

// The last answer, with what it was made of.
struct Snapshot {
    std::mutex mutex;
    DirectoryCache directories;
    std::string directory;
    std::shared_ptr<const std::vector<std::string>> folders;
    std::vector<std::shared_ptr<const Description>> descriptions;
    std::shared_ptr<const std::vector<InstalledApp>> apps;
};

}  // namespace

std::optional<AppDescription> ParseAppDescription(const std::string& content, std::string& error) {
    const std::optional<Json::Value> document = ParseStrictObject(content, error);
    if (!document) {
        return std::nullopt;
    }
    const Json::Value* id = FindText(*document, "id");
    if (id == nullptr || id->asString().empty()) {
        error = "\"id\" is no text, or empty";
        return std::nullopt;
    }
    const Json::Value* texts = FindText(*document, "texts");
    if (texts == nullptr || !LeadsDown(texts->asString())) {
        error = "\"texts\" is no directory below the application's own";
        return std::nullopt;
    }
    return AppDescription{id->asString(), texts->asString()};
}

std::shared_ptr<const std::vector<InstalledApp>> FindInstalledApps(const std::string& directory) {
    static FileCache<Description> cache(kLimits, true, ParseAndLog);
    static Snapshot snapshot;

    auto folders = snapshot.directories.Get(directory);
    std::vector<std::shared_ptr<const Description>> descriptions;
    descriptions.reserve(folders->size());
    for (const std::string& folder : *folders) {
        std::string file = directory;
        file.append("/").append(folder).append("/app.json");
        descriptions.push_back(cache.Get(file));
    }
    const std::lock_guard lock(snapshot.mutex);
    // Shared descriptions stay alive here, so an equal pointer is the same version of the file.
    if (snapshot.apps == nullptr || snapshot.directory != directory ||
        snapshot.folders != folders || snapshot.descriptions != descriptions) {
        snapshot.apps = std::make_shared<const std::vector<InstalledApp>>(
            Choose(directory, *folders, descriptions));
        snapshot.directory = directory;
        snapshot.folders = std::move(folders);
        snapshot.descriptions = std::move(descriptions);
    }
    return snapshot.apps;
}

}  // namespace orva
