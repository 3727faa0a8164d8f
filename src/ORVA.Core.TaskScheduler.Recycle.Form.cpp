// The editor's form of a recycle-bin task, and the flat section that the task keeps.
#include <cstdlib>
#include <string>
#include <utility>

#include "include/JsonMember.h"
#include "include/RecycleSection.h"
#include "include/TaskSchedulerRecycleHandler.h"

namespace {

using namespace RecycleSection;

constexpr const char* kFormShares = "clean_share_policy";
constexpr const char* kFormFiles = "clean_file_policy";
constexpr const char* kFormKeepRules = "reserve_policy";
constexpr int kFormOldFilesFirst = 1;
constexpr int kFormLargeFilesFirst = 0;

const char* OnOrOff(bool on) { return on ? "on" : "off"; }

// The leading digits of the text as a number; 0 without any.
Json::Value NumberOf(const Json::Value& value) {
    return static_cast<Json::Int64>(std::strtol(TextOf(value).c_str(), nullptr, 10));
}

// The member as an object to write to; anything else that stands there gives way to an empty one.
Json::Value& ObjectMember(Json::Value& parent, const char* key) {
    Json::Value& member = parent[Key(key)];
    if (!member.isObject()) {
        member = Json::Value(Json::objectValue);
    }
    return member;
}

// The functions below lay a part of the form over the flat section: what the form leaves out, or
// sends with another type, keeps its value there.

void TakeInteger(const Json::Value& form, const char* formKey, Json::Value& flat, const char* key) {
    const Json::Value& number = MemberOf(form, formKey);
    if (IsJsonInteger(number)) {
        flat[Key(key)] = number.asString();
    }
}

void TakePolicy(const Json::Value& formFiles, Json::Value& flat) {
    const Json::Value& policy = MemberOf(formFiles, "policy");
    if (policy == "size") {
        flat[Key(kPolicy)] = kPolicyBySize;
        TakeInteger(formFiles, "size", flat, kMegabytes);
        const Json::Value& sortType = formFiles["sort_type"];
        if (IsJsonInteger(sortType)) {
            const bool oldFirst = sortType.isInt() && sortType.asInt() == kFormOldFilesFirst;
            flat[Key(kSortType)] = oldFirst ? kOldFilesFirst : kLargeFilesFirst;
        }
    } else if (policy == "time") {
        flat[Key(kPolicy)] = kPolicyByTime;
        TakeInteger(formFiles, "time", flat, kDays);
    } else if (policy.isString()) {
        flat[Key(kPolicy)] = kPolicyDefault;
    }
}

void TakeKeepRules(const Json::Value& formRules, Json::Value& flat) {
    for (const SizeRule& rule : kSizeRules) {
        const Json::Value& check = MemberOf(formRules, rule.formCheck);
        if (check.isBool()) {
            Json::Value& keepRules = ObjectMember(flat, kKeepRules);
            keepRules[Key(rule.check)] = OnOrOff(check.asBool());
            if (check.asBool()) {
                TakeInteger(formRules, rule.formMegabytes, keepRules, rule.megabytes);
            }
        }
    }
    const Json::Value& check = MemberOf(formRules, "extension_check");
    if (check.isBool()) {
        Json::Value& keepRules = ObjectMember(flat, kKeepRules);
        keepRules[Key(kExtensionCheck)] = OnOrOff(check.asBool());
        const Json::Value& extensions = formRules["extension"];
        if (check.asBool() && extensions.isArray()) {
            keepRules[Key(kExtensions)] = extensions;
        }
    }
}

}  // namespace

bool TaskSchedulerRecycleHandler::ReConstructJsonGet_App(Json::Value& app) {
    if (!app.isObject()) {
        app = Json::Value(Json::objectValue);
    }

    Json::Value& formShares = ObjectMember(app, kFormShares);
    formShares[Key("clean_all")] = TextOf(app[kCleanAll]) == "yes";
    formShares[Key("shares")] = std::move(app[kShares]);

    Json::Value& formFiles = ObjectMember(app, kFormFiles);
    const std::string policy = TextOf(app[kPolicy]);
    if (policy == kPolicyBySize) {
        formFiles[Key("policy")] = "size";
        formFiles[Key("size")] = NumberOf(app[kMegabytes]);
        formFiles[Key("sort_type")] =
            TextOf(app[kSortType]) == kLargeFilesFirst ? kFormLargeFilesFirst : kFormOldFilesFirst;
    } else if (policy == kPolicyByTime) {
        formFiles[Key("policy")] = "time";
        formFiles[Key("time")] = NumberOf(app[kDays]);
    } else {
        formFiles[Key("policy")] = "clean_all";
    }

    const Json::Value& keepRules = app[kKeepRules];
    Json::Value& formRules = ObjectMember(formFiles, kFormKeepRules);
    for (const SizeRule& rule : kSizeRules) {
        const bool check = IsOn(MemberOf(keepRules, rule.check));
        formRules[Key(rule.formCheck)] = check;
        if (check) {
            formRules[Key(rule.formMegabytes)] = NumberOf(MemberOf(keepRules, rule.megabytes));
        }
    }
    const bool extensionCheck = IsOn(MemberOf(keepRules, kExtensionCheck));
    formRules[Key("extension_check")] = extensionCheck;
    if (extensionCheck) {
        formRules[Key("extension")] = MemberOf(keepRules, kExtensions);
    }

    for (const char* key :
         {kCleanAll, kShares, kPolicy, kAction, kMegabytes, kDays, kSortType, kKeepRules}) {
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
        flat[Key(kEnableRecycle)] = form[kEnableRecycle];
    }

    const Json::Value& formShares = form[kFormShares];
    if (MemberOf(formShares, "shares").isArray()) {
        flat[Key(kShares)] = formShares["shares"];
    }
    if (MemberOf(formShares, "clean_all").isBool()) {
        flat[Key(kCleanAll)] = formShares["clean_all"].asBool() ? "yes" : "no";
    }

    const Json::Value& formFiles = form[kFormFiles];
    TakePolicy(formFiles, flat);
    TakeKeepRules(MemberOf(formFiles, kFormKeepRules), flat);

    app = std::move(flat);
    return true;
}
