#include "appliance/tools/History.h"

#include <absl/time/time.h>

#include <cstdio>
#include <limits>
#include <memory>
#include <string>

#include "appliance/runs/RunDocument.h"
#include "appliance/runs/RunStore.h"
#include "appliance/tools/StoreToRead.h"
#include "appliance/tools/ToolOutput.h"
#include "appliance/webapi/JsonWriter.h"

namespace orva {
namespace {

// A history may hold a million runs: it is read and written in parts.
constexpr std::int64_t kPart = 1000;

// A document without the result that the run does not have: "exit_status" or "signal", not both.
Json::Value HistoryDocument(const Run& run) {
    Json::Value document = RunDocument(run);
    for (const char* member : {"exit_status", "signal"}) {
        if (document[member].isNull()) {
            document.removeMember(member);
        }
    }
    return document;
}

std::string ResultText(const Run& run) {
    std::string result;
    if (run.exitStatus) {
        result = "exit status " + std::to_string(*run.exitStatus);
    } else if (run.signal) {
        result = "signal " + std::to_string(*run.signal);
    }
    if (run.why.empty() || result.empty()) {
        return result + run.why;
    }
    return run.why + " (" + result + ")";
}

// What a terminal would take for a command to it is shown as "?".
std::string Printable(std::string text) {
    for (char& character : text) {
        const auto byte = static_cast<unsigned char>(character);
        character = byte < 0x20 || byte == 0x7f ? '?' : character;
    }
    return text;
}

std::string Line(const Run& run, const absl::TimeZone& zone) {
    const absl::Time shown = run.startedAt.value_or(run.queuedAt);
    std::string length;
    if (run.startedAt && run.endedAt) {
        length =
            absl::FormatDuration(absl::Trunc(*run.endedAt - *run.startedAt, absl::Milliseconds(1)));
    }
    char columns[160];
    std::snprintf(columns, sizeof columns, "%-8lld %-6d %-8s %-8s %-19s %-12s %12llu  ",
                  static_cast<long long>(run.id), run.task,
                  std::string(RunReasonText(run.reason)).c_str(),
                  std::string(RunStateText(run.state)).c_str(),
                  absl::FormatTime("%Y-%m-%d %H:%M:%S", shown, zone).c_str(), length.c_str(),
                  static_cast<unsigned long long>(run.outputBytes));
    const std::string result = ResultText(run);
    return Printable(columns + run.taskName + (result.empty() ? "" : ": " + result)) + "\n";
}

constexpr const char* kTitles =
    "RUN      TASK   REASON   STATE    STARTED             LENGTH             OUTPUT  NAME: "
    "RESULT\n";

}  // namespace

int ShowHistory(std::optional<int> task, bool json) {
    const std::shared_ptr<TaskStore> tasks = TaskStore::Current();
    const absl::TimeZone zone = tasks->Zone();
    RunStore store(tasks);
    std::string text = json ? "[" : kTitles;
    bool first = true;
    std::int64_t last = std::numeric_limits<std::int64_t>::max();
    for (std::int64_t offset = 0;; offset += kPart) {
        const RunStore::Page page =
            HasDatabase() ? store.List({task, {}}, offset, kPart) : RunStore::Page();
        for (const Run& run : page.runs) {
            // New runs push the others along: some of this part were in the one before.
            if (run.id >= last) {
                continue;
            }
            last = run.id;
            if (json) {
                text += first ? "\n " : ",\n ";
                AppendJson(HistoryDocument(run), text);
            } else {
                text += Line(run, zone);
            }
            first = false;
        }
        const bool end = static_cast<std::int64_t>(page.runs.size()) < kPart;
        if (end && json) {
            text += first ? "]\n" : "\n]\n";
        }
        if (const int status = WriteOut(text); status != kToolDone || end) {
            return status;
        }
        text.clear();
    }
}

int ShowRunOutput(std::int64_t run) {
    const std::shared_ptr<RunStore> store = RunStore::Current();
    // The state first: what comes with an ended run is all that will ever come.
    const std::optional<Run> found = HasDatabase() ? store->Find(run) : std::nullopt;
    const std::optional<RunOutput> output = found ? store->Output(run) : std::nullopt;
    if (!output) {
        return Complain("there is no run " + std::to_string(run));
    }
    const int status = WriteOut(output->head + output->tail);
    if (status == kToolDone && found->state == RunState::kRunning) {
        Complain("run " + std::to_string(run) + " still goes on");
    }
    if (status == kToolDone && output->dropped > 0) {
        Complain(std::to_string(output->dropped) + " bytes after the first " +
                 std::to_string(output->head.size()) + " were not kept");
    }
    return status;
}

}  // namespace orva
