#include "appliance/util/FileRead.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>

#include "appliance/util/FileDescriptor.h"

namespace orva {
namespace {

constexpr std::int64_t kNanoseconds = 1'000'000'000;

std::int64_t InNanoseconds(const timespec& time) {
    return static_cast<std::int64_t>(time.tv_sec) * kNanoseconds + time.tv_nsec;
}

FileIdentity IdentityOf(const struct stat& status) {
    return {static_cast<std::uint64_t>(status.st_dev), static_cast<std::uint64_t>(status.st_ino),
            static_cast<std::int64_t>(status.st_size), InNanoseconds(status.st_mtim),
            InNanoseconds(status.st_ctim)};
}

int ReadToEnd(int file, std::size_t limit, std::string& content) {
    content.clear();
    std::array<char, 16384> block{};
    while (true) {
        const ssize_t got = ::read(file, block.data(), block.size());
        if (got < 0) {
            if (errno == EINTR) {
                continue;
            }
            return errno;
        }
        if (got == 0) {
            return 0;
        }
        if (content.size() + static_cast<std::size_t>(got) > limit) {
            return EFBIG;
        }
        content.append(block.data(), static_cast<std::size_t>(got));
    }
}

}  // namespace

bool FileIdentity::IsSettled() const {
    // Twice the longest step. A time ahead of the clock (it was set back) is never settled.
    constexpr std::int64_t kStep = 20'000'000;
    timespec now{};
    ::clock_gettime(CLOCK_REALTIME, &now);
    return changed + kStep < InNanoseconds(now) && modified + kStep < InNanoseconds(now);
}

int GetFileIdentity(const std::string& path, FileIdentity& identity) {
    return GetFileIdentityFrom(AT_FDCWD, path.c_str(), identity);
}

int GetFileIdentityFrom(int folder, const char* path, FileIdentity& identity) {
    struct stat status {};
    if (::fstatat(folder, path, &status, 0) != 0) {
        return errno;
    }
    identity = IdentityOf(status);
    return 0;
}

int ReadFile(const std::string& path, std::size_t limit, std::string& content,
             FileIdentity& identity) {
    // Non-blocking, or a pipe in the file's place would hold the reader for ever.
    const FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    if (file.Get() < 0) {
        return errno;
    }
    constexpr int kAttempts = 5;
    for (int attempt = 0; attempt < kAttempts; ++attempt) {
        struct stat before {};
        struct stat after {};
        if (::fstat(file.Get(), &before) != 0) {
            return errno;
        }
        if (!S_ISREG(before.st_mode)) {
            return EINVAL;
        }
        if (::lseek(file.Get(), 0, SEEK_SET) < 0) {
            return errno;
        }
        if (const int error = ReadToEnd(file.Get(), limit, content)) {
            return error;
        }
        if (::fstat(file.Get(), &after) != 0) {
            return errno;
        }
        identity = IdentityOf(after);
        if (identity == IdentityOf(before) &&
            content.size() == static_cast<std::size_t>(after.st_size)) {
            return 0;
        }
    }
    return EAGAIN;
}

}  // namespace orva
