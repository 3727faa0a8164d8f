#pragma once

#include <cstdint>
#include <limits>

namespace orva {

// Nanoseconds since 1970-01-01 00:00 UTC; times beyond the years 1677 to 2262 become the nearest.
using FileTime = std::int64_t;

inline constexpr FileTime kNanosecondsPerSecond = 1'000'000'000;

inline FileTime ToFileTime(std::int64_t seconds, std::uint32_t nanoseconds) {
    constexpr std::int64_t kLast = std::numeric_limits<FileTime>::max() / kNanosecondsPerSecond - 1;
    if (seconds > kLast) {
        return std::numeric_limits<FileTime>::max();
    }
    if (seconds < -kLast) {
        return std::numeric_limits<FileTime>::min();
    }
    return seconds * kNanosecondsPerSecond + static_cast<FileTime>(nanoseconds);
}

enum class FileKind : std::uint8_t { kFile, kDirectory, kLink, kOther };

// What one name in a bin stands for. Links are described themselves, not what they point to.
struct FileInfo {
    FileKind kind = FileKind::kFile;
    std::uint64_t bytes = 0;  // apparent size; 0 for what is neither file nor link
    FileTime changed = 0;     // when the inode last changed: the move into the bin at the latest
    std::uint64_t device = 0;
    std::uint64_t inode = 0;
    std::uint32_t links = 1;
    bool mountPoint = false;
};

// Describes `name` in the directory `directory`, never following a link; with an empty name the
// open file itself. Returns 0, or the errno.
int ReadFileInfo(int directory, const char* name, FileInfo& info);

}  // namespace orva
