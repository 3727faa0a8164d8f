// The section "basic" of a task's document, and what is allowed in it.
#pragma once

#include <json/value.h>

#include <array>
#include <map>
#include <optional>
#include <string>
#include <string_view>

#include "appliance/store/TaskData.h"
#include "appliance/util/Error.h"

namespace orva {

// Why a document was refused: "basic.owner: no account named \"x\"".
struct SectionProblem {
    ErrorCode code;
    std::string text;
};

// Answers whether an account exists, and remembers it for as long as one piece of work lasts: the
// name services may be slow.
class AccountLookup {
  public:
    bool Exists(const std::string& name);

  private:
    std::map<std::string, bool> known;
};

// The section's name in a task's document.
inline constexpr const char* kBasicSection = "basic";

// The yes-or-no properties as documents call them; "enabled" is not among them, it has its own
// form.
struct FlagName {
    const char* name;
    TaskFlag flag;
};
inline constexpr FlagName kCanEditNameFlag = {"can_edit_name", kCanEditName};
inline constexpr std::array<FlagName, 9> kFlagNames = {{
    {"simple_edit_form", kSimpleEditForm},
    kCanEditNameFlag,
    {"can_edit_owner", kCanEditOwner},
    {"can_run_task_same_time", kCanRunTaskSameTime},
    {"can_run_app_same_time", kCanRunAppSameTime},
    {"listable", kListable},
    {"can_run_from_ui", kCanRunFromUI},
    {"can_edit_from_ui", kCanEditFromUI},
    {"can_delete_from_ui", kCanDeleteFromUI},
}};

// The member of that name; null when it is absent or null, or `object` is no object.
const Json::Value* FindMember(const Json::Value& object, const char* name);

// The task's id that the section names: the decimal text of an id, or the integer that documents
// are written with; kNewTaskId for -1. Nothing when it is neither.
std::optional<int> ParseTaskId(const Json::Value& id);

// What is wrong with a task's name; nothing when it may be one: 1 to 255 bytes of UTF-8, not all of
// them blank, without control characters, code points that are no characters, the byte order mark
// and what turns the direction of writing.
std::optional<std::string> NameProblem(std::string_view name);

// What is wrong with a task's command; nothing when it may be one: 131,071 bytes at most. The
// kernel starts no program with a longer argument, so no shell could be given it.
std::optional<std::string> CommandProblem(std::string_view command);

// Applies "task_name", "owner" and "enabled" of the section to `task`, which holds what the task
// with its id holds now. Absent and null members keep that. On a refused member `task` may be
// changed in part.
[[nodiscard]] std::optional<SectionProblem> ApplyBasicSection(const Json::Value& basic,
                                                              TaskData& task,
                                                              AccountLookup& accounts);

// The section with all that can be applied, and "id", "app", "action" and the flags.
Json::Value BasicSection(const TaskData& task);

// `text` in quotes, with what could upset a terminal or a log replaced.
std::string Quoted(std::string_view text);

}  // namespace orva
