#pragma once

#include <cstddef>
#include <cstdint>
#include <ctime>
#include <string>

namespace orva {

// What tells one version of a file, or of a directory's listing, from another.
struct FileIdentity {
    std::uint64_t device = 0;
    std::uint64_t inode = 0;
    std::int64_t size = 0;
    std::int64_t modified = 0;  // nanoseconds since 1970
    std::int64_t changed = 0;   // nanoseconds since 1970, of the inode

    bool operator==(const FileIdentity&) const = default;

    // False while a second change could still leave this very identity behind: a file system's
    // clock advances in steps of up to 10 ms.
    bool IsSettled() const;
};

// Fills `identity` of what is at `path`, links followed. 0 or the errno.
[[nodiscard]] int GetFileIdentity(const std::string& path, FileIdentity& identity);

// The same for a path that starts from the open directory `folder`: the shorter the way, the
// cheaper the look.
[[nodiscard]] int GetFileIdentityFrom(int folder, const char* path, FileIdentity& identity);

// Reads the whole regular file at `path`, links followed. `identity` is that of the very bytes in
// `content`. 0 or an errno: EFBIG beyond `limit` bytes, EINVAL for what is no regular file, EAGAIN
// for a file that keeps changing under the reader.
[[nodiscard]] int ReadFile(const std::string& path, std::size_t limit, std::string& content,
                           FileIdentity& identity);

}  // namespace orva
