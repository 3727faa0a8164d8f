#include "appliance/recycle/LinkTimes.h"

namespace orva {

FileTime LinkTimes::Changed(const FileInfo& info) const {
    if (files.empty()) {
        return info.changed;
    }
    const auto known = files.find({info.device, info.inode});
    return known == files.end() ? info.changed : known->second;
}

void LinkTimes::Removed(const FileInfo& info) {
    const Key key{info.device, info.inode};
    if (info.links > 1) {
        files.try_emplace(key, info.changed);
    } else if (!files.empty()) {
        // The last link: the inode's number may now become another file's.
        files.erase(key);
    }
}

}  // namespace orva
