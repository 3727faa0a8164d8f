// A task as one JSON object, in which all that is stored of it can be written down and read back:
// the sections "basic" and "schedule", and beside them "app_name", "app_args", "command",
// "edit_form" and the flags by name.
#pragma once

#include <json/value.h>

#include <optional>

#include "appliance/store/TaskData.h"
#include "appliance/store/TaskSections.h"

namespace orva {

// Without "next_trigger_time": the document of a task that nobody changed stays the same.
Json::Value TaskDocument(const TaskData& task);

// Lays the document over `task`, which is a stored one (its id says so) or a new one; the id in the
// document is not looked at. Absent and null members keep what the task has; a member of an unknown
// name is refused, since it is most likely a mistyped one. On a refusal `task` may be changed in
// part.
[[nodiscard]] std::optional<SectionProblem> ApplyTaskDocument(const Json::Value& document,
                                                              TaskData& task,
                                                              AccountLookup& accounts);

}  // namespace orva
