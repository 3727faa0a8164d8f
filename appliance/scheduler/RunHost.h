#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "appliance/supervisor/OutputFile.h"
#include "appliance/supervisor/RunRecords.h"

namespace orva {

// What a run that is over has left.
struct RunRemains {
    // Nothing when nobody knows how it ended.
    std::optional<RunEnding> ending;
    StoredOutput output;
};

// The processes of runs and what they leave behind, as the scheduler deals with them. Whoever hosts
// them calls Scheduler::RunEnded once for each run that it has begun or found going on, unless it
// was to forget it before.
class RunHost {
  public:
    virtual ~RunHost() = default;

    // Names the present boot of the machine.
    virtual const std::string& BootId() const = 0;

    // Makes what a run needs. From then on there is a trace of it, so that it can be told whether
    // it has begun: without one, it may have. Nothing when that is done, else why it cannot be.
    [[nodiscard]] virtual std::optional<std::string> Prepare(const RunOrder& order) = 0;
    // Begins a run that was prepared. Nothing when it has begun, else why it could not.
    [[nodiscard]] virtual std::optional<std::string> Start(std::int64_t run) = 0;

    enum class Trace {
        kNotBegun,  // its command was not started and never will be
        kGoesOn,    // or nobody can tell now
        kOver,      // ended, with its ending or without; or there is no trace of it
    };
    // What a run has come to that another scheduler was to start, in this boot. One that nobody
    // cares for any more is over when its command has been killed.
    //
    // That a run which goes on has ended may be told before this returns.
    virtual Trace Look(std::int64_t run) = 0;

    // Nothing, with errno, when that cannot be read for now.
    virtual std::optional<RunRemains> Remains(std::int64_t run) const = 0;

    // Forgets a run, with all that it has left. One that goes on does so without anybody knowing.
    virtual void Remove(std::int64_t run) = 0;
    // The runs that have left something behind.
    virtual std::vector<std::int64_t> All() const = 0;

    // Ends the command of a run that goes on: politely, and by force after a while.
    virtual void Stop(std::int64_t run) = 0;
};

}  // namespace orva
