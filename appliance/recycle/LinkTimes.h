#pragma once

#include <cstdint>
#include <functional>
#include <unordered_map>

#include "appliance/recycle/FileInfo.h"

namespace orva {

// Removing one of a file's hard links changes the time of the others. This remembers the time that
// such files had before the clean touched them, so that the age of a link does not depend on
// whether another one went first.
class LinkTimes {
  public:
    // The file's change time as it was before this clean.
    FileTime Changed(const FileInfo& info) const;

    // One link of the file has been removed; `info` describes it as it was before.
    void Removed(const FileInfo& info);

  private:
    struct Key {
        std::uint64_t device;
        std::uint64_t inode;
        bool operator==(const Key&) const = default;
    };
    struct Hash {
        std::size_t operator()(const Key& key) const {
            return std::hash<std::uint64_t>()(key.inode ^ (key.device << 32));
        }
    };

    std::unordered_map<Key, FileTime, Hash> files;
};

}  // namespace orva
