#include "appliance/store/TaskDocument.h"

#include <algorithm>
#include <array>
#include <string>

#include "appliance/schedule/ScheduleSection.h"

namespace orva {
namespace {

constexpr const char* kSchedule = "schedule";
constexpr const char* kOwner = "owner";
constexpr const char* kApp = "app";
constexpr const char* kAction = "action";

struct TextMember {
    const char* name;
    std::string TaskData::*property;
};
constexpr std::array<TextMember, 4> kTexts = {{
    {"app_name", &TaskData::appName},
    {"app_args", &TaskData::appArgs},
    {"command", &TaskData::command},
    {"edit_form", &TaskData::editForm},
}};

constexpr std::array<std::string_view, 7> kBasicMembers = {
    "id", "task_name", kOwner, "enabled", kApp, kAction, kCanEditNameFlag.name};

bool IsBasicMember(std::string_view name) {
    return std::find(kBasicMembers.begin(), kBasicMembers.end(), name) != kBasicMembers.end();
}

bool IsTaskMember(std::string_view name) {
    const auto called = [name](const auto& member) { return member.name == name; };
    return name == kBasicSection || name == kSchedule ||
           std::any_of(kTexts.begin(), kTexts.end(), called) ||
           std::any_of(kFlagNames.begin(), kFlagNames.end(), called);
}

SectionProblem Refused(const std::string& member, const std::string& reason) {
    return {kErrBadDocument, member + ": " + reason};
}

template <class IsKnown>
std::optional<SectionProblem> UnknownMember(const Json::Value& object, const std::string& prefix,
                                            IsKnown isKnown) {
    if (object.isObject()) {
        for (const std::string& name : object.getMemberNames()) {
            if (!isKnown(name)) {
                return Refused(prefix + name, "unknown member");
            }
        }
    }
    return std::nullopt;
}

std::optional<SectionProblem> ApplyText(const Json::Value& object, const char* name,
                                        const std::string& prefix, std::string& text) {
    const Json::Value* member = FindMember(object, name);
    if (member == nullptr) {
        return std::nullopt;
    }
    if (!member->isString()) {
        return Refused(prefix + name, "is no text");
    }
    text = member->asString();
    return std::nullopt;
}

std::optional<SectionProblem> ApplyFlag(const Json::Value& object, const FlagName& flag,
                                        const std::string& prefix, TaskData& task) {
    const Json::Value* member = FindMember(object, flag.name);
    if (member == nullptr) {
        return std::nullopt;
    }
    if (!member->isBool()) {
        return Refused(prefix + flag.name, "is neither true nor false");
    }
    task.Set(flag.flag, member->asBool());
    return std::nullopt;
}

std::optional<SectionProblem> ApplyBasic(const Json::Value& basic, TaskData& task,
                                         AccountLookup& accounts) {
    const std::string prefix = std::string(kBasicSection) + ".";
    if (auto problem = UnknownMember(basic, prefix, IsBasicMember)) {
        return problem;
    }
    if (auto problem = ApplyBasicSection(basic, task, accounts)) {
        return problem;
    }
    if (task.owner.empty()) {
        return Refused(prefix + kOwner, "is missing");
    }
    if (auto problem = ApplyText(basic, kApp, prefix, task.app)) {
        return problem;
    }
    if (task.app.empty()) {
        return Refused(prefix + kApp, "is missing");
    }
    if (auto problem = ApplyText(basic, kAction, prefix, task.action)) {
        return problem;
    }
    return ApplyFlag(basic, kCanEditNameFlag, prefix, task);
}

}  // namespace

Json::Value TaskDocument(const TaskData& task) {
    Json::Value document(Json::objectValue);
    Json::Value& basic = document[kBasicSection];
    const Json::Value whole = BasicSection(task);
    for (const std::string& name : whole.getMemberNames()) {
        if (IsBasicMember(name)) {
            basic[name] = whole[name];
        }
    }
    document[kSchedule] = ScheduleSection(task.schedule);
    for (const TextMember& text : kTexts) {
        document[text.name] = task.*text.property;
    }
    for (const FlagName& flag : kFlagNames) {
        document[flag.name] = task.Has(flag.flag);
    }
    return document;
}

std::optional<SectionProblem> ApplyTaskDocument(const Json::Value& document, TaskData& task,
                                                AccountLookup& accounts) {
    if (!document.isObject()) {
        return SectionProblem{kErrBadDocument, "is no object"};
    }
    if (auto problem = UnknownMember(document, "", IsTaskMember)) {
        return problem;
    }
    const Json::Value* basic = FindMember(document, kBasicSection);
    if (basic == nullptr) {
        return Refused(kBasicSection, "is missing");
    }
    if (auto problem = ApplyBasic(*basic, task, accounts)) {
        return problem;
    }
    if (const Json::Value* schedule = FindMember(document, kSchedule)) {
        if (auto problem =
                UnknownMember(*schedule, std::string(kSchedule) + ".", IsScheduleMember)) {
            return problem;
        }
        if (auto problem = ApplyScheduleSection(*schedule, task.schedule)) {
            return SectionProblem{kErrBadDocument, *problem};
        }
    }
    for (const TextMember& text : kTexts) {
        if (auto problem = ApplyText(document, text.name, "", task.*text.property)) {
            return problem;
        }
    }
    for (const FlagName& flag : kFlagNames) {
        if (auto problem = ApplyFlag(document, flag, "", task)) {
            return problem;
        }
    }
    return std::nullopt;
}

}  // namespace orva
