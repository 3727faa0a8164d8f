#include "appliance/supervisor/Supervisor.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <string_view>

#include "appliance/supervisor/CommandStart.h"
#include "appliance/supervisor/OutputFile.h"
#include "appliance/supervisor/OutputPipe.h"
#include "appliance/supervisor/Owner.h"
#include "appliance/supervisor/ProcessGroup.h"
#include "appliance/supervisor/RunFiles.h"
#include "appliance/supervisor/RunRecords.h"

namespace orva {
namespace {

constexpr mode_t kEndingMode = 0640;

// The run's folder, which the supervisor stays in: the scheduler may have removed it and made
// another one under its name, when it had to start again with another database.
constexpr const char* kHere = ".";

// How often a stopped command's group is looked at that outlives its shell.
constexpr int kShortestPause = 5;  // milliseconds
constexpr int kLongestPause = 200;
// A killed process ends as soon as the kernel lets it; one that hangs there must not keep the run
// from ending.
constexpr std::uint64_t kTimeToDie = 5'000'000;  // microseconds

bool WriteAll(int file, std::string_view content) {
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

std::string PathOf(const char* file) { return std::string(kHere) + file; }

std::optional<RunOrder> ReadOrder() {
    const FileDescriptor file(::open(PathOf(kOrderFile).c_str(), O_RDONLY | O_CLOEXEC));
    std::string records;
    std::array<char, 4096> buffer{};
    ssize_t got = 0;
    while (file.IsOpen() && (got = ::read(file.Get(), buffer.data(), buffer.size())) > 0) {
        records.append(buffer.data(), static_cast<std::size_t>(got));
    }
    return OrderFromRecords(records);
}

bool SyncFolder(const char* path) {
    const FileDescriptor folder(::open(path, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    return folder.IsOpen() && ::fsync(folder.Get()) == 0;
}

// Puts the ending into the space that was kept for it, then gives that its name: it is seen whole
// or not at all, after a power cut too.
bool WriteEnding(const RunEnding& ending) {
    const std::string reserve = PathOf(kEndingReserve);
    const std::string records = ToRecords(ending);
    const FileDescriptor file(
        ::open(reserve.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC | O_NOFOLLOW, kEndingMode));
    return file.IsOpen() && WriteAll(file.Get(), records) &&
           ::ftruncate(file.Get(), static_cast<off_t>(records.size())) == 0 &&
           ::fsync(file.Get()) == 0 &&
           ::rename(reserve.c_str(), PathOf(kEndingFile).c_str()) == 0 && SyncFolder(kHere) &&
           SyncFolder("..");
}

// By errno.
std::string CannotKeepOutput() {
    return errno == ENOSPC || errno == EDQUOT
               ? "no space for output"
               : std::string("cannot keep output: ") + std::strerror(errno);
}

// What setpriv has to say, as the end of a sentence.
std::string FirstLineOfOutput() {
    const std::optional<StoredOutput> stored = ReadOutput(PathOf(kOutputFile));
    const std::string line = stored ? stored->head.substr(0, stored->head.find('\n')) : "";
    return line.empty() ? line : ": " + line;
}

void IgnoreRequestsToEnd() {
    for (const int signal : {SIGTERM, SIGINT, SIGHUP, SIGQUIT, SIGPIPE}) {
        ::signal(signal, SIG_IGN);
    }
}

// False with errno.
bool SayWhoWeAre() {
    const pid_t self = ::getpid();
    const std::string boot = BootId();
    const std::optional<std::uint64_t> start = boot.empty() ? std::nullopt : ProcessStart(self);
    return start && WriteAll(kSupervisorLock, SupervisorRecords({boot, self, *start}));
}

// When the command is to be killed; 0 when nobody has asked for a stop.
std::uint64_t KillTime() {
    std::array<char, kProcessSpace> records{};
    const ssize_t got = ::pread(kSupervisorLock, records.data(), records.size(), 0);
    const std::optional<RunProcess> process =
        ProcessFromRecords({records.data(), got > 0 ? static_cast<std::size_t>(got) : 0});
    return process ? process->killAt : 0;
}

// One run, from its order to its ending.
class SupervisedRun {
  public:
    // `runName` is for the log.
    explicit SupervisedRun(std::string runName) : name(std::move(runName)) {}

    RunEnding Run() {
        RunEnding ending;
        if (!Start(ending)) {
            ending.ended = RunTimeNow();
            return ending;
        }
        std::string why;
        const bool shellRuns = command->WaitForShell(why);
        ending.started = RunTimeNow();
        pipe.KeepUntilEnd(*output, command->Watch());
        const bool stopped = EndStoppedGroup();
        ending.ended = RunTimeNow();

        // Not reaped yet: as long as the ending is not written, the command's id must not become
        // another process's.
        siginfo_t info{};
        while (::waitid(P_PID, static_cast<id_t>(command->Id()), &info, WEXITED | WNOWAIT) != 0 &&
               errno == EINTR) {
        }
        if (info.si_code != CLD_EXITED) {
            ending.signal = info.si_status;
        } else if (shellRuns) {
            ending.exitStatus = info.si_status;
        } else {
            ending.started.reset();
            ending.why = why + FirstLineOfOutput();
        }
        if (stopped && ending.why.empty()) {
            ending.why = kWhyStopped;
        }
        static_cast<void>(output->Sync());
        return ending;
    }

    // Once the ending is written.
    void Finish() {
        if (command) {
            ::waitpid(command->Id(), nullptr, 0);
            pipe.LeaveToOthers();
        }
    }

  private:
    // A stop is for all that runs in the command's group. As long as the shell is not reaped, the
    // group's id is given to nobody else. False when nobody has asked for one.
    bool EndStoppedGroup() {
        const std::uint64_t killAt = KillTime();
        if (killAt == 0) {
            return false;
        }
        int pause = kShortestPause;
        while (HasLivingProcess(command->Id())) {
            const std::uint64_t now = MonotonicNow();
            if (now >= killAt + kTimeToDie) {
                syslog(LOG_ERR, "%s: processes of the stopped command cannot be killed",
                       name.c_str());
                break;
            }
            if (now >= killAt) {
                ::kill(-command->Id(), SIGKILL);
            }
            pipe.KeepFor(*output, pause);
            pause = std::min(pause * 2, kLongestPause);
        }
        pipe.KeepWhatIsThere(*output);
        return true;
    }

    // False with the ending's `why` set.
    bool Start(RunEnding& ending) {
        // Who finds an empty process file and no ending takes the run for one that has not begun.
        if (!SayWhoWeAre()) {
            ending.why = CannotKeepOutput();
            return false;
        }
        const std::optional<RunOrder> order = ReadOrder();
        if (!order) {
            ending.why = "its order cannot be read";
            return false;
        }
        const std::optional<Owner> owner = FindOwner(order->owner, ending.why);
        if (!owner) {
            return false;
        }
        output = OutputWriter::Create(PathOf(kOutputFile));
        if (!output || !pipe.Open()) {
            ending.why = CannotKeepOutput();
            return false;
        }
        command = StartedCommand::Start(*owner, order->command,
                                        CleanEnvironment(*owner, order->environment),
                                        pipe.WritingEnd(), ending.why);
        pipe.CloseWritingEnd();
        if (!command) {
            return false;
        }
        const std::uint64_t start = ProcessStart(command->Id()).value_or(0);
        if (!WriteAll(kSupervisorLock, CommandRecords(command->Id(), start))) {
            syslog(LOG_WARNING, "cannot write the process file: %s", std::strerror(errno));
        }
        return true;
    }

    const std::string name;
    OutputPipe pipe;
    std::optional<OutputWriter> output;
    std::optional<StartedCommand> command;
};

}  // namespace

bool Supervise(const std::string& folder) {
    IgnoreRequestsToEnd();
    ::fcntl(kSupervisorLock, F_SETFD, FD_CLOEXEC);
    if (::chdir(folder.c_str()) != 0) {
        syslog(LOG_ERR, "cannot enter %s: %s", folder.c_str(), std::strerror(errno));
        return false;
    }
    SupervisedRun run(folder);
    const bool written = WriteEnding(run.Run());
    if (!written) {
        syslog(LOG_ERR, "cannot write the ending of %s: %s", folder.c_str(), std::strerror(errno));
    }
    run.Finish();
    return written;
}

}  // namespace orva
