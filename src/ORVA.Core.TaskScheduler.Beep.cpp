#include <algorithm>
#include <charconv>
#include <string>
#include <system_error>
#include <utility>

#include "include/JsonMember.h"
#include "include/JsonText.h"
#include "include/TaskSchedulerBeepHandler.h"

namespace {

constexpr int kShortestSeconds = 1;
constexpr int kLongestSeconds = 600;

// A number of any size is brought into the bounds; the text of one counts as the number, because
// the editor starts from the text of a new task's default. jsoncpp judges everything else.
int DurationInBounds(const Json::Value& duration) {
    if (duration.isNumeric()) {
        return static_cast<int>(
            std::clamp<double>(duration.asDouble(), kShortestSeconds, kLongestSeconds));
    }
    if (duration.isString()) {
        const std::string text = duration.asString();
        const char* const last = text.data() + text.size();
        long long seconds = 0;
        const auto [end, error] = std::from_chars(text.data(), last, seconds);
        if (end == last && error == std::errc::result_out_of_range) {
            return text.front() == '-' ? kShortestSeconds : kLongestSeconds;
        }
        if (end == last && error == std::errc()) {
            return static_cast<int>(
                std::clamp<long long>(seconds, kShortestSeconds, kLongestSeconds));
        }
    }
    return std::clamp(duration.asInt(), kShortestSeconds, kLongestSeconds);
}

}  // namespace

bool TaskSchedulerBeepHandler::ConvertToJson_App(const _tag_orva_sched_task_& task,
                                                 Json::Value& document) {
    Json::Value app;
    if (ORVASchedTaskIsNew(task)) {
        app["beep_duration"] = "60";
    } else {
        ParseJsonText(ORVASchedTaskGetAppArgs(task), app);
    }
    document[Key("app")] = std::move(app);
    return true;
}

bool TaskSchedulerBeepHandler::ConvertFromJson_App(const Json::Value& document,
                                                   _tag_orva_sched_task_& task) {
    const Json::Value& app = document["app"];
    ORVASchedCTaskSetEditForm(&task, "ORVA.ZUM.TaskScheduler.Beep.FormPanel");
    ORVASchedCTaskSetSimpleEditForm(&task, 1);
    ORVASchedCTaskSetCanEditName(&task, 1);
    ORVASchedCTaskSetCanEditOwner(&task, 0);
    ORVASchedCTaskSetCanRunAppSameTime(&task, 1);
    ORVASchedCTaskSetListable(&task, 1);
    ORVASchedCTaskSetApp(&task, "ORVA.ZUM.TaskScheduler.Beep");
    ORVASchedCTaskSetAppName(&task, "#beep:beep_title#");
    ORVASchedCTaskSetAppArgs(&task, WriteJsonText(app).c_str());

    const std::string seconds = std::to_string(DurationInBounds(app["beep_duration"]));
    ORVASchedCTaskSetAction(&task,
                            ("#volume:beep_on# " + seconds + " #common:time_seconds#").c_str());
    ORVASchedCTaskSetCommand(&task, ("/tmp/orvaschedtool --beep " + seconds).c_str());
    return true;
}

bool TaskSchedulerBeepHandler::GetAppEditOwnerValue() { return false; }
