#include <syslog.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "include/JsonMember.h"
#include "include/JsonText.h"
#include "include/RecycleSection.h"
#include "include/TaskSchedulerRecycleHandler.h"
#include "include/lib.h"
#include "platform/qlibc.h"
#include "platform/share.h"

namespace {

using namespace RecycleSection;

constexpr const char* kSourceFile = "ORVA.Core.TaskScheduler.Recycle.cpp";

constexpr const char* kFileExtension = "file_ext";
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

// Every kind of share that can have a recycle bin.
constexpr int kShareKinds = 0x30f;
constexpr int kExpectedShares = 100;

struct StringListDeleter {
    void operator()(QLIBC_SZLIST* list) const { QLIBCSzListFree(list); }
};
using StringListPtr = std::unique_ptr<QLIBC_SZLIST, StringListDeleter>;

void LogSection(int line, const char* key, const Json::Value& app) {
    syslog(LOG_ERR, "%s:%d error %s, json app=%s", kSourceFile, line, key,
           app.toStyledString().c_str());
}

// Megabytes as the tool's byte count. The product is that of 32-bit signed arithmetic, widened with
// its sign. The tool takes the counts of 2048 to 4095 megabytes back as they are meant; at 4096 the
// product is 0 again. Numbers beyond a long count as the nearest one.
std::string BytesOfMegabytes(const Json::Value& megabytes) {
    const long number = std::strtol(TextOf(megabytes).c_str(), nullptr, 10);
    const auto bytes = static_cast<std::int32_t>(static_cast<std::uint32_t>(number) << 20);
    return std::to_string(static_cast<std::uint64_t>(std::int64_t{bytes}));
}

// The rule's extensions as the tool's one word, empty when there are none. None for a list that is
// none, for an element that is no {"file_ext": text}, and for texts that name no extension: with
// the check on, losing one would remove files that somebody asked to keep.
std::optional<std::string> JoinedExtensions(const Json::Value& extensions) {
    if (extensions.isNull()) {
        return std::string();
    }
    if (!extensions.isArray()) {
        return std::nullopt;
    }
    std::string joined;
    const char* separator = "";
    for (const Json::Value& element : extensions) {
        const Json::Value& extension = MemberOf(element, kFileExtension);
        if (!extension.isString()) {
            return std::nullopt;
        }
        joined += separator + extension.asString();
        separator = ".";
    }
    // The tool takes dots for separators, and refuses a word that holds nothing but these.
    const bool named = joined.find_first_not_of(". \t") != std::string::npos;
    return named || extensions.empty() ? std::optional(joined) : std::nullopt;
}

// False, with `command` half written, when the extensions to keep are none.
bool AppendCleanPolicyArgs(const Json::Value& app, std::string& command) {
    const std::string policy = TextOf(app[kPolicy]);
    if (policy == kPolicyByTime) {
        command += " -t " + TextOf(app[kDays]);
    } else if (policy == kPolicyBySize) {
        command += " -s " + BytesOfMegabytes(app[kMegabytes]);
        command += TextOf(app[kSortType]) == kLargeFilesFirst ? " -o 2" : " -o 1";
    }

    const Json::Value& keepRules = app[kKeepRules];
    if (IsOn(MemberOf(keepRules, kExtensionCheck))) {
        const std::optional<std::string> extensions =
            JoinedExtensions(MemberOf(keepRules, kExtensions));
        if (!extensions) {
            return false;
        }
        // The tool takes the extensions as one word between double quotes; they are the words of
        // the administrator who writes the task and go in as they stand.
        if (!extensions->empty()) {
            command += " -file_ext=\"" + *extensions + "\"";
        }
    }
    for (const SizeRule& rule : kSizeRules) {
        if (IsOn(MemberOf(keepRules, rule.check))) {
            command += rule.toolSwitch + BytesOfMegabytes(MemberOf(keepRules, rule.megabytes));
        }
    }
    return true;
}

// Whether the tool would take the name for a rule, and the one after it for the rule's number. No
// share can have such a name.
bool ReadsAsRule(const std::string& name) {
    constexpr std::array<std::string_view, 5> kRules = {"-t", "-s", "-o", "-m", "-l"};
    return std::find(kRules.begin(), kRules.end(), name) != kRules.end() ||
           name.rfind("-file_ext=", 0) == 0;
}

// False when there is no share, an element is no name, or no name could be quoted: a command
// without names means all shares, which nobody chose.
bool AppendShares(const Json::Value& shares, std::string& action, std::string& command) {
    if (!shares.isArray()) {
        return false;
    }
    bool chosen = false;
    for (const Json::Value& share : shares) {
        if (!share.isString() || ReadsAsRule(share.asString())) {
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

}  // namespace

bool TaskSchedulerRecycleHandler::ConvertToJson_App(const _tag_orva_sched_task_& task,
                                                    Json::Value& document) {
    Json::Value app;
    if (ORVASchedTaskIsNew(task)) {
        app[Key(kAction)] = kActionClean;
        app[Key(kCleanAll)] = "yes";
    } else {
        ParseJsonText(ORVASchedTaskGetAppArgs(task), app, kNames);
    }
    document[Key("app")] = std::move(app);
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
    const Json::Value& given = document["app"];
    Json::Value enableRecycle;
    Json::Value withoutWish;
    const bool wishes = given.isObject() && given.isMember(kEnableRecycle);
    if (wishes) {
        withoutWish = given;
        withoutWish.removeMember(kEnableRecycle, &enableRecycle);
    }
    const Json::Value& app = wishes ? withoutWish : given;
    ORVASchedCTaskSetAppArgs(&task, WriteJsonText(app).c_str());

    const std::string actionValue = TextOf(app[kAction]);
    const auto* const recycleAction =
        std::find_if(kRecycleActions.begin(), kRecycleActions.end(),
                     [&](const RecycleAction& row) { return actionValue == row.value; });
    if (recycleAction == kRecycleActions.end()) {
        LogSection(__LINE__, kAction, app);
        return false;
    }
    std::string action = recycleAction->actionText;
    std::string command = std::string("/usr/orva/bin/orvarecycle") + recycleAction->toolSwitch;

    Json::Value shares(Json::arrayValue);
    if (TextOf(app[kCleanAll]) == "no") {
        if (!AppendShares(app[kShares], action, command)) {
            LogSection(__LINE__, kShares, app);
            return false;
        }
        shares = app[kShares];
    } else {
        action = "#share:share_clean_all_recycle_bin#";
    }
    if (actionValue == kActionClean && !AppendCleanPolicyArgs(app, command)) {
        LogSection(__LINE__, kExtensions, app);
        return false;
    }
    ORVASchedCTaskSetAction(&task, action.c_str());
    ORVASchedCTaskSetCommand(&task, command.c_str());

    if (!enableRecycle.isNull()) {
        // The task is good without the bins; what went wrong with them stands in the log.
        EnableRecycleBin(shares, enableRecycle);
    }
    return true;
}

bool TaskSchedulerRecycleHandler::GetAppEditOwnerValue() { return false; }

bool TaskSchedulerRecycleHandler::EnableRecycleBin(const Json::Value& shares,
                                                   const Json::Value& enableRecycle) {
    const std::string choice = enableRecycle.asString();
    // The names belong to `shares` and to the list, which lives until all of them are used.
    std::vector<const char*> names;
    StringListPtr list;
    if (choice == "select") {
        for (const Json::Value& share : shares) {
            if (share.isString()) {
                names.push_back(share.asCString());
            }
        }
    } else {
        list.reset(QLIBCSzListAlloc(kExpectedShares));
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
                names.push_back(name);
            }
        }
        if (choice == "all_include_home") {
            names.push_back("home");
        }
    }

    for (const char* name : names) {
        if (ORVARecycleStatusSet(name, 1) < 0) {
            syslog(LOG_ERR, "%s:%d enable share=%s recycle bin failed", kSourceFile, __LINE__,
                   name);
        }
    }
    return true;
}
