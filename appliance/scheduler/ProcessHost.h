#pragma once

#include <sys/types.h>

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "appliance/scheduler/EventSource.h"
#include "appliance/scheduler/RunHost.h"
#include "appliance/util/FileDescriptor.h"

namespace orva {

// Runs as processes of this machine: each has a supervisor of its own, `orva-run`, which outlives
// the scheduler, and a folder in which that records what happens.
//
// Belongs to the thread of the event loop.
class ProcessHost final : public RunHost {
  public:
    // `supervisorProgram` is the full path of `orva-run`. `runEnded` is called from the loop.
    ProcessHost(sd_event* eventLoop, std::string supervisorProgram,
                std::function<void(std::int64_t)> runEnded);
    ~ProcessHost() override;

    const std::string& BootId() const override { return bootId; }
    std::optional<std::string> Prepare(const RunOrder& order) override;
    std::optional<std::string> Start(std::int64_t run) override;
    Trace Look(std::int64_t run) override;
    std::optional<RunRemains> Remains(std::int64_t run) const override;
    void Remove(std::int64_t run) override;
    std::vector<std::int64_t> All() const override;
    // SIGTERM to the command's process group, SIGKILL 10 seconds later: by this host, or by the one
    // that finds the run going on then.
    void Stop(std::int64_t run) override;

  private:
    struct Watch;

    Watch& Observe(std::int64_t run);
    void WatchProcess(Watch& watch, FileDescriptor process);
    void LookLater(Watch& watch, std::uint64_t delay);
    void LookAgain(Watch& watch);
    bool KillAbandoned(Watch& watch);
    void ResumeStop(Watch& watch);
    void ContinueStop(Watch& watch);
    void End(Watch& watch);

    sd_event* event;
    const std::string program;
    const std::function<void(std::int64_t)> onEnded;
    const std::string bootId;
    // The locks of runs that were prepared and have not begun.
    std::map<std::int64_t, FileDescriptor> prepared;
    std::map<std::int64_t, std::unique_ptr<Watch>> watches;
    // Whose supervisor has ended before its first step.
    std::set<std::int64_t> notBegun;
};

}  // namespace orva
