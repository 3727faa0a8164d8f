#include "appliance/package/PackageControl.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>
#include <ctime>
#include <filesystem>
#include <system_error>
#include <utility>

#include "appliance/package/PackageFile.h"
#include "appliance/root/Root.h"
#include "appliance/util/Error.h"
#include "appliance/util/RunCommand.h"
#include "appliance/util/StopSignals.h"

namespace orva {
namespace {

constexpr timespec kLookInterval{0, 50'000'000};

// A file for each package, by its id. Not in the package's own folder: whoever may read that could
// hold its lock.
constexpr const char* kLocks = "/run/orva/packages";
constexpr mode_t kLocksMode = 0700;
constexpr mode_t kLockMode = 0600;

}  // namespace

struct PackageControl::Verb {
    const char* word;
    const char* already;
    const char* done;
    const char* without;  // its status says that nothing has come of it
    PackageState wanted;
    std::string ORVAPackageTool::PackageInfo::*command;
};

PackageControl::PackageControl(std::string id) : PackageControl(std::move(id), Limits()) {}

PackageControl::PackageControl(std::string id, const Limits& limits)
    : packageId(std::move(id)), maxima(limits) {}

bool PackageControl::Load(std::string& report) {
    const ORVAPackageTool::PackageManager manager;
    if (manager.getPackageInfo(packageId, info, nullptr)) {
        folder = ResolvePath(kPackages) + "/" + packageId;
        return true;
    }
    report = QLIBCErrGet() == kErrBadDocument ? "its description is damaged" : "is not installed";
    return false;
}

PackageState PackageControl::State() const {
    if (info.statusCommand.empty()) {
        return PackageState::kUnknown;
    }
    Command command;
    command.arguments = ShellArguments(info.statusCommand);
    command.directory = folder;
    command.quiet = true;
    command.limit = maxima.status;
    const CommandEnd end = RunCommand(command);
    if (end.kind == CommandEnd::Kind::kInterrupted) {
        EndBySignal(end.number);
    }
    if (end.kind != CommandEnd::Kind::kExited) {
        return PackageState::kUnknown;
    }
    return end.number == 0 ? PackageState::kRunning : PackageState::kStopped;
}

PackageState PackageControl::WaitFor(PackageState wanted) const {
    const auto deadline = std::chrono::steady_clock::now() + maxima.settling;
    for (;;) {
        const PackageState state = State();
        if (state == wanted || state == PackageState::kUnknown ||
            std::chrono::steady_clock::now() > deadline) {
            return state;
        }
        ::nanosleep(&kLookInterval, nullptr);
    }
}

FileDescriptor PackageControl::TakeTurn(std::string& report) const {
    const std::string directory = ResolvePath(kLocks);
    const std::string path = directory + "/" + packageId;
    std::error_code problem;
    std::filesystem::create_directories(std::filesystem::path(directory).parent_path(), problem);
    ::mkdir(directory.c_str(), kLocksMode);
    // Closed on exec: what the command leaves running must not hold the lock.
    FileDescriptor lock(::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, kLockMode));
    if (!lock.IsOpen()) {
        report = "cannot be locked: " + path + ": " + std::generic_category().message(errno);
        return {};
    }
    const auto deadline = std::chrono::steady_clock::now() + maxima.turn;
    while (::flock(lock.Get(), LOCK_EX | LOCK_NB) != 0) {
        if (errno != EWOULDBLOCK && errno != EINTR) {
            report = "cannot be locked: " + path + ": " + std::generic_category().message(errno);
            return {};
        }
        if (std::chrono::steady_clock::now() > deadline) {
            const auto seconds = std::chrono::ceil<std::chrono::seconds>(maxima.turn).count();
            report = "another start or stop of it did not end within " + std::to_string(seconds) +
                     (seconds == 1 ? " second" : " seconds");
            return {};
        }
        ::nanosleep(&kLookInterval, nullptr);
    }
    return lock;
}

bool PackageControl::Change(const Verb& verb, std::string& report) const {
    const std::string& line = info.*verb.command;
    if (!info.startable || line.empty()) {
        report = std::string("cannot be ") + verb.done + ": " +
                 (info.startable ? std::string("it gives no ") + verb.word + " command"
                                 : std::string("it is not made to be started and stopped"));
        return false;
    }
    const FileDescriptor lock = TakeTurn(report);
    if (!lock.IsOpen()) {
        return false;
    }
    if (State() == verb.wanted) {
        report = verb.already;
        return true;
    }
    Command command;
    command.arguments = ShellArguments(line);
    command.directory = folder;
    command.limit = maxima.command;
    const CommandEnd end = RunCommand(command);
    if (!end.Succeeded()) {
        report = std::string("its ") + verb.word + " command: " + DescribeEnd(end, command);
        if (end.kind == CommandEnd::Kind::kInterrupted) {
            EndBySignal(end.number);
        }
        return false;
    }
    const PackageState state = info.statusCommand.empty() ? verb.wanted : WaitFor(verb.wanted);
    if (state != verb.wanted) {
        report = state == PackageState::kUnknown
                     ? std::string("its status command does not work after its ") + verb.word
                     : std::string(verb.without);
        return false;
    }
    report = verb.done;
    return true;
}

bool PackageControl::Start(std::string& report) const {
    static constexpr Verb kStart{"start",
                                 "is running already",
                                 "started",
                                 "does not run although its start command succeeded",
                                 PackageState::kRunning,
                                 &ORVAPackageTool::PackageInfo::startCommand};
    return Change(kStart, report);
}

bool PackageControl::Stop(std::string& report) const {
    static constexpr Verb kStop{"stop",
                                "is not running",
                                "stopped",
                                "still runs although its stop command succeeded",
                                PackageState::kStopped,
                                &ORVAPackageTool::PackageInfo::stopCommand};
    return Change(kStop, report);
}

}  // namespace orva
