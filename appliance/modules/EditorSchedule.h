#pragma once

#include <json/value.h>

#include <optional>
#include <string>

#include "appliance/schedule/Schedule.h"

namespace orva {

// Reads a schedule in the form that the task editor has it in, in which "week_day", "repeat_date"
// and "minute" stand for the stored form's "week_name", "repeat" and "min". What is absent is that
// of a new task. On a member that is refused, as saving would refuse it, yields what is wrong, as
// in "schedule.minute: is no integer from 0 to 59".
[[nodiscard]] std::optional<std::string> ReadEditorSchedule(Json::Value form, Schedule& schedule);

}  // namespace orva
