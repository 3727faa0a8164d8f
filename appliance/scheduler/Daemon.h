#pragma once

#include <absl/time/time.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "appliance/scheduler/EventSource.h"
#include "appliance/scheduler/ProcessHost.h"
#include "appliance/scheduler/RuntimeFiles.h"
#include "appliance/scheduler/Scheduler.h"
#include "appliance/util/FileDescriptor.h"

namespace orva {

// The event loop around a scheduler. Asleep until the next start is due, a task was saved or
// queued, a run has ended, the clock or the time zone was set, or a signal has come:
//
//   SIGTERM, SIGINT   end; runs go on
//   SIGHUP            read the configuration again
//
// One at a time in a process; belongs to the thread that makes it.
class Daemon {
  public:
    // `supervisorProgram` is the full path of `orva-run`. The caller holds the scheduler's lock and
    // has blocked the three signals. Throws std::runtime_error when it cannot be set up.
    explicit Daemon(const std::string& supervisorProgram);
    ~Daemon();
    Daemon(const Daemon&) = delete;
    Daemon& operator=(const Daemon&) = delete;

    // Runs until a signal ends it. Yields the program's exit status.
    int Run();

  private:
    // How a member function becomes the callback of an event source.
    template <void (Daemon::*kMember)()>
    static void Call(void* daemon) noexcept;

    void AddSignal(int signalNumber);
    void WatchClock();
    void WatchZone();
    void WatchSocket();
    void ReadConfiguration();

    void OnSignal(int signalNumber);
    void OnClock();
    void OnClockSet();
    void OnMessages();
    void OnWork();
    void OnTrim();

    // Has OnWork called, after the events that have come already.
    void WorkSoon();
    void WorkAfter(std::uint64_t microseconds);
    void WakeAt(absl::Time time);
    void TrimAfter(std::uint64_t microseconds);

    Event event;
    ProcessHost host;
    Scheduler scheduler;
    std::unique_ptr<ControlSocket> socket;
    FileDescriptor clockTimer;
    // After what they watch, so that they are gone before it.
    std::vector<EventSource> sources;
    EventSource workSource;
    EventSource trimSource;
    bool recovered = false;
};

}  // namespace orva
