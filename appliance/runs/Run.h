// What the history keeps of one start of a task, or of a start that did not happen.
#pragma once

#include <absl/time/time.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace orva {

// Why a task was to start. The texts are stored: they never change.
enum class RunReason { kSchedule, kByHand, kMissed };
inline constexpr std::array<std::string_view, 3> kRunReasonTexts = {"schedule", "hand", "missed"};

// Where a run stands. The texts are stored: they never change.
enum class RunState {
    kQueued,   // waits for its start
    kRunning,  // its process was started, and how it ended is not known yet
    kEnded,
    kSkipped,  // was not started, for the reason in `why`
    kLost,     // was started, and nobody knows how it ended
};
inline constexpr std::array<std::string_view, 5> kRunStateTexts = {"queued", "running", "ended",
                                                                   "skipped", "lost"};

constexpr std::string_view RunReasonText(RunReason reason) {
    return kRunReasonTexts[static_cast<std::size_t>(reason)];
}
constexpr std::string_view RunStateText(RunState state) {
    return kRunStateTexts[static_cast<std::size_t>(state)];
}
// Nothing for any other text.
std::optional<RunReason> ParseRunReason(std::string_view text);
std::optional<RunState> ParseRunState(std::string_view text);

struct Run {
    std::int64_t id = 0;
    int task = 0;
    // The task's name when the run was recorded; stays when the task is renamed or gone.
    std::string taskName;
    // The instant that the schedule names, in whole seconds; none for a run by hand.
    std::optional<absl::Time> occurrence;
    RunReason reason = RunReason::kByHand;
    RunState state = RunState::kQueued;
    // A skipped or lost run: why. An ended one without an exit status or signal: why it could not
    // start; one with either: "stopped" when somebody has stopped it.
    std::string why;
    // When it was recorded. Instants are kept in whole milliseconds.
    absl::Time queuedAt;
    // Who asked for it; both empty when the schedule did.
    std::string askedProgram;
    std::string askedAccount;
    std::optional<absl::Time> startedAt;
    std::optional<absl::Time> endedAt;
    // At most one of the two.
    std::optional<int> exitStatus;
    std::optional<int> signal;
    // All that it printed, kept or not.
    std::uint64_t outputBytes = 0;
};

// What a run printed, raw: all of it when nothing was dropped, else its first and last part.
struct RunOutput {
    // How much of either part is kept.
    static constexpr std::size_t kPartBytes = std::size_t{64} * 1024;

    std::string head;
    std::string tail;
    // How many bytes between the two are gone.
    std::uint64_t dropped = 0;
};

}  // namespace orva
