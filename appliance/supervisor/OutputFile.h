// A run's output in a file of a fixed size: the first 64 KiB, the last 64 KiB, and how much there
// was. Written by one process, readable by any other at any time, complete up to the last write
// when the writer is killed.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "appliance/util/FileDescriptor.h"

namespace orva {

inline constexpr std::size_t kOutputHead = std::size_t{64} * 1024;
inline constexpr std::size_t kOutputTail = std::size_t{64} * 1024;

// Head and tail together are the whole output when nothing was dropped between them.
struct StoredOutput {
    std::string head;
    std::string tail;
    std::uint64_t dropped = 0;
    std::uint64_t bytes = 0;  // all that was printed

    bool operator==(const StoredOutput&) const = default;
};

class OutputWriter {
  public:
    // At the file's start. Both count bytes since the command's start: what will have been written
    // when the present write is done, and what has been written for certain. A reader that looks at
    // `announced` after it has read the tail knows which part of that was being overwritten.
    struct Counts {
        std::uint64_t announced = 0;
        std::uint64_t written = 0;
    };

    // Makes the file, mode 0640, with all its space allocated. None with errno set.
    [[nodiscard]] static std::optional<OutputWriter> Create(const std::string& file);

    // Takes over more output. A file that can no longer be written keeps what it has; the rest is
    // thrown away.
    void Append(std::string_view bytes);

    // Whether all is on disk now.
    [[nodiscard]] bool Sync();

  private:
    explicit OutputWriter(FileDescriptor opened) : file(std::move(opened)) {}

    bool WriteCounts(const Counts& counts) const;
    bool WriteBytes(std::string_view bytes, std::uint64_t end) const;

    FileDescriptor file;
    std::uint64_t total = 0;
};

// None when there is no such file, or not yet a whole one. While the writer is at work: a state
// that it went through, with fewer bytes of the tail if it overwrote them meanwhile.
[[nodiscard]] std::optional<StoredOutput> ReadOutput(const std::string& file);

}  // namespace orva
