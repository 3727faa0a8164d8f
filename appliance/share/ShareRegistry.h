#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <vector>

namespace orva {

// A shared folder of the appliance.
struct Share {
    std::string name;
    std::string path;  // absolute path of the appliance, "/volume1/photo"
    int kind = 0;      // one or more bits of kAllShareKinds
    bool recycleBin = false;
};

// Every kind of share that can have a recycle bin.
constexpr int kAllShareKinds = 0x30f;

// The shares of the appliance whose root is current, kept in /usr/orva/etc/shares.json:
// {"shares": [{"name", "path", "kind", "recycle_bin"}]}. A missing file is an empty registry. Each
// call reads the file, so an object never shows old data; what the file holds beyond these members
// survives changes.
//
// Errors: an empty optional or a negative result, with the reason in the last error. A damaged
// registry (kErrBadDocument, with a line in the log) is never written over.
// Threads: any. Changes of several processes, whatever their accounts, take turns by a lock of the
// registry's folder; one that cannot be had in time is kErrSystem, with a line in the log.
class ShareRegistry {
  public:
    explicit ShareRegistry(std::chrono::milliseconds longestWaitForOthers = std::chrono::minutes(1))
        : longestWait(longestWaitForOthers) {}

    // All shares in ascending order of their names' bytes.
    [[nodiscard]] std::optional<std::vector<Share>> List() const;

    // kErrNotFound when there is no such share.
    [[nodiscard]] std::optional<Share> Find(const std::string& name) const;

    // Registers a share, durably; its directory is the caller's to make. kErrBadArgument for an
    // unsafe name (appliance/util/Name.h), a path that is not absolute or leads upwards and a kind
    // outside kAllShareKinds, kErrNotAllowed for a name that is taken.
    [[nodiscard]] int Add(const Share& share) const;

    // Switches a share's recycle bin on or off, durably. On makes the folder ".recycle" in the
    // share's directory where it is missing, for the share's owner and group with no more rights
    // than the share itself gives them; off leaves the folder and what is in it. kErrNotAllowed
    // when a link or a file stands in the folder's place, or when this process may not give the
    // folder to the share's group.
    [[nodiscard]] int SetRecycle(const std::string& name, bool enabled) const;

  private:
    std::chrono::milliseconds longestWait;
};

}  // namespace orva
