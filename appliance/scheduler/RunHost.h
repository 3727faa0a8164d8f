#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "appliance/supervisor/OutputFile.h"
#include "appliance/supervisor/RunRecords.h"

namespace orva {

// The processes of runs and what they leave behind, as the scheduler deals with them. Whoever hosts
// them calls Scheduler::RunEnded once for each run that it has begun or found going on.
class RunHost {
  public:
    virtual ~RunHost() = default;

    // Names the present boot of the machine.
    virtual const std::string& BootId() const = 0;

    // Begins a run. Nothing when it has begun, else why it could not.
    [[nodiscard]] virtual std::optional<std::string> Start(const RunOrder& order) = 0;

    enum class Trace {
        kNotBegun,  // its command was not started and never will be
        kGoesOn,    // or nobody can tell now
        kOver,      // ended, with its ending or without
    };
    // What a run has come to that another scheduler was to start, in this boot. One that nobody
    // cares for any more is over when its command has been killed.
    virtual Trace Look(std::int64_t run) = 0;

    // How a run ended; nothing when nobody knows.
    virtual std::optional<RunEnding> Ending(std::int64_t run) const = 0;
    virtual StoredOutput Output(std::int64_t run) const = 0;

    // Forgets a run that is over or was not begun, with all that it has left.
    virtual void Remove(std::int64_t run) = 0;
    // The runs that have left something behind.
    virtual std::vector<std::int64_t> All() const = 0;

    // Ends the command of a run that goes on: politely, and by force after a while.
    virtual void Stop(std::int64_t run) = 0;
};

}  // namespace orva
