#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "appliance/recycle/FileInfo.h"

namespace orva {

enum class SizeOrder : std::uint8_t { kOldestFirst, kLargestFirst };

// Why an entry stays in its bin.
enum class KeepReason : std::uint8_t {
    kNone,        // it does not stay
    kExtension,   // its extension is one to keep
    kLarger,      // larger than the size above which files are kept
    kSmaller,     // smaller than the size below which files are kept
    kAge,         // not long enough in the bin
    kWithinSize,  // the bin is small enough without its removal
    kMountPoint,  // another file system, or another folder mounted into the bin
};

// A word for programs, and a phrase for people.
std::string_view KeepReasonWord(KeepReason reason);
std::string_view KeepReasonPhrase(KeepReason reason);

// Which entries of a bin a clean removes. Without `days` and `sizeLimit`: all but those to keep.
// At most one of the two is set.
struct CleanRules {
    std::optional<std::uint64_t> days;       // remove what is in the bin for more days than this
    std::optional<std::uint64_t> sizeLimit;  // bytes: remove until the bin holds at most this
    SizeOrder order = SizeOrder::kOldestFirst;
    std::vector<std::string> keepExtensions;  // lower case, without the dot
    std::optional<std::uint64_t> keepLarger;  // bytes: keep what is larger
    std::optional<std::uint64_t> keepSmaller;
};

// Applies rules at one instant.
class CleanJudge {
  public:
    CleanJudge(CleanRules cleanRules, FileTime now);

    // Why the entry must not be removed; kNone when it may. Under a size limit the limit itself is
    // not looked at: it is about the whole bin.
    KeepReason Keep(std::string_view name, std::uint64_t bytes, FileTime changed) const;

    const CleanRules& Rules() const { return rules; }
    FileTime Now() const { return now; }

  private:
    bool HasKeptExtension(std::string_view name) const;

    CleanRules rules;
    FileTime now;
    FileTime changedBefore;
};

}  // namespace orva
