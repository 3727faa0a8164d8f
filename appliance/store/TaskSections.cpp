#include "appliance/store/TaskSections.h"

#include <charconv>

#include "appliance/store/Accounts.h"
#include "appliance/util/Utf8.h"

namespace orva {
namespace {

constexpr std::size_t kLongestName = 255;
// Linux: 32 pages of 4 KiB, with the NUL at the end.
constexpr std::size_t kLongestCommand = 131'071;
constexpr std::size_t kLongestQuote = 80;

bool IsControl(unsigned char byte) { return byte < 0x20 || byte == 0x7f; }

// Whether the UTF-8 text holds a control character beyond ASCII: U+0080 to U+009F, and the line and
// paragraph separators U+2028 and U+2029.
bool HasWideControl(std::string_view text) {
    for (std::size_t at = 0; at + 1 < text.size(); ++at) {
        const auto first = static_cast<unsigned char>(text[at]);
        const auto second = static_cast<unsigned char>(text[at + 1]);
        if (first == 0xc2 && second < 0xa0) {
            return true;
        }
        if (first == 0xe2 && second == 0x80 && at + 2 < text.size()) {
            const auto third = static_cast<unsigned char>(text[at + 2]);
            if (third == 0xa8 || third == 0xa9) {
                return true;
            }
        }
    }
    return false;
}

SectionProblem Refused(const char* member, const std::string& reason,
                       ErrorCode code = kErrBadDocument) {
    return {code, "basic." + std::string(member) + ": " + reason};
}

std::optional<SectionProblem> ApplyName(const Json::Value& basic, TaskData& task) {
    constexpr const char* kMember = "task_name";
    const bool stored = task.id != kNewTaskId;
    const Json::Value* name = FindMember(basic, kMember);
    if (name == nullptr) {
        if (task.name.empty()) {
            return Refused(kMember, "is missing");
        }
        return std::nullopt;
    }
    if (!name->isString()) {
        return Refused(kMember, "is no text");
    }
    const std::string text = name->asString();
    if (stored && text == task.name) {
        return std::nullopt;
    }
    if (const auto problem = NameProblem(text)) {
        return Refused(kMember, *problem);
    }
    if (stored && !task.Has(kCanEditName)) {
        return Refused(kMember, "may not be changed", kErrNotAllowed);
    }
    task.name = text;
    return std::nullopt;
}

std::optional<SectionProblem> ApplyOwner(const Json::Value& basic, TaskData& task,
                                         AccountLookup& accounts) {
    constexpr const char* kMember = "owner";
    const bool stored = task.id != kNewTaskId;
    const Json::Value* owner = FindMember(basic, kMember);
    if (owner == nullptr) {
        return std::nullopt;
    }
    if (!owner->isString()) {
        return Refused(kMember, "is no text");
    }
    const std::string text = owner->asString();
    // An editor sends back what it was given, be the account gone since or not.
    if (stored && text == task.owner) {
        return std::nullopt;
    }
    if (stored && !task.Has(kCanEditOwner)) {
        return Refused(kMember, "may not be changed", kErrNotAllowed);
    }
    if (!accounts.Exists(text)) {
        return Refused(kMember, "no account named " + Quoted(text));
    }
    task.owner = text;
    return std::nullopt;
}

std::optional<SectionProblem> ApplyEnabled(const Json::Value& basic, TaskData& task) {
    constexpr const char* kMember = "enabled";
    const Json::Value* enabled = FindMember(basic, kMember);
    if (enabled == nullptr) {
        return std::nullopt;
    }
    const std::string text = enabled->isString() ? enabled->asString() : "";
    if (text != "on" && text != "off") {
        return Refused(kMember, "is neither \"on\" nor \"off\"");
    }
    task.Set(kEnabled, text == "on");
    return std::nullopt;
}

}  // namespace

bool AccountLookup::Exists(const std::string& name) {
    const auto found = known.find(name);
    if (found != known.end()) {
        return found->second;
    }
    return known[name] = AccountExists(name);
}

const Json::Value* FindMember(const Json::Value& object, const char* name) {
    if (!object.isObject()) {
        return nullptr;
    }
    const Json::Value* member = object.find(name, name + std::char_traits<char>::length(name));
    return member == nullptr || member->isNull() ? nullptr : member;
}

std::optional<int> ParseTaskId(const Json::Value& id) {
    // Json's isInt() also holds for 5.0.
    const bool integer = id.type() == Json::intValue || id.type() == Json::uintValue;
    int number = 0;
    if (integer && id.isInt()) {
        number = id.asInt();
    } else if (id.isString()) {
        const std::string text = id.asString();
        const char* end = text.data() + text.size();
        const auto [stop, error] = std::from_chars(text.data(), end, number);
        if (error != std::errc() || stop != end) {
            return std::nullopt;
        }
    } else {
        return std::nullopt;
    }
    return number >= 1 || number == kNewTaskId ? std::optional(number) : std::nullopt;
}

std::optional<std::string> NameProblem(std::string_view name) {
    if (name.empty()) {
        return "is empty";
    }
    if (name.size() > kLongestName) {
        return "is longer than 255 bytes";
    }
    if (ValidUtf8Length(name) != name.size()) {
        return "is no UTF-8 text";
    }
    for (const char character : name) {
        if (IsControl(static_cast<unsigned char>(character))) {
            return "holds a control character";
        }
    }
    if (HasWideControl(name)) {
        return "holds a control character";
    }
    return std::nullopt;
}

std::optional<std::string> CommandProblem(std::string_view command) {
    if (command.size() > kLongestCommand) {
        return "is longer than " + std::to_string(kLongestCommand) + " bytes";
    }
    return std::nullopt;
}

std::optional<SectionProblem> ApplyBasicSection(const Json::Value& basic, TaskData& task,
                                                AccountLookup& accounts) {
    if (!basic.isObject()) {
        return SectionProblem{kErrBadDocument, "basic: is no object"};
    }
    if (auto problem = ApplyName(basic, task)) {
        return problem;
    }
    if (auto problem = ApplyOwner(basic, task, accounts)) {
        return problem;
    }
    return ApplyEnabled(basic, task);
}

Json::Value BasicSection(const TaskData& task) {
    // Static texts are not copied into the section; nearly every request builds one.
    using Static = Json::StaticString;
    Json::Value basic(Json::objectValue);
    basic[Static("id")] = task.id;
    basic[Static("task_name")] = task.name;
    basic[Static("owner")] = task.owner;
    basic[Static("enabled")] = Static(task.Has(kEnabled) ? "on" : "off");
    basic[Static("app")] = task.app;
    basic[Static("action")] = task.action;
    for (const FlagName& each : kFlagNames) {
        basic[Static(each.name)] = task.Has(each.flag);
    }
    return basic;
}

std::string Quoted(std::string_view text) {
    std::string quoted = "\"";
    for (const char character : text.substr(0, kLongestQuote)) {
        quoted += IsControl(static_cast<unsigned char>(character)) ? '?' : character;
    }
    quoted += text.size() > kLongestQuote ? "...\"" : "\"";
    return quoted;
}

}  // namespace orva
