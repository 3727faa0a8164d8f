#include "appliance/server/AccessToken.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <filesystem>

#include "appliance/util/FileDescriptor.h"
#include "appliance/util/Text.h"

namespace orva {
namespace {

constexpr std::size_t kTokenBytes = 32;
constexpr std::size_t kTokenDigits = 2 * kTokenBytes;

bool IsToken(std::string_view text) {
    return text.size() == kTokenDigits && std::all_of(text.begin(), text.end(), [](char c) {
               return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
           });
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
    std::string temporary = file + ".XXXXXX";
    const FileDescriptor fd(directoryError ? -1 : ::mkostemp(temporary.data(), O_CLOEXEC));
    if (!fd.IsOpen()) {
        error = directoryError ? directoryError.message() : ErrnoText();
        return false;
    }
    const std::string line = MakeSecret(kTokenBytes).value_or("") + '\n';
    bool done = line.size() > 1 && ::fchmod(fd.Get(), S_IRUSR | S_IWUSR) == 0 &&
                ::write(fd.Get(), line.data(), line.size()) == static_cast<ssize_t>(line.size()) &&
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

}  // namespace

std::optional<AccessToken> AccessToken::LoadOrCreate(const std::string& file, std::string& error) {
    struct stat status {};
    if (::lstat(file.c_str(), &status) != 0 && errno == ENOENT && !CreateFile(file, error)) {
        error = "cannot make the token file " + file + ": " + error;
        return std::nullopt;
    }
    return Load(file, error);
}

std::optional<AccessToken> AccessToken::Load(const std::string& file, std::string& error) {
    // Non-blocking, or a pipe in the file's place would hold the reader for ever.
    const FileDescriptor fd(::open(file.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    error = fd.IsOpen() ? ExamineSecretFile(fd.Get()) : ErrnoText();
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

bool AccessToken::Matches(std::string_view presented) const { return SameSecret(token, presented); }

Sha256Digest AccessToken::Sign(std::string_view text) const { return Sha256Keyed(token, text); }

}  // namespace orva
