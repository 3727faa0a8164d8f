#include "appliance/store/TaskSections.h"

#include <algorithm>
#include <array>
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

struct CharacterRange {
    char32_t first;
    char32_t last;
};

template <std::size_t count>
bool IsOneOf(const std::array<CharacterRange, count>& ranges, char32_t character) {
    return std::any_of(ranges.begin(), ranges.end(), [character](const CharacterRange& range) {
        return range.first <= character && character <= range.last;
    });
}

// Beside the control characters themselves, what ends a line or a paragraph.
constexpr std::array<CharacterRange, 3> kControls = {
    {{0x00, 0x1f}, {0x7f, 0x9f}, {0x2028, 0x2029}}};

// What turns the direction of the characters after it, so that a name reads as another one, and the
// byte order mark, which nobody sees.
constexpr std::array<CharacterRange, 3> kMisleading = {
    {{0x202a, 0x202e}, {0x2066, 0x2069}, {0xfeff, 0xfeff}}};

// What leaves no mark: spaces, fillers, and what only joins or parts its neighbours.
constexpr std::array<CharacterRange, 12> kBlanks = {{{0x20, 0x20},
                                                     {0xa0, 0xa0},
                                                     {0xad, 0xad},
                                                     {0x115f, 0x1160},
                                                     {0x1680, 0x1680},
                                                     {0x2000, 0x200f},
                                                     {0x202f, 0x202f},
                                                     {0x205f, 0x2064},
                                                     {0x2800, 0x2800},
                                                     {0x3000, 0x3000},
                                                     {0x3164, 0x3164},
                                                     {0xffa0, 0xffa0}}};

// Code points that never stand for a character.
bool IsNoCharacter(char32_t character) {
    return (character & 0xfffeU) == 0xfffeU || (character >= 0xfdd0 && character <= 0xfdef);
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
    bool isBlank = true;
    while (!name.empty()) {
        const char32_t character = TakeCharacter(name);
        if (IsOneOf(kControls, character)) {
            return "holds a control character";
        }
        if (IsOneOf(kMisleading, character) || IsNoCharacter(character)) {
            return "holds a character that cannot be shown";
        }
        isBlank = isBlank && IsOneOf(kBlanks, character);
    }
    if (isBlank) {
        return "is blank";
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
