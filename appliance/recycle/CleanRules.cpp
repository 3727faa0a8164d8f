#include "appliance/recycle/CleanRules.h"

#include <algorithm>
#include <limits>
#include <utility>

namespace orva {
namespace {

constexpr std::uint64_t kSecondsPerDay = 86'400;

char LowerAscii(char byte) {
    return byte >= 'A' && byte <= 'Z' ? static_cast<char>(byte - 'A' + 'a') : byte;
}

bool EqualIgnoringCase(std::string_view text, std::string_view lowerCase) {
    return std::equal(text.begin(), text.end(), lowerCase.begin(), lowerCase.end(),
                      [](char left, char right) { return LowerAscii(left) == right; });
}

// The latest change time, not included, of what has been in the bin for more than `days`. More days
// than time has passed since the first instant that can be named: nothing is that old.
FileTime Cutoff(FileTime now, std::uint64_t days) {
    constexpr FileTime kFirst = std::numeric_limits<FileTime>::min();
    constexpr std::uint64_t kNanosecondsPerDay = kSecondsPerDay * kNanosecondsPerSecond;
    const std::uint64_t reach =
        static_cast<std::uint64_t>(now) - static_cast<std::uint64_t>(kFirst);
    if (days > reach / kNanosecondsPerDay) {
        return kFirst;
    }
    return static_cast<FileTime>(static_cast<std::uint64_t>(now) - days * kNanosecondsPerDay);
}

}  // namespace

std::string_view KeepReasonWord(KeepReason reason) {
    switch (reason) {
        case KeepReason::kNone:
            return "none";
        case KeepReason::kExtension:
            return "extension";
        case KeepReason::kLarger:
            return "larger";
        case KeepReason::kSmaller:
            return "smaller";
        case KeepReason::kAge:
            return "age";
        case KeepReason::kWithinSize:
            return "within_size";
        case KeepReason::kMountPoint:
            return "mount_point";
    }
    return "none";
}

std::string_view KeepReasonPhrase(KeepReason reason) {
    switch (reason) {
        case KeepReason::kNone:
            return "not kept";
        case KeepReason::kExtension:
            return "extension to keep";
        case KeepReason::kLarger:
            return "larger than -m";
        case KeepReason::kSmaller:
            return "smaller than -l";
        case KeepReason::kAge:
            return "not longer in the bin than -t";
        case KeepReason::kWithinSize:
            return "bin within -s";
        case KeepReason::kMountPoint:
            return "mount point";
    }
    return "not kept";
}

CleanJudge::CleanJudge(CleanRules cleanRules, FileTime instant)
    : rules(std::move(cleanRules)),
      now(instant),
      changedBefore(rules.days ? Cutoff(instant, *rules.days)
                               : std::numeric_limits<FileTime>::max()) {}

KeepReason CleanJudge::Keep(std::string_view name, std::uint64_t bytes, FileTime changed) const {
    if (HasKeptExtension(name)) {
        return KeepReason::kExtension;
    }
    if (rules.keepLarger && bytes > *rules.keepLarger) {
        return KeepReason::kLarger;
    }
    if (rules.keepSmaller && bytes < *rules.keepSmaller) {
        return KeepReason::kSmaller;
    }
    if (rules.days && changed >= changedBefore) {
        return KeepReason::kAge;
    }
    return KeepReason::kNone;
}

bool CleanJudge::HasKeptExtension(std::string_view name) const {
    if (rules.keepExtensions.empty()) {
        return false;
    }
    const std::size_t dot = name.rfind('.');
    if (dot == std::string_view::npos) {
        return false;
    }
    const std::string_view extension = name.substr(dot + 1);
    return std::any_of(
        rules.keepExtensions.begin(), rules.keepExtensions.end(),
        [extension](const std::string& kept) { return EqualIgnoringCase(extension, kept); });
}

}  // namespace orva
