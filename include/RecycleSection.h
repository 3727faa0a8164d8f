// The flat section that recycle-bin tasks keep: its keys and fixed texts, which the command line is
// made from and the editor's form is laid over.
#pragma once

#include <json/value.h>

#include <array>
#include <string>
#include <string_view>

namespace RecycleSection {

constexpr const char* kAction = "recycle_action";
constexpr const char* kCleanAll = "clean_all";
constexpr const char* kShares = "selected_shares";
constexpr const char* kPolicy = "clean_policy";
constexpr const char* kDays = "clean_policy_by_time_day";
constexpr const char* kMegabytes = "clean_policy_by_size_MB_number";
constexpr const char* kSortType = "clean_policy_by_size_sort_type";
constexpr const char* kKeepRules = "advconfig";
constexpr const char* kExtensionCheck = "reserve_policy_extension_check";
constexpr const char* kExtensions = "reserve_policy_extension";

constexpr const char* kPolicyByTime = "clean_policy_by_time";
constexpr const char* kPolicyBySize = "clean_policy_by_size";
constexpr const char* kPolicyDefault = "clean_policy_default";
constexpr const char* kLargeFilesFirst = "Delete large files first";
constexpr const char* kOldFilesFirst = "Delete old files first";

// The form's wish to switch bins on: comes through the section, but is never stored.
constexpr const char* kEnableRecycle = "enableRecycle";

// A rule that keeps files beyond a size, under its names in the form, in the section's
// `kKeepRules` and for the recycle-bin tool.
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

// All members' names.
constexpr std::array<std::string_view, 14> kNames = {
    kAction,
    kCleanAll,
    kShares,
    kPolicy,
    kDays,
    kMegabytes,
    kSortType,
    kKeepRules,
    kExtensionCheck,
    kExtensions,
    kSizeRules[0].check,
    kSizeRules[0].megabytes,
    kSizeRules[1].check,
    kSizeRules[1].megabytes,
};

// Numbers and booleans as their text; empty for null, arrays and objects.
inline std::string TextOf(const Json::Value& value) {
    return value.isConvertibleTo(Json::stringValue) ? value.asString() : std::string();
}

inline bool IsOn(const Json::Value& value) { return TextOf(value) == "on"; }

}  // namespace RecycleSection
