#include "appliance/share/ShareRegistry.h"

#include <fcntl.h>
#include <json/writer.h>
#include <sys/file.h>
#include <syslog.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <filesystem>
#include <string_view>
#include <system_error>
#include <thread>
#include <utility>

#include "appliance/root/Root.h"
#include "appliance/share/RecycleBin.h"
#include "appliance/util/AtomicFile.h"
#include "appliance/util/Error.h"
#include "appliance/util/FileDescriptor.h"
#include "appliance/util/FileRead.h"
#include "appliance/util/Name.h"
#include "appliance/util/StrictJson.h"
#include "appliance/util/Utf8.h"

namespace orva {
namespace {

constexpr const char* kRegistryFile = "/usr/orva/etc/shares.json";
constexpr std::size_t kMaxBytes = 16 << 20;

constexpr const char* kShares = "shares";
constexpr const char* kName = "name";
constexpr const char* kPath = "path";
constexpr const char* kKind = "kind";
constexpr const char* kRecycleBin = "recycle_bin";

bool IsAppliancePath(std::string_view path) {
    if (path.empty() || path.front() != '/' || path.find('\0') != std::string_view::npos ||
        ValidUtf8Length(path) != path.size()) {
        return false;
    }
    return (std::string(path) + "/").find("/../") == std::string::npos;
}

bool IsKind(int kind) { return kind != 0 && (kind & ~kAllShareKinds) == 0; }

bool IsShare(const Json::Value& entry) {
    return entry.isObject() && entry[kName].isString() && IsSafeName(entry[kName].asString()) &&
           entry[kPath].isString() && IsAppliancePath(entry[kPath].asString()) &&
           entry[kKind].isInt() && IsKind(entry[kKind].asInt()) && entry[kRecycleBin].isBool();
}

// What keeps `document` from being a registry; empty when nothing does.
std::string FindFault(const Json::Value& document) {
    if (!document.isObject() || !document[kShares].isArray()) {
        return "no object with an array \"shares\"";
    }
    std::vector<std::string> names;
    for (const Json::Value& entry : document[kShares]) {
        if (!IsShare(entry)) {
            return "element " + std::to_string(names.size()) + " of \"shares\" is no share";
        }
        names.push_back(entry[kName].asString());
    }
    std::sort(names.begin(), names.end());
    const auto twice = std::adjacent_find(names.begin(), names.end());
    return twice == names.end() ? std::string() : "two shares named \"" + *twice + "\"";
}

void LogFault(const std::string& path, const char* what, int error) {
    ::syslog(LOG_ERR, "%s: %s: %s", path.c_str(), what,
             std::generic_category().message(error).c_str());
}

// The registry's document, empty one for a missing file.
std::optional<Json::Value> Load(const std::string& path) {
    std::string content;
    FileIdentity identity;
    if (const int error = ReadFile(path, kMaxBytes, content, identity)) {
        if (error == ENOENT) {
            Json::Value empty(Json::objectValue);
            empty[kShares] = Json::Value(Json::arrayValue);
            return empty;
        }
        LogFault(path, "cannot be read", error);
        Fail(kErrSystem);
        return std::nullopt;
    }
    std::string fault;
    std::optional<Json::Value> document = ParseStrictJson(content, fault);
    if (document) {
        fault = FindFault(std::as_const(*document));
    }
    if (!document || !fault.empty()) {
        ::syslog(LOG_ERR, "%s: %s", path.c_str(), fault.c_str());
        Fail(kErrBadDocument);
        return std::nullopt;
    }
    return document;
}

Share ToShare(const Json::Value& entry) {
    return {entry[kName].asString(), entry[kPath].asString(), entry[kKind].asInt(),
            entry[kRecycleBin].asBool()};
}

// The entry of share `name` in the registry's document; null when there is none.
Json::Value* FindEntry(Json::Value& document, const std::string& name) {
    for (Json::Value& entry : document[kShares]) {
        if (entry[kName].asString() == name) {
            return &entry;
        }
    }
    return nullptr;
}

int Store(const std::string& path, const Json::Value& document) {
    Json::StreamWriterBuilder writer;
    writer["indentation"] = "  ";
    writer["emitUTF8"] = true;
    if (WriteFileAtomically(path, Json::writeString(writer, document) + "\n") != 0) {
        LogFault(path, "cannot be written", errno);
        return -1;
    }
    return 0;
}

// Locks the registry's folder: the registry itself is replaced, so a lock on it would hold nobody,
// and a file for the lock would belong to whichever account comes first and keep the others out.
FileDescriptor Lock(const std::string& path, std::chrono::milliseconds longestWait) {
    constexpr std::chrono::milliseconds kRetry(2);
    FileDescriptor folder(::open(std::filesystem::path(path).parent_path().c_str(),
                                 O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!folder.IsOpen()) {
        LogFault(path, "cannot be locked", errno);
        Fail(kErrSystem);
        return {};
    }
    const auto deadline = std::chrono::steady_clock::now() + longestWait;
    while (::flock(folder.Get(), LOCK_EX | LOCK_NB) != 0) {
        if (errno != EWOULDBLOCK && errno != EINTR) {
            LogFault(path, "cannot be locked", errno);
            Fail(kErrSystem);
            return {};
        }
        if (std::chrono::steady_clock::now() >= deadline) {
            ::syslog(LOG_ERR, "%s: cannot be locked: another change of it takes too long",
                     path.c_str());
            Fail(kErrSystem);
            return {};
        }
        std::this_thread::sleep_for(kRetry);
    }
    return folder;
}

// The registry for a change; keeps other writers away while it lives.
struct LockedRegistry {
    std::string path;
    FileDescriptor lock;
    Json::Value document;
};

std::optional<LockedRegistry> LoadLocked(std::chrono::milliseconds longestWait) {
    std::string path = ResolvePath(kRegistryFile);
    FileDescriptor lock = Lock(path, longestWait);
    if (!lock.IsOpen()) {
        return std::nullopt;
    }
    std::optional<Json::Value> document = Load(path);
    if (!document) {
        return std::nullopt;
    }
    return LockedRegistry{std::move(path), std::move(lock), std::move(*document)};
}

}  // namespace

std::optional<std::vector<Share>> ShareRegistry::List() const {
    const std::optional<Json::Value> document = Load(ResolvePath(kRegistryFile));
    if (!document) {
        return std::nullopt;
    }
    std::vector<Share> shares;
    shares.reserve((*document)[kShares].size());
    for (const Json::Value& entry : (*document)[kShares]) {
        shares.push_back(ToShare(entry));
    }
    std::sort(shares.begin(), shares.end(),
              [](const Share& left, const Share& right) { return left.name < right.name; });
    return shares;
}

std::optional<Share> ShareRegistry::Find(const std::string& name) const {
    std::optional<Json::Value> document = Load(ResolvePath(kRegistryFile));
    if (!document) {
        return std::nullopt;
    }
    const Json::Value* entry = FindEntry(*document, name);
    if (entry == nullptr) {
        Fail(kErrNotFound);
        return std::nullopt;
    }
    return ToShare(*entry);
}

int ShareRegistry::Add(const Share& share) const {
    if (!IsSafeName(share.name) || !IsAppliancePath(share.path) || !IsKind(share.kind)) {
        return Fail(kErrBadArgument);
    }
    std::optional<LockedRegistry> registry = LoadLocked(longestWait);
    if (!registry) {
        return -1;
    }
    if (FindEntry(registry->document, share.name) != nullptr) {
        return Fail(kErrNotAllowed);
    }
    Json::Value entry(Json::objectValue);
    entry[kName] = share.name;
    entry[kPath] = share.path;
    entry[kKind] = share.kind;
    entry[kRecycleBin] = share.recycleBin;
    registry->document[kShares].append(std::move(entry));
    return Store(registry->path, registry->document);
}

int ShareRegistry::SetRecycle(const std::string& name, bool enabled) const {
    std::optional<LockedRegistry> registry = LoadLocked(longestWait);
    if (!registry) {
        return -1;
    }
    Json::Value* entry = FindEntry(registry->document, name);
    if (entry == nullptr) {
        return Fail(kErrNotFound);
    }
    // The folder first: a bin that is said to be on must be there.
    if (enabled && MakeRecycleBin(ResolvePath((*entry)[kPath].asString())) != 0) {
        return -1;
    }
    if ((*entry)[kRecycleBin].asBool() == enabled) {
        return 0;
    }
    (*entry)[kRecycleBin] = enabled;
    return Store(registry->path, registry->document);
}

}  // namespace orva
