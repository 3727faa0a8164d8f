#include "appliance/scheduler/Daemon.h"

#include <signal.h>
#include <sys/epoll.h>
#include <sys/inotify.h>
#include <sys/resource.h>
#include <sys/timerfd.h>
#include <sys/timex.h>
#include <syslog.h>
#include <systemd/sd-daemon.h>
#include <time.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <optional>
#include <stdexcept>
#include <string_view>

#include "appliance/root/Root.h"
#include "appliance/store/SchedulerLink.h"
#include "appliance/store/StoreFailure.h"
#include "platform/conf.h"

namespace orva {
namespace {

constexpr std::uint64_t kSecond = 1'000'000;
// When another process holds the database, and when it is out of order.
constexpr std::uint64_t kBusyRetryInterval = kSecond / 2;
constexpr std::uint64_t kRetryInterval = kSecond * 10;
// A machine's clock may be months ahead until a time service sets it: by such a clock the whole
// history is old.
constexpr std::uint64_t kTrimFirst = kSecond * 3600;
constexpr std::uint64_t kTrimStep = kSecond / 20;
constexpr std::uint64_t kTrimInterval = kSecond * 3600 * 6;

constexpr const char* kMostRunsKey = "schedmaxruns";
constexpr std::size_t kDefaultMostRuns = 64;
constexpr std::size_t kHighestMostRuns = 10'000;
// Descriptors that are open besides one for each run.
constexpr rlim_t kOtherDescriptors = 64;

// Far enough, and no overflow on the way to the kernel.
constexpr std::time_t kNever = std::time_t{1} << 40;

void Check(int result, const char* doing) {
    if (result < 0) {
        throw std::runtime_error(std::string(doing) + ": " + std::strerror(-result));
    }
}

Event NewEvent() {
    sd_event* event = nullptr;
    Check(sd_event_new(&event), "event loop");
    return Event(event);
}

std::unique_ptr<ControlSocket> OpenSocket() {
    std::string error;
    std::unique_ptr<ControlSocket> socket = ControlSocket::Open(error);
    if (socket == nullptr) {
        throw std::runtime_error(error);
    }
    return socket;
}

absl::Duration Uptime() {
    timespec time{};
    ::clock_gettime(CLOCK_BOOTTIME, &time);
    return absl::DurationFromTimespec(time);
}

bool ClockSynchronised() {
    timex state{};
    return ::adjtimex(&state) != TIME_ERROR && (state.status & STA_UNSYNC) == 0;
}

absl::Time ProgramMade() {
    absl::Time made;
    std::string error;
    return absl::ParseTime("%Y-%m-%d", ORVA_BUILD_DATE, &made, &error) ? made
                                                                       : absl::InfinitePast();
}

Scheduler::Options SchedulerOptions() {
    Scheduler::Options options;
    options.programMade = ProgramMade();
    options.uptime = Uptime;
    options.clockSynchronised = ClockSynchronised;
    return options;
}

std::size_t ConfiguredMostRuns() {
    const std::string text = OrvaConf().Def(kMostRunsKey, std::to_string(kDefaultMostRuns));
    std::size_t number = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, problem] = std::from_chars(text.data(), end, number);
    if (problem != std::errc() || stop != end || number < 1 || number > kHighestMostRuns) {
        ::syslog(LOG_ERR, "%s: \"%s\" is no number from 1 to %zu; using %zu", kMostRunsKey,
                 text.c_str(), kHighestMostRuns, kDefaultMostRuns);
        return kDefaultMostRuns;
    }
    return number;
}

// How many of the runs there are descriptors for: one for which there is none would end unstarted
// instead of waiting for its turn. The limit is raised only when many were asked for, since what is
// started here inherits it.
std::size_t RunsWithDescriptors(std::size_t runs) {
    const rlim_t needed = static_cast<rlim_t>(runs) + kOtherDescriptors;
    rlimit limit{};
    if (::getrlimit(RLIMIT_NOFILE, &limit) != 0 || limit.rlim_cur >= needed) {
        return runs;
    }
    limit.rlim_cur = std::min(limit.rlim_max, needed);
    ::setrlimit(RLIMIT_NOFILE, &limit);
    if (limit.rlim_cur == needed) {
        return runs;
    }
    const std::size_t enough =
        limit.rlim_cur > kOtherDescriptors ? limit.rlim_cur - kOtherDescriptors : 1;
    ::syslog(LOG_WARNING, "%s: %zu runs at once, not %zu: the limit on open files is %zu",
             kMostRunsKey, enough, runs, static_cast<std::size_t>(limit.rlim_cur));
    return enough;
}

}  // namespace

template <void (Daemon::*kMember)()>
void Daemon::Call(void* daemon) noexcept {
    (static_cast<Daemon*>(daemon)->*kMember)();
}

Daemon::Daemon(const std::string& supervisorProgram)
    : event(NewEvent()),
      host(event.get(), supervisorProgram,
           [this](std::int64_t run) {
               scheduler.RunEnded(run);
               WorkSoon();
           }),
      scheduler(*TaskStore::Current(), host, SchedulerOptions()),
      socket(OpenSocket()) {
    ReadConfiguration();
    for (const int signalNumber : {SIGTERM, SIGINT, SIGHUP}) {
        AddSignal(signalNumber);
    }
    WatchSocket();
    WatchClock();
    WatchZone();
}

Daemon::~Daemon() = default;

int Daemon::Run() {
    // With no systemd around there is no watchdog, and nobody to notify.
    sd_event_set_watchdog(event.get(), 1);
    WorkSoon();
    TrimAfter(kTrimFirst);
    const int status = sd_event_loop(event.get());
    sd_notify(0, "STOPPING=1");
    return status < 0 ? EXIT_FAILURE : status;
}

void Daemon::AddSignal(int signalNumber) {
    const auto onSignal = [](sd_event_source*, const signalfd_siginfo* info, void* context) {
        static_cast<Daemon*>(context)->OnSignal(static_cast<int>(info->ssi_signo));
        return 0;
    };
    sd_event_source* source = nullptr;
    Check(sd_event_add_signal(event.get(), &source, signalNumber, onSignal, this), "signals");
    sources.emplace_back(source);
}

void Daemon::OnSignal(int signalNumber) {
    if (signalNumber != SIGHUP) {
        sd_event_exit(event.get(), EXIT_SUCCESS);
        return;
    }
    ReadConfiguration();
    ::syslog(LOG_INFO, "the configuration was read again");
    WorkSoon();
}

void Daemon::ReadConfiguration() {
    scheduler.SetMostRuns(RunsWithDescriptors(ConfiguredMostRuns()));
}

void Daemon::WatchSocket() {
    const auto onMessage = [](sd_event_source*, int, std::uint32_t, void* context) {
        Call<&Daemon::OnMessages>(context);
        return 0;
    };
    sd_event_source* source = nullptr;
    Check(sd_event_add_io(event.get(), &source, socket->Descriptor(), EPOLLIN, onMessage, this),
          "socket");
    sources.emplace_back(source);
}

void Daemon::OnMessages() {
    const std::string_view stop = SchedulerLink::kStopMessage;
    while (const std::optional<ControlSocket::Message> message = socket->Receive()) {
        const std::string& text = message->text;
        if (text.compare(0, stop.size(), stop) != 0) {
            WorkSoon();
            continue;
        }
        std::int64_t run = 0;
        const char* const end = text.data() + text.size();
        const auto [parsed, problem] = std::from_chars(text.data() + stop.size(), end, run);
        try {
            socket->Answer(*message, problem == std::errc() && parsed == end
                                         ? scheduler.Stop(run).value_or("")
                                         : "is no number of a run");
        } catch (const StoreFailure& failure) {
            socket->Answer(*message, failure.what());
        }
    }
}

void Daemon::WatchClock() {
    clockTimer = FileDescriptor(::timerfd_create(CLOCK_REALTIME, TFD_NONBLOCK | TFD_CLOEXEC));
    if (!clockTimer.IsOpen()) {
        Check(-errno, "wall-clock timer");
    }
    const auto onClock = [](sd_event_source*, int, std::uint32_t, void* context) {
        Call<&Daemon::OnClock>(context);
        return 0;
    };
    sd_event_source* source = nullptr;
    Check(sd_event_add_io(event.get(), &source, clockTimer.Get(), EPOLLIN, onClock, this),
          "wall-clock timer");
    sources.emplace_back(source);
    // From the beginning, so that no step of the clock is missed.
    WakeAt(absl::InfiniteFuture());
}

void Daemon::OnClock() {
    std::uint64_t expirations = 0;
    if (::read(clockTimer.Get(), &expirations, sizeof expirations) < 0 && errno == ECANCELED) {
        OnClockSet();
    }
    WorkSoon();
}

void Daemon::WakeAt(absl::Time time) {
    itimerspec setting{};
    setting.it_value =
        time == absl::InfiniteFuture() ? timespec{kNever, 0} : absl::ToTimespec(time);
    if (::timerfd_settime(clockTimer.Get(), TFD_TIMER_ABSTIME | TFD_TIMER_CANCEL_ON_SET, &setting,
                          nullptr) != 0 &&
        errno == ECANCELED) {
        // It was set since the timer was last read.
        OnClockSet();
    }
}

void Daemon::OnClockSet() {
    ::syslog(LOG_NOTICE, "the clock was set");
    scheduler.ClockWasSet();
    TrimAfter(kTrimFirst);
    WorkSoon();
}

void Daemon::WatchZone() {
    const auto onChange = [](sd_event_source*, const inotify_event* change, void* context) {
        if (change->len != 0 && std::string_view(change->name) == "localtime") {
            static_cast<Daemon*>(context)->WorkSoon();
        }
        return 0;
    };
    sd_event_source* source = nullptr;
    if (sd_event_add_inotify(event.get(), &source, "/etc",
                             IN_CREATE | IN_MOVED_TO | IN_DELETE | IN_CLOSE_WRITE, onChange,
                             this) < 0) {
        ::syslog(LOG_WARNING,
                 "/etc cannot be watched; a change of the time zone takes effect when something "
                 "else happens");
        return;
    }
    sources.emplace_back(source);
}

void Daemon::WorkSoon() { WorkAfter(0); }

void Daemon::WorkAfter(std::uint64_t microseconds) {
    const auto onTime = [](sd_event_source*, std::uint64_t, void* context) {
        Call<&Daemon::OnWork>(context);
        return 0;
    };
    if (workSource == nullptr) {
        sd_event_source* source = nullptr;
        Check(sd_event_add_time_relative(event.get(), &source, CLOCK_MONOTONIC, microseconds, 1,
                                         onTime, this),
              "timer");
        workSource.reset(source);
        // What ended and what was asked for comes before more is started.
        sd_event_source_set_priority(source, SD_EVENT_PRIORITY_IDLE);
        return;
    }
    sd_event_source_set_time_relative(workSource.get(), microseconds);
    sd_event_source_set_enabled(workSource.get(), SD_EVENT_ONESHOT);
}

void Daemon::OnWork() {
    try {
        if (!recovered) {
            scheduler.Recover();
            recovered = true;
            sd_notify(0, "READY=1");
            std::printf("scheduling the tasks of %s\n", Root().c_str());
            std::fflush(stdout);
        }
        const absl::Time next = scheduler.Work();
        if (next == absl::InfinitePast()) {
            WorkSoon();
        } else {
            WakeAt(next);
        }
    } catch (const StoreFailure& failure) {
        // The store has logged it.
        WorkAfter(failure.Code() == kErrDatabaseBusy ? kBusyRetryInterval : kRetryInterval);
    } catch (const std::exception& problem) {
        ::syslog(LOG_ERR, "%s", problem.what());
        WorkAfter(kRetryInterval);
    }
}

void Daemon::TrimAfter(std::uint64_t microseconds) {
    const auto onTime = [](sd_event_source*, std::uint64_t, void* context) {
        Call<&Daemon::OnTrim>(context);
        return 0;
    };
    sd_event_source* source = nullptr;
    // With the loop's own accuracy, so as to wake up together with others.
    Check(sd_event_add_time_relative(event.get(), &source, CLOCK_MONOTONIC, microseconds, 0, onTime,
                                     this),
          "timer");
    trimSource.reset(source);
    sd_event_source_set_priority(source, SD_EVENT_PRIORITY_IDLE);
}

void Daemon::OnTrim() {
    std::uint64_t wait = kTrimInterval;
    try {
        wait = scheduler.RemoveOldRuns() ? kTrimStep : kTrimInterval;
    } catch (const std::exception&) {
        // The store has logged what is wrong with it.
    }
    TrimAfter(wait);
}

}  // namespace orva
