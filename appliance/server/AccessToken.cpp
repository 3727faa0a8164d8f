#include "appliance/server/AccessToken.h"

#include <fcntl.h>
#include <sys/random.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <filesystem>

#include "appliance/util/FileDescriptor.h"

namespace orva {
namespace {

constexpr std::size_t kTokenBytes = 32;
constexpr std::size_t kTokenDigits = 2 * kTokenBytes;

std::string ErrnoText() { return std::strerror(errno); }

bool IsToken(std::string_view text) {
    return text.size() == kTokenDigits && std::all_of(text.begin(), text.end(), [](char c) {
               return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
           });
}

bool MakeToken(std::string& token) {
    std::array<unsigned char, kTokenBytes> bytes{};
    if (::getrandom(bytes.data(), bytes.size(), 0) != static_cast<ssize_t>(bytes.size())) {
        return false;
    }
    constexpr char kDigits[] = "0123456789abcdef";
    token.clear();
    for (const unsigned char byte : bytes) {
        token += kDigits[byte >> 4U];
        token += kDigits[byte & 0x0FU];
    }
    return true;
}

bool SyncDirectory(const std::string& directory) {
    const FileDescriptor fd(::open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    return fd.IsOpen() && ::fsync(fd.Get()) == 0;
}

// Makes the file unless it exists already. A link, not a rename: of two servers that start at the
// same time the second must take over the first one's token, not replace it.
bool CreateFile(const std::string& file, std::string& error) {
    const std::string directory = std::filesystem::path(file).parent_path().string();
    std::error_code directoryError;
    std::filesystem::create_directories(directory, directoryError);
    std::string token;
    std::string temporary = file + ".XXXXXX";
    const FileDescriptor fd(directoryError ? -1 : ::mkostemp(temporary.data(), O_CLOEXEC));
    if (!fd.IsOpen()) {
        error = directoryError ? directoryError.message() : ErrnoText();
        return false;
    }
    bool done = MakeToken(token);
    token += '\n';
    done = done && ::fchmod(fd.Get(), S_IRUSR | S_IWUSR) == 0 &&
           ::write(fd.Get(), token.data(), token.size()) == static_cast<ssize_t>(token.size()) &&
           ::fsync(fd.Get()) == 0 &&
           (::link(temporary.c_str(), file.c_str()) == 0 || errno == EEXIST);
    if (!done) {
        error = ErrnoText();
    }
    ::unlink(temporary.c_str());
    if (done && !SyncDirectory(directory)) {
        error = ErrnoText();
        done = false;
    }
    return done;
}

// What is wrong with the open token file; empty when nothing is.
std::string Examine(const FileDescriptor& fd) {
    struct stat status {};
    if (::fstat(fd.Get(), &status) != 0) {
        return ErrnoText();
    }
    if (!S_ISREG(status.st_mode)) {
        return "it is no regular file";
    }
    if (status.st_uid != ::geteuid() && status.st_uid != 0) {
        return "it belongs to another account";
    }
    if ((status.st_mode & (S_IRWXG | S_IRWXO)) != 0) {
        return "group or others may read or write it; chmod 600 is needed";
    }
    return {};
}

}  // namespace

std::optional<AccessToken> AccessToken::LoadOrCreate(const std::string& file, std::string& error) {
    constexpr int kFlags = O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC;
    FileDescriptor fd(::open(file.c_str(), kFlags));
    if (!fd.IsOpen() && errno == ENOENT) {
        if (!CreateFile(file, error)) {
            error = "cannot make the token file " + file + ": " + error;
            return std::nullopt;
        }
        fd = FileDescriptor(::open(file.c_str(), kFlags));
    }
    error = fd.IsOpen() ? Examine(fd) : ErrnoText();
    if (error.empty()) {
        std::array<char, kTokenDigits + 2> content{};
        const ssize_t size = ::read(fd.Get(), content.data(), content.size());
        std::string_view text(content.data(), size > 0 ? static_cast<std::size_t>(size) : 0);
        if (!text.empty() && text.back() == '\n') {
            text.remove_suffix(1);
        }
        if (IsToken(text)) {
            return AccessToken(std::string(text));
        }
        error = "it does not hold a token of 64 hexadecimal digits";
    }
    error = "cannot use the token file " + file + ": " + error;
    return std::nullopt;
}

bool AccessToken::Matches(std::string_view presented) const {
    if (presented.size() != token.size()) {
        return false;
    }
    // volatile keeps the compiler from leaving the loop early.
    volatile unsigned difference = 0;
    for (std::size_t i = 0; i < token.size(); ++i) {
        difference = difference | (static_cast<unsigned char>(token[i]) ^
                                   static_cast<unsigned char>(presented[i]));
    }
    return difference == 0;
}

}  // namespace orva
