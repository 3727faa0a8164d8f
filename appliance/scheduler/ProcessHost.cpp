#include "appliance/scheduler/ProcessHost.h"

#include <signal.h>
#include <sys/epoll.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <syslog.h>
#include <time.h>
#include <unistd.h>

#include <utility>

#include "appliance/supervisor/RunFolder.h"
#include "appliance/supervisor/SupervisorStart.h"

namespace orva {
namespace {

constexpr std::uint64_t kMillisecond = 1000;
// How often a supervisor is looked for that has not said yet which process it is. It does so within
// its first milliseconds.
constexpr std::uint64_t kLookInterval = 20 * kMillisecond;
// How often a signal is tried again that a command could not be sent.
constexpr std::uint64_t kStopInterval = 100 * kMillisecond;
constexpr std::uint64_t kTimeToStop = 10'000 * kMillisecond;

std::uint64_t MonotonicNow(sd_event* event) {
    std::uint64_t now = 0;
    sd_event_now(event, CLOCK_MONOTONIC, &now);
    return now;
}

}  // namespace

// What is known of a run that goes on.
struct ProcessHost::Watch {
    Watch(ProcessHost& owner, std::int64_t id) : host(owner), run(id), folder(id) {}

    ProcessHost& host;
    const std::int64_t run;
    const RunFolder folder;
    // Of the supervisor, when it is a child of this process; else 0.
    pid_t child = 0;
    FileDescriptor process;
    EventSource processSource;
    EventSource lookTimer;
    EventSource stopTimer;
    // When the command is killed; 0 until it has been asked to end.
    std::uint64_t killAt = 0;
};

ProcessHost::ProcessHost(sd_event* eventLoop, std::string supervisorProgram,
                         std::function<void(std::int64_t)> runEnded)
    : event(eventLoop),
      program(std::move(supervisorProgram)),
      onEnded(std::move(runEnded)),
      bootId(orva::BootId()) {}

ProcessHost::~ProcessHost() = default;

std::optional<std::string> ProcessHost::Start(const RunOrder& order) {
    RunFolder folder(order.run);
    std::string error;
    std::optional<FileDescriptor> lock = folder.Create(order, error);
    if (!lock) {
        return error;
    }
    const std::optional<pid_t> child = StartSupervisor(program, folder, *std::move(lock), error);
    if (!child) {
        folder.Remove();
        return error;
    }
    Watch& watch = Observe(order.run);
    watch.child = *child;
    WatchProcess(watch, FileDescriptor(static_cast<int>(::syscall(SYS_pidfd_open, *child, 0))));
    return std::nullopt;
}

RunHost::Trace ProcessHost::Look(std::int64_t run) {
    const RunFolder folder(run);
    if (folder.Ending()) {
        return Trace::kOver;
    }
    if (folder.IsSupervised()) {
        LookAgain(Observe(run));
        return Trace::kGoesOn;
    }
    if (folder.Ending()) {
        return Trace::kOver;
    }
    // A supervisor says who it is before it starts the command.
    return folder.Process() ? Trace::kOver : Trace::kNotBegun;
}

std::optional<RunEnding> ProcessHost::Ending(std::int64_t run) const {
    return RunFolder(run).Ending();
}

StoredOutput ProcessHost::Output(std::int64_t run) const {
    return RunFolder(run).Output().value_or(StoredOutput());
}

void ProcessHost::Remove(std::int64_t run) {
    watches.erase(run);
    // A folder that cannot be removed has been logged; the next scheduler tries again.
    static_cast<void>(RunFolder(run).Remove());
}

std::vector<std::int64_t> ProcessHost::All() const { return RunFolder::All(); }

void ProcessHost::Stop(std::int64_t run) {
    const auto watch = watches.find(run);
    if (watch != watches.end() && watch->second->killAt == 0) {
        StopNow(*watch->second);
    }
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
        over.host.End(over);
        return 0;
    };
    if (!process.IsOpen() ||
        sd_event_add_io(event, &source, process.Get(), EPOLLIN, onExit, &watch) < 0) {
        // No descriptor left, perhaps.
        LookLater(watch);
        return;
    }
    watch.process = std::move(process);
    watch.processSource.reset(source);
}

void ProcessHost::LookLater(Watch& watch) {
    sd_event_source* source = nullptr;
    const auto onTime = [](sd_event_source*, std::uint64_t, void* context) {
        Watch& waiting = *static_cast<Watch*>(context);
        waiting.host.LookAgain(waiting);
        return 0;
    };
    if (sd_event_add_time_relative(event, &source, CLOCK_MONOTONIC, kLookInterval, 1, onTime,
                                   &watch) < 0) {
        syslog(LOG_ERR, "run %lld cannot be watched", static_cast<long long>(watch.run));
        return;
    }
    watch.lookTimer.reset(source);
}

void ProcessHost::LookAgain(Watch& watch) {
    // In this order: between the two the supervisor may have ended.
    FileDescriptor process = watch.folder.WatchSupervisor();
    if (process.IsOpen()) {
        WatchProcess(watch, std::move(process));
    } else if (watch.folder.IsSupervised()) {
        LookLater(watch);
    } else {
        End(watch);
    }
}

void ProcessHost::StopNow(Watch& watch) {
    const std::uint64_t now = MonotonicNow(event);
    std::uint64_t next = now + kStopInterval;
    if (watch.killAt == 0) {
        // Not yet, when the command is only just being started.
        if (watch.folder.SignalCommand(SIGTERM)) {
            watch.killAt = now + kTimeToStop;
            next = watch.killAt;
        }
    } else {
        static_cast<void>(watch.folder.SignalCommand(SIGKILL));
    }
    sd_event_source* source = nullptr;
    const auto onTime = [](sd_event_source*, std::uint64_t, void* context) {
        Watch& stopping = *static_cast<Watch*>(context);
        stopping.host.StopNow(stopping);
        return 0;
    };
    if (sd_event_add_time(event, &source, CLOCK_MONOTONIC, next, 1, onTime, &watch) >= 0) {
        watch.stopTimer.reset(source);
    }
}

void ProcessHost::End(Watch& watch) {
    if (watch.child != 0) {
        ::waitpid(watch.child, nullptr, WNOHANG);
    }
    const std::int64_t run = watch.run;
    watches.erase(run);
    onEnded(run);
}

}  // namespace orva
