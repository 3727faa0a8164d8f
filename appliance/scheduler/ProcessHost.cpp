#include "appliance/scheduler/ProcessHost.h"

#include <signal.h>
#include <sys/epoll.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <syslog.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include "appliance/supervisor/RunFolder.h"
#include "appliance/supervisor/SupervisorStart.h"

namespace orva {
namespace {

constexpr std::uint64_t kMillisecond = 1000;
// How often a supervisor is looked for that has not said yet which process it is. It does so within
// its first milliseconds.
constexpr std::uint64_t kLookInterval = 20 * kMillisecond;
// How often a folder is tried again that could not be read.
constexpr std::uint64_t kReadInterval = 500 * kMillisecond;
// How often a signal is tried again that a command could not be sent.
constexpr std::uint64_t kStopInterval = 100 * kMillisecond;
constexpr std::uint64_t kTimeToStop = 10'000 * kMillisecond;

// Whether errno says that it may be otherwise in a moment.
bool LacksResources() { return errno == EMFILE || errno == ENFILE || errno == ENOMEM; }

}  // namespace

// What is known of a run that goes on.
struct ProcessHost::Watch {
    Watch(ProcessHost& owner, std::int64_t id) : host(owner), run(id), folder(id) {}

    ProcessHost& host;
    const std::int64_t run;
    const RunFolder folder;
    // Whose end is waited for: the supervisor, or the killed shell of one that is gone.
    FileDescriptor process;
    EventSource processSource;
    EventSource lookTimer;
    EventSource stopTimer;
    // When the command is killed; 0 until a stop was asked for.
    std::uint64_t killAt = 0;
    bool wasAskedToEnd = false;
    bool wasKilledAbandoned = false;
    bool saidUnreadable = false;
};

ProcessHost::ProcessHost(sd_event* eventLoop, std::string supervisorProgram,
                         std::function<void(std::int64_t)> runEnded)
    : event(eventLoop),
      program(std::move(supervisorProgram)),
      onEnded(std::move(runEnded)),
      bootId(orva::BootId()) {}

ProcessHost::~ProcessHost() = default;

std::optional<std::string> ProcessHost::Prepare(const RunOrder& order) {
    std::string error;
    std::optional<FileDescriptor> lock = RunFolder(order.run).Create(order, error);
    if (!lock) {
        return error;
    }
    prepared[order.run] = *std::move(lock);
    return std::nullopt;
}

std::optional<std::string> ProcessHost::Start(std::int64_t run) {
    std::string error;
    const auto lock = prepared.extract(run);
    const std::optional<pid_t> child =
        StartSupervisor(program, RunFolder(run), std::move(lock.mapped()), error);
    if (!child) {
        return error;
    }
    WatchProcess(Observe(run),
                 FileDescriptor(static_cast<int>(::syscall(SYS_pidfd_open, *child, 0))));
    return std::nullopt;
}

RunHost::Trace ProcessHost::Look(std::int64_t run) {
    if (watches.count(run) != 0) {
        return Trace::kGoesOn;
    }
    switch (RunFolder(run).Look()) {
        case RunFolder::State::kNotBegun:
            return Trace::kNotBegun;
        case RunFolder::State::kEnded:
            return Trace::kOver;
        case RunFolder::State::kAbandoned:
            if (!KillAbandoned(Observe(run))) {
                watches.erase(run);
                return Trace::kOver;
            }
            return Trace::kGoesOn;
        case RunFolder::State::kSupervised:
        case RunFolder::State::kUnknown:
            break;
    }
    // From the loop: it may have ended by now.
    LookLater(Observe(run), 0);
    return Trace::kGoesOn;
}

std::optional<RunRemains> ProcessHost::Remains(std::int64_t run) const {
    const RunFolder folder(run);
    errno = 0;
    RunRemains remains;
    remains.ending = folder.Ending();
    if (!remains.ending && LacksResources()) {
        return std::nullopt;
    }
    if (!remains.ending && notBegun.count(run) != 0) {
        // It cannot be started at all, perhaps: another try might end the same way, for ever.
        remains.ending.emplace();
        remains.ending->ended = RunTimeNow();
        remains.ending->why = "cannot start " + program + ": it ended before its first step";
    }
    if (std::optional<StoredOutput> output = folder.Output()) {
        remains.output = *std::move(output);
    } else if (LacksResources()) {
        return std::nullopt;
    }
    return remains;
}

void ProcessHost::Remove(std::int64_t run) {
    watches.erase(run);
    prepared.erase(run);
    notBegun.erase(run);
    // A folder that cannot be removed has been logged; the next scheduler tries again.
    static_cast<void>(RunFolder(run).Remove());
}

std::vector<std::int64_t> ProcessHost::All() const { return RunFolder::All(); }

void ProcessHost::Stop(std::int64_t run) {
    const auto found = watches.find(run);
    if (found == watches.end()) {
        return;
    }
    Watch& watch = *found->second;
    ResumeStop(watch);
    if (watch.killAt != 0) {
        return;
    }
    watch.killAt = MonotonicNow() + kTimeToStop;
    // Before the first signal: a supervisor whose shell that ends must know why.
    if (!watch.folder.RecordStop(watch.killAt)) {
        syslog(LOG_ERR, "cannot record the stop of run %lld: %s", static_cast<long long>(run),
               std::strerror(errno));
    }
    ContinueStop(watch);
}

ProcessHost::Watch& ProcessHost::Observe(std::int64_t run) {
    std::unique_ptr<Watch>& watch = watches[run];
    watch = std::make_unique<Watch>(*this, run);
    return *watch;
}

void ProcessHost::WatchProcess(Watch& watch, FileDescriptor process) {
    sd_event_source* source = nullptr;
    const auto onExit = [](sd_event_source*, int, std::uint32_t, void* context) {
        Watch& over = *static_cast<Watch*>(context);
        over.processSource.reset();
        over.process = FileDescriptor();
        over.host.LookAgain(over);
        return 0;
    };
    if (!process.IsOpen() ||
        sd_event_add_io(event, &source, process.Get(), EPOLLIN, onExit, &watch) < 0) {
        // No descriptor left, perhaps.
        LookLater(watch, kLookInterval);
        return;
    }
    watch.process = std::move(process);
    watch.processSource.reset(source);
}

void ProcessHost::LookLater(Watch& watch, std::uint64_t delay) {
    sd_event_source* source = nullptr;
    const auto onTime = [](sd_event_source*, std::uint64_t, void* context) {
        Watch& waiting = *static_cast<Watch*>(context);
        waiting.host.LookAgain(waiting);
        return 0;
    };
    if (sd_event_add_time_relative(event, &source, CLOCK_MONOTONIC, delay, 1, onTime, &watch) < 0) {
        syslog(LOG_ERR, "run %lld cannot be watched", static_cast<long long>(watch.run));
        return;
    }
    watch.lookTimer.reset(source);
}

void ProcessHost::LookAgain(Watch& watch) {
    switch (watch.folder.Look()) {
        case RunFolder::State::kSupervised:
            if (FileDescriptor process = watch.folder.WatchSupervisor(); process.IsOpen()) {
                WatchProcess(watch, std::move(process));
                ResumeStop(watch);
            } else {
                LookLater(watch, kLookInterval);
            }
            return;
        case RunFolder::State::kUnknown:
            if (!std::exchange(watch.saidUnreadable, true)) {
                syslog(LOG_ERR, "cannot read %s for now: %s", watch.folder.Path().c_str(),
                       std::strerror(errno));
            }
            LookLater(watch, kReadInterval);
            return;
        case RunFolder::State::kAbandoned:
            if (!KillAbandoned(watch)) {
                End(watch);
            }
            return;
        case RunFolder::State::kNotBegun:
            notBegun.insert(watch.run);
            End(watch);
            return;
        case RunFolder::State::kEnded:
            End(watch);
            return;
    }
}

// False when there is nothing to wait for.
bool ProcessHost::KillAbandoned(Watch& watch) {
    if (watch.wasKilledAbandoned) {
        return false;
    }
    errno = 0;
    FileDescriptor shell = watch.folder.KillAbandonedCommand();
    if (!shell.IsOpen() && LacksResources()) {
        LookLater(watch, kReadInterval);
        return true;
    }
    watch.wasKilledAbandoned = true;
    if (!shell.IsOpen()) {
        return false;
    }
    syslog(LOG_WARNING, "the supervisor of run %lld is gone; its command was killed",
           static_cast<long long>(watch.run));
    WatchProcess(watch, std::move(shell));
    return true;
}

// Goes on with a stop that another host was asked for.
void ProcessHost::ResumeStop(Watch& watch) {
    if (watch.killAt != 0) {
        return;
    }
    const std::optional<RunProcess> process = watch.folder.Process();
    if (process && process->killAt != 0) {
        watch.killAt = process->killAt;
        ContinueStop(watch);
    }
}

void ProcessHost::ContinueStop(Watch& watch) {
    const std::uint64_t now = MonotonicNow();
    std::uint64_t next = now + kStopInterval;
    if (now >= watch.killAt) {
        static_cast<void>(watch.folder.SignalCommand(SIGKILL));
    } else {
        // Not yet, when the command is only just being started.
        watch.wasAskedToEnd = watch.wasAskedToEnd || watch.folder.SignalCommand(SIGTERM);
        next = watch.wasAskedToEnd ? watch.killAt : std::min(next, watch.killAt);
    }
    sd_event_source* source = nullptr;
    const auto onTime = [](sd_event_source*, std::uint64_t, void* context) {
        Watch& stopping = *static_cast<Watch*>(context);
        stopping.host.ContinueStop(stopping);
        return 0;
    };
    if (sd_event_add_time(event, &source, CLOCK_MONOTONIC, next, 1, onTime, &watch) >= 0) {
        watch.stopTimer.reset(source);
    }
}

void ProcessHost::End(Watch& watch) {
    // Of those that are children of this process; also of runs that it has forgotten.
    while (::waitpid(-1, nullptr, WNOHANG) > 0) {
    }
    const std::int64_t run = watch.run;
    watches.erase(run);
    onEnded(run);
}

}  // namespace orva
