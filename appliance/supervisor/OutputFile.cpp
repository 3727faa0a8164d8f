#include "appliance/supervisor/OutputFile.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>

namespace orva {
namespace {

using Counts = OutputWriter::Counts;

constexpr std::uint64_t kHeadAt = 4096;
constexpr std::uint64_t kTailAt = kHeadAt + kOutputHead;
constexpr std::uint64_t kFileSize = kTailAt + kOutputTail;
constexpr mode_t kMode = 0640;
// A writer that prints a gigabyte a second may overtake a slow reader once or twice.
constexpr int kReadAttempts = 8;

// The file's place for the byte at `position` of the output.
std::uint64_t PlaceOf(std::uint64_t position) {
    return position < kOutputHead ? kHeadAt + position
                                  : kTailAt + (position - kOutputHead) % kOutputTail;
}

// How many bytes of the output from `position` on stand one after the other in the file.
std::uint64_t RoomAt(std::uint64_t position) {
    return position < kOutputHead ? kOutputHead - position
                                  : kOutputTail - (position - kOutputHead) % kOutputTail;
}

bool WriteAt(int file, const void* bytes, std::size_t size, std::uint64_t place) {
    const char* from = static_cast<const char*>(bytes);
    while (size > 0) {
        const ssize_t done = ::pwrite(file, from, size, static_cast<off_t>(place));
        if (done < 0 && errno == EINTR) {
            continue;
        }
        if (done <= 0) {
            return false;
        }
        from += done;
        place += static_cast<std::uint64_t>(done);
        size -= static_cast<std::size_t>(done);
    }
    return true;
}

bool ReadAt(int file, void* bytes, std::size_t size, std::uint64_t place) {
    char* to = static_cast<char*>(bytes);
    while (size > 0) {
        const ssize_t done = ::pread(file, to, size, static_cast<off_t>(place));
        if (done < 0 && errno == EINTR) {
            continue;
        }
        if (done <= 0) {
            return false;
        }
        to += done;
        place += static_cast<std::uint64_t>(done);
        size -= static_cast<std::size_t>(done);
    }
    return true;
}

// The output from `begin` up to `end`.
bool ReadPart(int file, std::uint64_t begin, std::uint64_t end, std::string& part) {
    part.resize(static_cast<std::size_t>(end - begin));
    std::size_t done = 0;
    while (done < part.size()) {
        const std::uint64_t position = begin + done;
        const std::size_t step =
            static_cast<std::size_t>(std::min<std::uint64_t>(RoomAt(position), part.size() - done));
        if (!ReadAt(file, part.data() + done, step, PlaceOf(position))) {
            return false;
        }
        done += step;
    }
    return true;
}

// The first byte of the tail when `count` bytes have been printed.
std::uint64_t TailBegin(std::uint64_t count) {
    return std::max<std::uint64_t>(kOutputHead, count < kOutputTail ? 0 : count - kOutputTail);
}

}  // namespace

std::optional<OutputWriter> OutputWriter::Create(const std::string& file) {
    FileDescriptor opened(
        ::open(file.c_str(), O_RDWR | O_CREAT | O_TRUNC | O_CLOEXEC | O_NOFOLLOW, kMode));
    // Whatever the process's mask is: the group reads it.
    if (!opened.IsOpen() || ::fchmod(opened.Get(), kMode) != 0) {
        return std::nullopt;
    }
    const int error = ::posix_fallocate(opened.Get(), 0, static_cast<off_t>(kFileSize));
    if (error != 0) {
        errno = error;
        return std::nullopt;
    }
    return OutputWriter(std::move(opened));
}

void OutputWriter::Append(std::string_view bytes) {
    if (bytes.empty() || !file.IsOpen()) {
        return;
    }
    const std::uint64_t end = total + bytes.size();
    if (!WriteCounts({end, total}) || !WriteBytes(bytes, end) || !WriteCounts({end, end})) {
        // The file keeps saying which of its bytes are certain.
        file = FileDescriptor();
    }
    total = end;
}

bool OutputWriter::WriteCounts(const Counts& counts) const {
    return WriteAt(file.Get(), &counts, sizeof counts, 0);
}

bool OutputWriter::WriteBytes(std::string_view bytes, std::uint64_t end) const {
    std::uint64_t position = total;
    while (!bytes.empty()) {
        // What this very call would overwrite again needs no place.
        const std::uint64_t tail = TailBegin(end);
        if (position >= kOutputHead && position < tail) {
            bytes.remove_prefix(static_cast<std::size_t>(tail - position));
            position = tail;
        }
        const std::size_t step =
            static_cast<std::size_t>(std::min<std::uint64_t>(RoomAt(position), bytes.size()));
        if (!WriteAt(file.Get(), bytes.data(), step, PlaceOf(position))) {
            return false;
        }
        bytes.remove_prefix(step);
        position += step;
    }
    return true;
}

bool OutputWriter::Sync() { return ::fsync(file.Get()) == 0; }

std::optional<StoredOutput> ReadOutput(const std::string& path) {
    const FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    struct stat status {};
    // Before its space is taken, nothing has been started that could print.
    if (!file.IsOpen() || ::fstat(file.Get(), &status) != 0 ||
        status.st_size < static_cast<off_t>(kFileSize)) {
        return std::nullopt;
    }
    for (int attempt = 1;; ++attempt) {
        Counts before;
        StoredOutput output;
        if (!ReadAt(file.Get(), &before, sizeof before, 0)) {
            return std::nullopt;
        }
        const std::uint64_t end = output.bytes = before.written;
        if (!ReadPart(file.Get(), 0, std::min<std::uint64_t>(end, kOutputHead), output.head)) {
            return std::nullopt;
        }
        if (end <= kOutputHead) {
            return output;
        }
        const std::uint64_t begin = TailBegin(end);
        Counts after;
        if (!ReadPart(file.Get(), begin, end, output.tail) ||
            !ReadAt(file.Get(), &after, sizeof after, 0)) {
            return std::nullopt;
        }
        const std::uint64_t certain = TailBegin(after.announced);
        if (certain > end && attempt < kReadAttempts) {
            continue;
        }
        const std::uint64_t kept = std::min(certain, end);
        output.tail.erase(0, static_cast<std::size_t>(kept - begin));
        output.dropped = kept - kOutputHead;
        return output;
    }
}

}  // namespace orva
