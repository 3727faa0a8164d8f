#include "appliance/scheduler/Planner.h"

#include "appliance/scheduler/PassedStarts.h"

namespace orva {
namespace {

std::string_view WhyMissed(absl::Time start, const Moment& moment) {
    return start < moment.machineStarted ? kWhyMachineOff : kWhyMissed;
}

PlannedStart Skipped(StartSecond occurrence, std::string_view why) {
    return {occurrence, RunReason::kSchedule, why};
}

// A save made while this is planned may be a little later than `now`. One that is later still was
// made by a clock that was ahead: nobody knows when that was.
StartSecond KnownSince(StartSecond since, const Moment& moment) {
    return absl::FromUnixSeconds(since) > moment.now + kOnTime ? kUnknownStart : since;
}

PlannedStart PlanLatest(const TaskData& task, StartSecond latest, StartSecond since,
                        const Moment& moment) {
    if (!task.Has(kEnabled)) {
        return Skipped(latest, kWhyDisabled);
    }
    if (!moment.clockTrusted) {
        return Skipped(latest, kWhyClock);
    }
    const absl::Time start = absl::FromUnixSeconds(latest);
    const absl::Duration late = moment.now - start;
    const bool onTime = late <= kOnTime;
    const bool madeUpFor = task.schedule.runMissed && late <= kMissedPatience && latest > since;
    if (!onTime && !madeUpFor) {
        return Skipped(latest, WhyMissed(start, moment));
    }
    if (task.command.empty()) {
        return Skipped(latest, kWhyNoCommand);
    }
    return {latest, onTime ? RunReason::kSchedule : RunReason::kMissed, {}};
}

}  // namespace

DuePlan PlanDueTask(const TaskData& task, StartSecond due, StartSecond since,
                    const Moment& moment) {
    since = KnownSince(since, moment);
    DuePlan plan;
    plan.next = ComputeNextStart(task, moment.zone, moment.now);
    if (!task.Has(kEnabled)) {
        // Of its starts only the stored one came while it was still enabled.
        plan.starts.push_back(Skipped(due, kWhyDisabled));
        return plan;
    }
    const PassedStarts passed =
        FindPassedStarts(task.schedule, moment.zone, due, since, moment.now);
    const PlannedStart latest = PlanLatest(task, passed.latest, since, moment);
    if (passed.before && latest.why.empty() && latest.reason == RunReason::kSchedule) {
        const absl::Time before = absl::FromUnixSeconds(*passed.before);
        plan.starts.push_back(Skipped(*passed.before, WhyMissed(before, moment)));
    }
    plan.starts.push_back(latest);
    return plan;
}

std::string_view WhyNoLongerStarted(absl::Time since, const Moment& moment) {
    return moment.now - since <= kQueuePatience ? std::string_view() : WhyMissed(since, moment);
}

void RunningTasks::Add(int task, const std::string& app) {
    ++count;
    ++tasks[task];
    Application& application = applications[app];
    ++application.runs;
    ++application.tasks[task];
}

void RunningTasks::Remove(int task, const std::string& app) {
    const auto application = applications.find(app);
    const auto own = tasks.find(task);
    if (application == applications.end() || own == tasks.end()) {
        return;
    }
    --count;
    if (--own->second == 0) {
        tasks.erase(own);
    }
    const auto ofApplication = application->second.tasks.find(task);
    if (ofApplication != application->second.tasks.end() && --ofApplication->second == 0) {
        application->second.tasks.erase(ofApplication);
    }
    if (--application->second.runs == 0) {
        applications.erase(application);
    }
}

std::string_view RunningTasks::WhyNotBeside(int task, const std::string& app,
                                            std::uint16_t flags) const {
    if ((flags & kCanRunTaskSameTime) == 0 && tasks.count(task) != 0) {
        return kWhyOverlap;
    }
    if ((flags & kCanRunAppSameTime) == 0) {
        const auto application = applications.find(app);
        if (application != applications.end() &&
            application->second.runs > (application->second.tasks.count(task) != 0
                                            ? application->second.tasks.at(task)
                                            : 0)) {
            return kWhyOverlap;
        }
    }
    return {};
}

std::string_view WhyNotStarted(const TaskData& task, RunReason reason,
                               const RunningTasks& running) {
    // Switched off means not by itself: people may still start it.
    if (!task.Has(kEnabled) && reason != RunReason::kByHand) {
        return kWhyDisabled;
    }
    if (task.command.empty()) {
        return kWhyNoCommand;
    }
    return running.WhyNotBeside(task.id, task.app, task.flags);
}

}  // namespace orva
