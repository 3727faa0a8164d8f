#include <syslog.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "include/JsonMember.h"
#include "include/JsonText.h"
#include "include/TaskSchedulerRecycleHandler.h"
#include "include/lib.h"
#include "platform/qlibc.h"
#include "platform/share.h"

namespace {

constexpr const char* kSourceFile = "ORVA.Core.TaskScheduler.Recycle.cpp";

// The flat section that the task keeps.
constexpr const char* kRecycleAction = "recycle_action";
constexpr const char* kCleanAll = "clean_all";
constexpr const char* kSelectedShares = "selected_shares";
constexpr const char* kCleanPolicy = "clean_policy";
constexpr const char* kDays = "clean_policy_by_time_day";
constexpr const char* kMegabytes = "clean_policy_by_size_MB_number";
constexpr const char* kSortType = "clean_policy_by_size_sort_type";
constexpr const char* kKeepRules = "advconfig";
constexpr const char* kExtensionCheck = "reserve_policy_extension_check";
constexpr const char* kExtensions = "reserve_policy_extension";
constexpr const char* kFileExtension = "file_ext";

constexpr const char* kPolicyByTime = "clean_policy_by_time";
constexpr const char* kPolicyBySize = "clean_policy_by_size";
constexpr const char* kPolicyDefault = "clean_policy_default";
constexpr const char* kLargeFilesFirst = "Delete large files first";
constexpr const char* kOldFilesFirst = "Delete old files first";

// The form.
constexpr const char* kFormShares = "clean_share_policy";
constexpr const char* kFormFiles = "clean_file_policy";
constexpr const char* kFormKeepRules = "reserve_policy";
constexpr int kFormOldFilesFirst = 1;
constexpr int kFormLargeFilesFirst = 0;

// In both.
constexpr const char* kEnableRecycle = "enableRecycle";

constexpr const char* kActionClean = "2";

struct RecycleAction {
    const char* value;
    const char* actionText;
    const char* toolSwitch;
};
constexpr std::array kRecycleActions = {
    RecycleAction{"0", "#share:share_disable_recycle_bin#:", " --disable"},
    RecycleAction{"1", "#share:share_enable_recycle_bin#:", " --enable"},
    RecycleAction{kActionClean, "#schedule:clean_recycle_bin#:", " --clean"},
};

// A rule that keeps files beyond a size, under its names in the form and in the flat section.
struct SizeRule {
    const char* formCheck;
    const char* formMegabytes;
    const char* check;
    const char* megabytes;
    const char* toolSwitch;
};
constexpr std::array kSizeRules = {
    SizeRule{"size_greater_check", "size_greater", "reserve_policy_size_greater_check",
             "reserve_policy_size_greater", " -m "},
    SizeRule{"size_smaller_check", "size_smaller", "reserve_policy_size_smaller_check",
             "reserve_policy_size_smaller", " -l "},
};

// Every kind of share that can have a recycle bin.
constexpr int kShareKinds = 0x30f;
constexpr int kExpectedShares = 100;

struct StringListDeleter {
    void operator()(QLIBC_SZLIST* list) const { QLIBCSzListFree(list); }
};
using StringListPtr = std::unique_ptr<QLIBC_SZLIST, StringListDeleter>;

// Numbers and booleans as their text; empty for null, arrays and objects.
std::string TextOf(const Json::Value& value) {
    return value.isConvertibleTo(Json::stringValue) ? value.asString() : std::string();
}

bool IsOn(const Json::Value& value) { return TextOf(value) == "on"; }

const char* OnOrOff(bool on) { return on ? "on" : "off"; }

// The leading digits of the text as a number; 0 without any.
Json::Value NumberOf(const Json::Value& value) {
    return static_cast<Json::Int64>(std::strtol(TextOf(value).c_str(), nullptr, 10));
}

// jsoncpp's isInt() alone takes 5.0 for an integer, whose text would not be that of one.
bool IsInteger(const Json::Value& value) {
    return value.isInt() && value.type() != Json::realValue;
}

// The member as an object to write to; anything else that stands there gives way to an empty one.
Json::Value& ObjectMember(Json::Value& parent, const char* key) {
    Json::Value& member = parent[key];
    if (!member.isObject()) {
        member = Json::Value(Json::objectValue);
    }
    return member;
}

void LogSection(int line, const char* key, const Json::Value& app) {
    syslog(LOG_ERR, "%s:%d error %s, json app=%s", kSourceFile, line, key,
           app.toStyledString().c_str());
}

// Megabytes as the tool's byte count. The product is that of 32-bit signed arithmetic, widened with
// its sign: the tool takes the counts that this gives from 2048 megabytes upward back as they are
// meant. Numbers beyond a long count as the nearest one, and of every number the low 32 bits count.
std::string BytesOfMegabytes(const Json::Value& megabytes) {
    const long number = std::strtol(TextOf(megabytes).c_str(), nullptr, 10);
    const auto bytes = static_cast<std::int32_t>(static_cast<std::uint32_t>(number) << 20);
    return std::to_string(static_cast<std::uint64_t>(std::int64_t{bytes}));
}

// Elements that are no {"file_ext": text} are passed over.
std::string JoinedExtensions(const Json::Value& extensions) {
    std::string joined;
    const char* separator = "";
    for (const Json::Value& element : extensions) {
        const Json::Value& extension = MemberOf(element, kFileExtension);
        if (extension.isString()) {
            joined += separator + extension.asString();
            separator = ".";
        }
    }
    return joined;
}

void AppendCleanPolicyArgs(const Json::Value& app, std::string& command) {
    const std::string policy = TextOf(app[kCleanPolicy]);
    if (policy == kPolicyByTime) {
        command += " -t " + TextOf(app[kDays]);
    } else if (policy == kPolicyBySize) {
        command += " -s " + BytesOfMegabytes(app[kMegabytes]);
        command += TextOf(app[kSortType]) == kLargeFilesFirst ? " -o 2" : " -o 1";
    }

    const Json::Value& keepRules = app[kKeepRules];
    if (IsOn(MemberOf(keepRules, kExtensionCheck))) {
        // The tool takes the extensions as one word between double quotes; they are the words of
        // the administrator who writes the task and go in as they stand.
        const Json::Value& extensions = MemberOf(keepRules, kExtensions);
        if (extensions.isArray() && !extensions.empty()) {
            command += " -file_ext=\"" + JoinedExtensions(extensions) + "\"";
        }
    }
    for (const SizeRule& rule : kSizeRules) {
        if (IsOn(MemberOf(keepRules, rule.check))) {
            command += rule.toolSwitch + BytesOfMegabytes(MemberOf(keepRules, rule.megabytes));
        }
    }
}

// False when there is no share, an element is no name, or no name could be quoted: a command
// without names means all shares, which nobody chose.
bool AppendShares(const Json::Value& shares, std::string& action, std::string& command) {
    if (!shares.isArray()) {
        return false;
    }
    bool chosen = false;
    for (const Json::Value& share : shares) {
        if (!share.isString()) {
            return false;
        }
        const std::string name = share.asString();
        const std::string word = EscapeShellName(name);
        action += " \"" + name + "\"";
        command += " " + word;
        chosen = chosen || !word.empty();
    }
    return chosen;
}

// The functions below lay a part of the form over the flat section: what the form leaves out, or
// sends with another type, keeps its value there.

void TakeInteger(const Json::Value& form, const char* formKey, Json::Value& flat, const char* key) {
    const Json::Value& number = MemberOf(form, formKey);
    if (IsInteger(number)) {
        flat[key] = number.asString();
    }
}

void TakePolicy(const Json::Value& formFiles, Json::Value& flat) {
    const Json::Value& policy = MemberOf(formFiles, "policy");
    if (policy == "size") {
        flat[kCleanPolicy] = kPolicyBySize;
        TakeInteger(formFiles, "size", flat, kMegabytes);
        const Json::Value& sortType = formFiles["sort_type"];
        if (IsInteger(sortType)) {
            flat[kSortType] =
                sortType.asInt() == kFormOldFilesFirst ? kOldFilesFirst : kLargeFilesFirst;
        }
    } else if (policy == "time") {
        flat[kCleanPolicy] = kPolicyByTime;
        TakeInteger(formFiles, "time", flat, kDays);
    } else if (policy.isString()) {
        flat[kCleanPolicy] = kPolicyDefault;
    }
}

void TakeKeepRules(const Json::Value& formRules, Json::Value& flat) {
    for (const SizeRule& rule : kSizeRules) {
        const Json::Value& check = MemberOf(formRules, rule.formCheck);
        if (check.isBool()) {
            Json::Value& keepRules = ObjectMember(flat, kKeepRules);
            keepRules[rule.check] = OnOrOff(check.asBool());
            if (check.asBool()) {
                TakeInteger(formRules, rule.formMegabytes, keepRules, rule.megabytes);
            }
        }
    }
    const Json::Value& check = MemberOf(formRules, "extension_check");
    if (check.isBool()) {
        Json::Value& keepRules = ObjectMember(flat, kKeepRules);
        keepRules[kExtensionCheck] = OnOrOff(check.asBool());
        const Json::Value& extensions = formRules["extension"];
        if (check.asBool() && extensions.isArray()) {
            keepRules[kExtensions] = extensions;
        }
    }
}

}  // namespace

bool TaskSchedulerRecycleHandler::ConvertToJson_App(const _tag_orva_sched_task_& task,
                                                    Json::Value& document) {
    Json::Value app;
    if (ORVASchedTaskIsNew(task)) {
        app[kRecycleAction] = kActionClean;
        app[kCleanAll] = "yes";
    } else {
        ParseJsonText(ORVASchedTaskGetAppArgs(task), app);
    }
    document["app"] = std::move(app);
    return true;
}

bool TaskSchedulerRecycleHandler::ConvertFromJson_App(const Json::Value& document,
                                                      _tag_orva_sched_task_& task) {
    ORVASchedCTaskSetEditForm(&task, "ORVA.ZUM.TaskScheduler.Recycle.FormPanel");
    ORVASchedCTaskSetSimpleEditForm(&task, 1);
    ORVASchedCTaskSetCanEditName(&task, 1);
    ORVASchedCTaskSetCanEditOwner(&task, 0);
    ORVASchedCTaskSetCanRunAppSameTime(&task, 1);
    ORVASchedCTaskSetListable(&task, 1);
    ORVASchedCTaskSetApp(&task, "ORVA.ZUM.TaskScheduler.Recycle");
    ORVASchedCTaskSetAppName(&task, "#share:recycle_bin#");

    // Enabling happens once, with this save: a later read or save must not find the wish again.
    Json::Value stored = document["app"];
    Json::Value enableRecycle;
    stored.removeMember(kEnableRecycle, &enableRecycle);
    const Json::Value& app = stored;
    ORVASchedCTaskSetAppArgs(&task, WriteJsonText(app).c_str());

    const std::string actionValue = TextOf(app[kRecycleAction]);
    const auto* const recycleAction =
        std::find_if(kRecycleActions.begin(), kRecycleActions.end(),
                     [&](const RecycleAction& row) { return actionValue == row.value; });
    if (recycleAction == kRecycleActions.end()) {
        LogSection(__LINE__, kRecycleAction, app);
        return false;
    }
    std::string action = recycleAction->actionText;
    std::string command = std::string("/usr/orva/bin/orvarecycle") + recycleAction->toolSwitch;

    Json::Value shares(Json::arrayValue);
    if (TextOf(app[kCleanAll]) == "no") {
        if (!AppendShares(app[kSelectedShares], action, command)) {
            LogSection(__LINE__, kSelectedShares, app);
            return false;
        }
        shares = app[kSelectedShares];
    } else {
        action = "#share:share_clean_all_recycle_bin#";
    }
    if (actionValue == kActionClean) {
        AppendCleanPolicyArgs(app, command);
    }
    ORVASchedCTaskSetAction(&task, action.c_str());
    ORVASchedCTaskSetCommand(&task, command.c_str());

    if (!enableRecycle.isNull()) {
        // The task is good without the bins; what went wrong with them stands in the log.
        EnableRecycleBin(shares, enableRecycle);
    }
    return true;
}

bool TaskSchedulerRecycleHandler::ReConstructJsonGet_App(Json::Value& app) {
    if (!app.isObject()) {
        app = Json::Value(Json::objectValue);
    }

    Json::Value& formShares = ObjectMember(app, kFormShares);
    formShares["clean_all"] = TextOf(app[kCleanAll]) == "yes";
    formShares["shares"] = std::move(app[kSelectedShares]);

    Json::Value& formFiles = ObjectMember(app, kFormFiles);
    const std::string policy = TextOf(app[kCleanPolicy]);
    if (policy == kPolicyBySize) {
        formFiles["policy"] = "size";
        formFiles["size"] = NumberOf(app[kMegabytes]);
        formFiles["sort_type"] =
            TextOf(app[kSortType]) == kLargeFilesFirst ? kFormLargeFilesFirst : kFormOldFilesFirst;
    } else if (policy == kPolicyByTime) {
        formFiles["policy"] = "time";
        formFiles["time"] = NumberOf(app[kDays]);
    } else {
        formFiles["policy"] = "clean_all";
    }

    const Json::Value& keepRules = app[kKeepRules];
    Json::Value& formRules = ObjectMember(formFiles, kFormKeepRules);
    for (const SizeRule& rule : kSizeRules) {
        const bool check = IsOn(MemberOf(keepRules, rule.check));
        formRules[rule.formCheck] = check;
        if (check) {
            formRules[rule.formMegabytes] = NumberOf(MemberOf(keepRules, rule.megabytes));
        }
    }
    const bool extensionCheck = IsOn(MemberOf(keepRules, kExtensionCheck));
    formRules["extension_check"] = extensionCheck;
    if (extensionCheck) {
        formRules["extension"] = MemberOf(keepRules, kExtensions);
    }

    for (const char* key : {kCleanAll, kSelectedShares, kCleanPolicy, kRecycleAction, kMegabytes,
                            kDays, kSortType, kKeepRules}) {
        app.removeMember(key);
    }
    return true;
}

bool TaskSchedulerRecycleHandler::ReConstructJsonSet_App(Json::Value& app) {
    Json::Value flat;
    if (!GetOriginAppObj(flat)) {
        return false;
    }
    if (!flat.isObject()) {
        flat = Json::Value(Json::objectValue);
    }

    const Json::Value& form = app;
    if (form.isMember(kEnableRecycle)) {
        flat[kEnableRecycle] = form[kEnableRecycle];
    }

    const Json::Value& formShares = form[kFormShares];
    if (MemberOf(formShares, "shares").isArray()) {
        flat[kSelectedShares] = formShares["shares"];
    }
    if (MemberOf(formShares, "clean_all").isBool()) {
        flat[kCleanAll] = formShares["clean_all"].asBool() ? "yes" : "no";
    }

    const Json::Value& formFiles = form[kFormFiles];
    TakePolicy(formFiles, flat);
    TakeKeepRules(MemberOf(formFiles, kFormKeepRules), flat);

    app = std::move(flat);
    return true;
}

bool TaskSchedulerRecycleHandler::GetAppEditOwnerValue() { return false; }

bool TaskSchedulerRecycleHandler::EnableRecycleBin(const Json::Value& shares,
                                                   const Json::Value& enableRecycle) {
    const std::string choice = enableRecycle.asString();
    std::vector<std::string> names;
    if (choice == "select") {
        for (const Json::Value& share : shares) {
            if (share.isString()) {
                names.push_back(share.asString());
            }
        }
    } else {
        const StringListPtr list(QLIBCSzListAlloc(kExpectedShares));
        if (list == nullptr) {
            syslog(LOG_ERR, "%s:%d malloc failed", kSourceFile, __LINE__);
            return false;
        }
        if (ORVAShareEnum(list.get(), kShareKinds) < 0) {
            syslog(LOG_ERR, "%s:%d enum share failed", kSourceFile, __LINE__);
            return false;
        }
        for (int index = 0; index < list->count; ++index) {
            if (const char* name = QLIBCSzListGet(list.get(), index)) {
                names.emplace_back(name);
            }
        }
        if (choice == "all_include_home") {
            names.emplace_back("home");
        }
    }

    for (const std::string& name : names) {
        if (ORVARecycleStatusSet(name.c_str(), 1) < 0) {
            syslog(LOG_ERR, "%s:%d enable share=%s recycle bin failed", kSourceFile, __LINE__,
                   name.c_str());
        }
    }
    return true;
}
