#include "appliance/scheduler/RuntimeFiles.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <filesystem>
#include <thread>
#include <utility>

#include "appliance/root/Root.h"
#include "appliance/store/SchedulerLink.h"
#include "appliance/store/TaskStore.h"

namespace orva {
namespace {

// Somebody who looks whether a scheduler is running holds the lock for an instant, and a scheduler
// that was told to end needs one for that.
constexpr std::chrono::milliseconds kLockPatience{1000};
constexpr std::chrono::milliseconds kLockRetry{5};

// Whoever may read the lock can hold it, and keep a scheduler from starting.
constexpr mode_t kLockMode = 0640;
constexpr mode_t kSocketMode = 0660;

std::string Reason(const std::string& what) { return what + ": " + std::strerror(errno); }

std::string DirectoryOf(const std::string& file) {
    return std::filesystem::path(file).parent_path().string();
}

// The group of those who may write the task store; nothing while that has no folder.
std::optional<gid_t> StoreGroup() {
    struct stat store {};
    if (::stat(DirectoryOf(ResolvePath(TaskStore::kDatabaseFile)).c_str(), &store) != 0) {
        return std::nullopt;
    }
    return store.st_gid;
}

// Also for a file that an earlier scheduler has left with more rights.
bool GiveLockToStoreGroup(const FileDescriptor& file) {
    const std::optional<gid_t> group = StoreGroup();
    if (group && ::fchown(file.Get(), static_cast<uid_t>(-1), *group) != 0 && errno != EPERM) {
        return false;
    }
    return ::fchmod(file.Get(), kLockMode) == 0 || errno == EPERM;
}

std::string FirstLineOf(const FileDescriptor& file) {
    char text[32];
    const ssize_t length = ::pread(file.Get(), text, sizeof text, 0);
    const std::string_view all(text, length > 0 ? static_cast<std::size_t>(length) : 0);
    return std::string(all.substr(0, all.find('\n')));
}

bool TryLock(const FileDescriptor& file) {
    const auto deadline = std::chrono::steady_clock::now() + kLockPatience;
    while (::flock(file.Get(), LOCK_EX | LOCK_NB) != 0) {
        if (std::chrono::steady_clock::now() >= deadline) {
            return false;
        }
        std::this_thread::sleep_for(kLockRetry);
    }
    return true;
}

}  // namespace

FileDescriptor LockAsScheduler(std::string& error) {
    const std::string path = ResolvePath(SchedulerLink::kLockFile);
    const std::string directory = DirectoryOf(path);
    std::error_code problem;
    // A root that does not exist is a mistyped one.
    if (!std::filesystem::is_directory(Root(), problem)) {
        error = "root " + Root() + " is no directory";
        return {};
    }
    std::filesystem::create_directories(directory, problem);
    FileDescriptor file(::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, kLockMode));
    if (!file.IsOpen() || !GiveLockToStoreGroup(file)) {
        error = Reason(path);
        return {};
    }
    if (!TryLock(file)) {
        error = "another scheduler (process " + FirstLineOf(file) + ") is running for root " +
                Root() + "; this one does not start";
        return {};
    }
    const std::string line = std::to_string(::getpid()) + "\n";
    if (::ftruncate(file.Get(), 0) != 0 || ::pwrite(file.Get(), line.data(), line.size(), 0) < 0) {
        // Only the message above needs it.
    }
    return file;
}

std::unique_ptr<ControlSocket> ControlSocket::Open(std::string& error) {
    const std::string path = ResolvePath(SchedulerLink::kSocket);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.size() >= sizeof address.sun_path) {
        error = path + ": is too long for a socket; choose a root with a shorter path";
        return nullptr;
    }
    std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
    FileDescriptor socket(::socket(AF_UNIX, SOCK_DGRAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0));
    ::unlink(path.c_str());
    // Bound with no rights for anybody, so that nobody comes in before they are as they should be.
    const mode_t mask = ::umask(0777);
    const bool bound =
        socket.IsOpen() &&
        ::bind(socket.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
    ::umask(mask);
    if (!bound) {
        error = Reason(path);
        return nullptr;
    }
    const std::optional<gid_t> group = StoreGroup();
    if (group && ::chown(path.c_str(), static_cast<uid_t>(-1), *group) != 0 && errno != EPERM) {
        error = Reason(path);
        return nullptr;
    }
    if (::chmod(path.c_str(), kSocketMode) != 0) {
        error = Reason(path);
        return nullptr;
    }
    return std::unique_ptr<ControlSocket>(new ControlSocket(std::move(socket), path));
}

ControlSocket::~ControlSocket() { ::unlink(path.c_str()); }

std::optional<ControlSocket::Message> ControlSocket::Receive() {
    Message message;
    message.text.resize(SchedulerLink::kLongestMessage);
    message.senderLength = sizeof message.sender;
    const ssize_t length =
        ::recvfrom(socket.Get(), message.text.data(), message.text.size(), 0,
                   reinterpret_cast<sockaddr*>(&message.sender), &message.senderLength);
    if (length < 0) {
        return std::nullopt;
    }
    message.text.resize(static_cast<std::size_t>(length));
    return message;
}

void ControlSocket::Answer(const Message& message, std::string_view answer) {
    static_cast<void>(::sendto(socket.Get(), answer.data(), answer.size(), MSG_NOSIGNAL,
                               reinterpret_cast<const sockaddr*>(&message.sender),
                               message.senderLength));
}

}  // namespace orva
