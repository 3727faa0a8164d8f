#include "appliance/tools/ComingStarts.h"

#include <json/value.h>

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "appliance/schedule/StartText.h"
#include "appliance/schedule/StartTimes.h"
#include "appliance/store/TaskStore.h"
#include "appliance/tools/StoreToRead.h"
#include "appliance/tools/ToolOutput.h"
#include "appliance/webapi/JsonWriter.h"

namespace orva {
namespace {

constexpr const char* kUtcForm = "%Y-%m-%dT%H:%M:%SZ";
constexpr const char* kLocalForm = "%Y-%m-%dT%H:%M:%S%Ez";

std::string AsJson(const std::vector<Start>& starts, const absl::TimeZone& zone) {
    std::string text = "[";
    for (const Start& start : starts) {
        Json::Value document(Json::objectValue);
        document["utc"] = absl::FormatTime(kUtcForm, start.at, absl::UTCTimeZone());
        document["local"] = absl::FormatTime(kLocalForm, start.at, zone);
        if (const std::string_view note = ClockChangeNote(start.change); !note.empty()) {
            document["note"] = std::string(note);
        }
        text += text.size() > 1 ? ",\n " : "\n ";
        AppendJson(document, text);
    }
    return text + (starts.empty() ? "]\n" : "\n]\n");
}

std::string AsLines(const std::vector<Start>& starts, const absl::TimeZone& zone) {
    std::string text;
    for (const Start& start : starts) {
        text += FormatLocalMinute(start.at, zone) + " " + FormatOffset(start.at, zone) + "  " +
                absl::FormatTime(kUtcForm, start.at, absl::UTCTimeZone());
        if (const std::string_view note = ClockChangeNote(start.change); !note.empty()) {
            text.append("  ").append(note);
        }
        text += '\n';
    }
    return text;
}

}  // namespace

int ShowComingStarts(const ComingStartsRequest& request) {
    if (request.count < 1 || request.count > ComingStartsRequest::kMost) {
        return ComplainOfUsage("--next shows 1 to " + std::to_string(ComingStartsRequest::kMost) +
                               " starts");
    }
    const std::shared_ptr<TaskStore> current = TaskStore::Current();
    TaskStore& store = *current;
    absl::TimeZone zone = store.Zone();
    if (!request.zone.empty() && !absl::LoadTimeZone(request.zone, &zone)) {
        return ComplainOfUsage("--zone: no time zone \"" + request.zone + "\"");
    }
    absl::Time from = store.Now();
    if (!request.from.empty()) {
        const std::optional<absl::Time> instant = ParseUtcInstant(request.from);
        if (!instant) {
            return ComplainOfUsage("--from needs a UTC instant such as 2027-01-31T12:00:00Z");
        }
        from = *instant;
    }
    const SharedTask task = HasDatabase() ? store.Find(request.task) : nullptr;
    if (task == nullptr) {
        return Complain("there is no task " + std::to_string(request.task));
    }
    std::vector<Start> starts;
    if (task->Has(kEnabled)) {
        starts = NextStarts(task->schedule, zone, from, static_cast<std::size_t>(request.count));
    } else {
        Complain("task " + std::to_string(request.task) + " is disabled");
    }
    return WriteOut(request.json ? AsJson(starts, zone) : AsLines(starts, zone));
}

}  // namespace orva
