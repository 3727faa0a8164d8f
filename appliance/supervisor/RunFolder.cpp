#include "appliance/supervisor/RunFolder.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstring>
#include <filesystem>
#include <string_view>

#include "appliance/root/Root.h"
#include "appliance/supervisor/RunFiles.h"

namespace orva {
namespace {

// What the supervisor makes in it gets the folder's group.
constexpr mode_t kFolderMode = 02750;
constexpr mode_t kFileMode = 0640;
// Beyond the longest command that a task may hold, and the environment.
constexpr std::size_t kLongestRecords = std::size_t{64} * 1024 * 1024;

// For pidfd_send_signal, since Linux 6.9; the C library's headers may be older.
constexpr unsigned kSignalProcessGroup = 1U << 2;

std::string Problem(const std::string& doing) {
    if (errno == ENOSPC || errno == EDQUOT) {
        return "no space for output";
    }
    return doing + ": " + std::strerror(errno);
}

// Gives what is at `path` the group of the folder `above`, and the mode, whatever the process's
// mask is. An account that may not give the group away keeps its own: then it is the only reader.
bool Share(const std::string& path, const std::string& above, mode_t mode) {
    struct stat status {};
    if (::stat(above.c_str(), &status) != 0) {
        return false;
    }
    if (::lchown(path.c_str(), static_cast<uid_t>(-1), status.st_gid) != 0 && errno != EPERM) {
        return false;
    }
    return ::chmod(path.c_str(), mode) == 0;
}

bool MakeFolder(const std::string& path, const std::string& above) {
    return ::mkdir(path.c_str(), kFolderMode) == 0 && Share(path, above, kFolderMode);
}

FileDescriptor MakeFile(const std::string& path, const std::string& above, int access) {
    FileDescriptor file(
        ::open(path.c_str(), access | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, kFileMode));
    return file.IsOpen() && Share(path, above, kFileMode) ? std::move(file) : FileDescriptor();
}

bool WriteWhole(int file, std::string_view content) {
    while (!content.empty()) {
        const ssize_t written = ::write(file, content.data(), content.size());
        if (written < 0 && errno == EINTR) {
            continue;
        }
        if (written <= 0) {
            return false;
        }
        content.remove_prefix(static_cast<std::size_t>(written));
    }
    return true;
}

// None with errno set; that is ENOENT only when there is no such file.
std::optional<std::string> ReadWhole(const std::string& path) {
    const FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW));
    struct stat status {};
    if (!file.IsOpen() || ::fstat(file.Get(), &status) != 0) {
        return std::nullopt;
    }
    if (!S_ISREG(status.st_mode) || static_cast<std::uint64_t>(status.st_size) > kLongestRecords) {
        errno = EINVAL;
        return std::nullopt;
    }
    std::string content(static_cast<std::size_t>(status.st_size), '\0');
    const ssize_t got = ::pread(file.Get(), content.data(), content.size(), 0);
    if (got < 0) {
        return std::nullopt;
    }
    content.resize(static_cast<std::size_t>(got));
    return content;
}

bool Allocate(int file, off_t size) {
    errno = ::posix_fallocate(file, 0, size);
    return errno == 0;
}

// Takes the space, and leaves the file as long as it is. Not every file system can.
bool AllocateBeyondEnd(int file, off_t size) {
    return ::fallocate(file, FALLOC_FL_KEEP_SIZE, 0, size) == 0 || errno == EOPNOTSUPP;
}

enum class Lock { kHeld, kFree, kNoFile, kUnknown };

Lock LookAtLock(const std::string& folder) {
    const FileDescriptor file(
        ::open((folder + kProcessFile).c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW));
    if (!file.IsOpen()) {
        return errno == ENOENT ? Lock::kNoFile : Lock::kUnknown;
    }
    if (::flock(file.Get(), LOCK_SH | LOCK_NB) == 0) {
        return Lock::kFree;
    }
    return errno == EWOULDBLOCK ? Lock::kHeld : Lock::kUnknown;
}

// Of the process with this id that started at that time, if it is there.
FileDescriptor HoldProcess(pid_t process, std::uint64_t start) {
    FileDescriptor held(static_cast<int>(::syscall(SYS_pidfd_open, process, 0)));
    // Asked after the process was taken hold of: then it is the one that had the id at this start.
    return held.IsOpen() && ProcessStart(process) == start ? std::move(held) : FileDescriptor();
}

template <class Records>
auto ReadRecords(const std::string& path, Records read) {
    const std::optional<std::string> records = ReadWhole(path);
    return records ? read(*records) : std::nullopt;
}

}  // namespace

std::vector<std::int64_t> RunFolder::All() {
    std::vector<std::int64_t> runs;
    std::error_code error;
    for (std::filesystem::directory_iterator entry(ResolvePath(kRunsFolder), error), end;
         !error && entry != end; entry.increment(error)) {
        const std::string name = entry->path().filename().string();
        std::int64_t run = 0;
        const auto [stop, problem] = std::from_chars(name.data(), name.data() + name.size(), run);
        if (problem == std::errc() && std::to_string(run) == name) {
            runs.push_back(run);
        }
    }
    std::sort(runs.begin(), runs.end());
    return runs;
}

RunFolder::RunFolder(std::int64_t run)
    : path(ResolvePath(kRunsFolder) + "/" + std::to_string(run)) {}

std::optional<FileDescriptor> RunFolder::Create(const RunOrder& order, std::string& error) {
    const std::string runs = ResolvePath(kRunsFolder);
    const std::string above = runs.substr(0, runs.rfind('/'));
    if (!MakeFolder(runs, above) && errno != EEXIST) {
        error = Problem(runs);
        return std::nullopt;
    }
    if (!Remove() || !MakeFolder(path, above)) {
        error = Problem(path);
        return std::nullopt;
    }
    const FileDescriptor orderFile = MakeFile(path + kOrderFile, above, O_WRONLY);
    const FileDescriptor reserve = MakeFile(path + kEndingReserve, above, O_WRONLY);
    FileDescriptor process = MakeFile(path + kProcessFile, above, O_RDWR | O_APPEND);
    if (!orderFile.IsOpen() || !reserve.IsOpen() || !process.IsOpen() ||
        !WriteWhole(orderFile.Get(), ToRecords(order)) || !Allocate(reserve.Get(), kEndingSpace) ||
        !AllocateBeyondEnd(process.Get(), kProcessSpace) ||
        ::flock(process.Get(), LOCK_EX | LOCK_NB) != 0) {
        error = Problem(path);
        static_cast<void>(Remove());
        return std::nullopt;
    }
    return process;
}

RunFolder::State RunFolder::Look() const {
    const Lock lock = LookAtLock(path);
    const int lockError = errno;
    // In this order: the ending may come between the two.
    const std::optional<std::string> ending = ReadWhole(path + kEndingFile);
    if (!ending && errno != ENOENT) {
        return State::kUnknown;
    }
    if (ending && EndingFromRecords(*ending)) {
        return State::kEnded;
    }
    switch (lock) {
        case Lock::kUnknown:
            errno = lockError;
            return State::kUnknown;
        case Lock::kHeld:
            return State::kSupervised;
        case Lock::kNoFile:
            return State::kAbandoned;
        case Lock::kFree:
            break;
    }
    const std::optional<std::string> process = ReadWhole(path + kProcessFile);
    if (!process) {
        return State::kUnknown;
    }
    // A supervisor says who it is before it starts the command.
    return ProcessFromRecords(*process) ? State::kAbandoned : State::kNotBegun;
}

bool RunFolder::IsSupervised() const { return LookAtLock(path) == Lock::kHeld; }

std::optional<RunOrder> RunFolder::Order() const {
    return ReadRecords(path + kOrderFile, OrderFromRecords);
}

std::optional<RunProcess> RunFolder::Process() const {
    return ReadRecords(path + kProcessFile, ProcessFromRecords);
}

std::optional<RunEnding> RunFolder::Ending() const {
    return ReadRecords(path + kEndingFile, EndingFromRecords);
}

std::optional<StoredOutput> RunFolder::Output() const { return ReadOutput(path + kOutputFile); }

FileDescriptor RunFolder::WatchSupervisor() const {
    const std::optional<RunProcess> process = Process();
    if (!process || process->bootId != BootId()) {
        return {};
    }
    return HoldProcess(process->supervisor, process->supervisorStart);
}

bool RunFolder::RecordStop(std::uint64_t killAt) const {
    const FileDescriptor file(
        ::open((path + kProcessFile).c_str(), O_WRONLY | O_APPEND | O_CLOEXEC | O_NOFOLLOW));
    return file.IsOpen() && WriteWhole(file.Get(), StopRecord(killAt));
}

bool RunFolder::SignalCommand(int signal) const {
    const std::optional<RunProcess> process = Process();
    // While its supervisor lives and has recorded no ending, the command's id is nobody else's.
    return process && process->command > 0 && process->bootId == BootId() && IsSupervised() &&
           !Ending() && ::kill(-process->command, signal) == 0;
}

FileDescriptor RunFolder::KillAbandonedCommand() const {
    const std::optional<RunProcess> process = Process();
    if (!process || process->command <= 0 || process->commandStart == 0 ||
        process->bootId != BootId() || Look() != State::kAbandoned) {
        return {};
    }
    FileDescriptor shell = HoldProcess(process->command, process->commandStart);
    if (!shell.IsOpen()) {
        return {};
    }
    const bool sent =
        ::syscall(SYS_pidfd_send_signal, shell.Get(), SIGKILL, nullptr, kSignalProcessGroup) == 0 ||
        // Older kernels know no groups there. The shell keeps the group's id.
        (errno == EINVAL && ::kill(-process->command, SIGKILL) == 0);
    return sent ? std::move(shell) : FileDescriptor();
}

bool RunFolder::Remove() const {
    std::error_code error;
    std::filesystem::remove_all(path, error);
    if (error) {
        syslog(LOG_ERR, "cannot remove %s: %s", path.c_str(), error.message().c_str());
        errno = error.value();
    }
    return !error;
}

}  // namespace orva
