#pragma once

#include <chrono>
#include <functional>
#include <optional>
#include <string>

#include "appliance/recycle/FileInfo.h"
#include "appliance/util/FileDescriptor.h"

namespace orva {

inline constexpr const char* kBinFolder = ".recycle";
inline constexpr std::chrono::milliseconds kBinPatience{60'000};

// A share's bin, open and locked: the kernel holds the lock until `bin` is closed.
struct OpenBin {
    FileDescriptor share;
    FileDescriptor bin;
    FileInfo info;
};

struct BinOpening {
    std::optional<OpenBin> bin;
    bool noBin = false;     // the share has none
    bool noFolder = false;  // not even the share's folder is there
    std::string problem;    // why it cannot be opened, in words
};

// Opens the bin of the share whose folder is `directory` (a real path). Neither may be a link. Only
// one clean works in a bin at a time, previews beside each other: waits until the others are done,
// after a call of `waiting` when there is something to wait for, but no longer than `patience`:
// whoever may read the bin can hold its lock.
BinOpening OpenAndLockBin(const std::string& directory, bool preview,
                          const std::function<void()>& waiting,
                          std::chrono::milliseconds patience = kBinPatience);

}  // namespace orva
