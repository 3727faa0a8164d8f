// What the scheduler decides, without a clock, a database or a process: which starts are made,
// which are not and why, and in which order what waits is started.
#pragma once

#include <absl/time/time.h>

#include <cstddef>
#include <cstdint>
#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "appliance/runs/Run.h"
#include "appliance/store/NextStartTime.h"
#include "appliance/store/TaskData.h"

namespace orva {

// A start that comes so late still counts as one of its time: the machine was busy, or the
// scheduler was being replaced.
inline constexpr absl::Duration kOnTime = absl::Minutes(1);
// So long a run waits for its start, also over a restart of the scheduler.
inline constexpr absl::Duration kQueuePatience = absl::Hours(1);
// How old the start may be that a task with "run missed" makes up for.
inline constexpr absl::Duration kMissedPatience = absl::Hours(24);

// Why a start did not happen, as the history shows it. Stored: they never change.
inline constexpr std::string_view kWhyOverlap = "overlap";
inline constexpr std::string_view kWhyDisabled = "disabled";
inline constexpr std::string_view kWhyMissed = "missed";
inline constexpr std::string_view kWhyMachineOff = "machine off";
inline constexpr std::string_view kWhyClock = "clock not trusted";
inline constexpr std::string_view kWhyNoCommand = "no command";
inline constexpr std::string_view kWhyDeleted = "deleted";

// What is known besides the task.
struct Moment {
    absl::Time now;
    absl::TimeZone zone;
    // When the machine was started, by the clock as it is now.
    absl::Time machineStarted;
    bool clockTrusted = true;
};

// A start that goes into the history: to wait for its process, or as skipped.
struct PlannedStart {
    StartSecond occurrence = kUnknownStart;
    RunReason reason = RunReason::kSchedule;
    // Empty unless the start is skipped.
    std::string_view why;

    bool operator==(const PlannedStart&) const = default;
};

struct DuePlan {
    // In order of their time.
    std::vector<PlannedStart> starts;
    // The task's next start.
    StartSecond next = kNoStart;
};

// What becomes of a task whose next start, as stored, has come. Of starts that were missed the
// latest one goes into the history and stands for all. `since` says from when on the task has its
// schedule, or is enabled: a save makes no start of a time before it, and has none made up for. One
// in the future says nothing.
DuePlan PlanDueTask(const TaskData& task, StartSecond due, StartSecond since, const Moment& moment);

// Why a run that has waited since then is not started any more; empty when it is.
std::string_view WhyNoLongerStarted(absl::Time since, const Moment& moment);

// The tasks that have a run going on.
class RunningTasks {
  public:
    void Add(int task, const std::string& app);
    void Remove(int task, const std::string& app);

    std::size_t Count() const { return count; }
    // Why the task, whose flags are `flags`, must not be started beside them; empty when it may.
    std::string_view WhyNotBeside(int task, const std::string& app, std::uint16_t flags) const;

  private:
    struct Application {
        std::size_t runs = 0;
        // Of each of its tasks.
        std::map<int, std::size_t> tasks;
    };

    std::map<std::string, Application> applications;
    std::map<int, std::size_t> tasks;
    std::size_t count = 0;
};

// Why a run that waits is not started beside those that go on; empty when it is.
std::string_view WhyNotStarted(const TaskData& task, RunReason reason, const RunningTasks& running);

}  // namespace orva
