// The section "schedule" of a task's document: the schedule's form in JSON.
#pragma once

#include <json/value.h>

#include <optional>
#include <string>
#include <string_view>

#include "appliance/schedule/Schedule.h"

namespace orva {

// Lays the members of `section` over `schedule`; absent and null members keep what it has, unknown
// ones are ignored. A null section changes nothing. On a member that is refused yields what is
// wrong, as in "schedule.hour: is no integer from 0 to 23", and leaves `schedule` unchanged. Never
// throws on a document, whatever its types.
[[nodiscard]] std::optional<std::string> ApplyScheduleSection(const Json::Value& section,
                                                              Schedule& schedule);

// All members but "next_trigger_time", which only the store knows.
Json::Value ScheduleSection(const Schedule& schedule);

// Whether the section has a member of that name, "next_trigger_time" included.
bool IsScheduleMember(std::string_view name);

}  // namespace orva
