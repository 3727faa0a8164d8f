#include "appliance/modules/EditorSchedule.h"

#include <array>
#include <utility>

#include "appliance/schedule/ScheduleSection.h"

namespace orva {
namespace {

struct Renamed {
    const char* inEditor;
    const char* stored;
};
constexpr std::array<Renamed, 3> kRenamed = {
    {{"week_day", "week_name"}, {"repeat_date", "repeat"}, {"minute", "min"}}};

// A refusal names the member as it is stored; whoever sent it knows it by the other name.
std::string WithEditorsName(std::string problem) {
    constexpr std::string_view kPrefix = "schedule.";
    const std::size_t colon = problem.find(':');
    for (const Renamed& each : kRenamed) {
        if (problem.substr(0, colon) == std::string(kPrefix) + each.stored) {
            problem.replace(kPrefix.size(), colon - kPrefix.size(), each.inEditor);
            break;
        }
    }
    return problem;
}

}  // namespace

std::optional<std::string> ReadEditorSchedule(Json::Value form, Schedule& schedule) {
    if (form.isObject()) {
        for (const Renamed& each : kRenamed) {
            form.removeMember(each.stored);
            Json::Value value;
            if (form.removeMember(each.inEditor, &value)) {
                form[each.stored] = std::move(value);
            }
        }
    }
    Schedule read;
    if (const std::optional<std::string> problem = ApplyScheduleSection(form, read)) {
        return WithEditorsName(*problem);
    }
    schedule = read;
    return std::nullopt;
}

}  // namespace orva
