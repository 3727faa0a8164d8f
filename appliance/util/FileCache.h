#pragma once

#include <fcntl.h>
#include <syslog.h>

#include <cerrno>
#include <cstddef>
#include <functional>
#include <list>
#include <memory>
#include <mutex>
#include <string>
#include <system_error>
#include <unordered_map>
#include <utility>

#include "appliance/util/FileRead.h"

namespace orva {

struct FileCacheLimits {
    std::size_t files;       // how many are remembered, missing ones too; at least 1
    std::size_t totalBytes;  // how much the remembered ones hold together, as files
    std::size_t fileBytes;   // a larger file counts as one that cannot be read
};

// Parsed files, each parsed once per version of it and shared by everybody who asks while it stays
// the same. A changed file is seen by the next Get. Beyond its limits the cache forgets the file
// that was asked for least recently.
//
// A file that cannot be read is logged once for each reason, not at each Get; one that does not
// exist only where `logMissing` asks for it. What a file holds is for the parse function to log: it
// runs once per version.
//
// Threads: any. Readers of different files do not wait for one another's parsing.
template <class Parsed>
class FileCache {
  public:
    // Makes of a file's bytes what callers get; may log, should not throw.
    using Parse = std::function<Parsed(const std::string& content, const std::string& path)>;

    FileCache(const FileCacheLimits& maxima, bool logMissing, Parse parse)
        : limits(maxima), logsMissing(logMissing), parser(std::move(parse)) {}

    // The parsed file at `path`; null when it does not exist or cannot be read.
    std::shared_ptr<const Parsed> Get(const std::string& path) {
        return Get(path, AT_FDCWD, path.c_str());
    }

    // The same for a file that is found as `place` from the open directory `folder` too. Looks
    // whether it has changed come cheaper from there.
    std::shared_ptr<const Parsed> Get(const std::string& path, int folder, const char* place) {
        const std::shared_ptr<Entry> entry = EntryOf(path);
        FileIdentity identity;
        const int error = GetFileIdentityFrom(folder, place, identity);
        const std::lock_guard lock(entry->mutex);
        if (error != 0) {
            return Forget(*entry, path, error);
        }
        // An identity taken before another thread read a newer version only costs one more read.
        if (entry->value == nullptr || identity != entry->identity || !entry->settled) {
            Read(*entry, path);
        }
        return entry->value;
    }

    // How many files are remembered now, for tests and for reports on memory.
    std::size_t Size() const {
        const std::lock_guard lock(mutex);
        return entries.size();
    }

  private:
    struct Entry {
        std::mutex mutex;
        std::shared_ptr<const Parsed> value;
        FileIdentity identity;
        bool settled = false;
        // Kept until the identity is settled: it tells an unchanged file from one that changed
        // within the same step of the file system's clock.
        std::string content;
        int loggedError = 0;
        std::size_t bytes = 0;  // what it adds to `total`; guarded by the cache's mutex
    };
    using Recent = std::list<std::pair<std::string, std::shared_ptr<Entry>>>;

    std::shared_ptr<Entry> EntryOf(const std::string& path) {
        const std::lock_guard lock(mutex);
        if (const auto found = entries.find(path); found != entries.end()) {
            recent.splice(recent.begin(), recent, found->second);
            return found->second->second;
        }
        recent.emplace_front(path, std::make_shared<Entry>());
        entries.emplace(path, recent.begin());
        ForgetOldest();
        return recent.front().second;
    }

    // Takes note that the file of `entry` has `bytes` bytes now.
    void Weigh(Entry& entry, const std::string& path, std::size_t bytes) {
        const std::lock_guard lock(mutex);
        const auto found = entries.find(path);
        if (found == entries.end() || found->second->second.get() != &entry) {
            return;  // forgotten while it was read
        }
        total = total - entry.bytes + bytes;
        entry.bytes = bytes;
        ForgetOldest();
    }

    // The cache's mutex is held.
    void ForgetOldest() {
        while (entries.size() > limits.files || total > limits.totalBytes) {
            total -= recent.back().second->bytes;
            entries.erase(recent.back().first);
            recent.pop_back();
        }
    }

    void Read(Entry& entry, const std::string& path) {
        std::string content;
        FileIdentity identity;
        if (const int error = ReadFile(path, limits.fileBytes, content, identity)) {
            Forget(entry, path, error);
            return;
        }
        entry.loggedError = 0;
        const bool same = entry.value != nullptr && identity == entry.identity &&
                          (entry.settled || content == entry.content);
        if (!same) {
            entry.value = std::make_shared<const Parsed>(parser(content, path));
            entry.identity = identity;
        }
        entry.settled = identity.IsSettled();
        Weigh(entry, path, content.size());
        entry.content = entry.settled ? std::string() : std::move(content);
    }

    std::shared_ptr<const Parsed> Forget(Entry& entry, const std::string& path, int error) {
        entry.value = nullptr;
        entry.content = std::string();
        Weigh(entry, path, 0);
        const bool missing = error == ENOENT || error == ENOTDIR;
        if (error != entry.loggedError && (logsMissing || !missing)) {
            ::syslog(LOG_ERR, "%s: %s", path.c_str(),
                     std::generic_category().message(error).c_str());
        }
        entry.loggedError = error;
        return nullptr;
    }

    const FileCacheLimits limits;
    const bool logsMissing;
    const Parse parser;

    mutable std::mutex mutex;
    Recent recent;  // the one asked for last comes first
    std::size_t total = 0;
    std::unordered_map<std::string, typename Recent::iterator> entries;
};

}  // namespace orva
