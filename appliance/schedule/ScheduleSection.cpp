#include "appliance/schedule/ScheduleSection.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdio>

namespace orva {
namespace {

constexpr const char* kMode = "mode";
constexpr const char* kWeekName = "week_name";
constexpr const char* kDate = "date";
constexpr const char* kRepeat = "repeat";
constexpr const char* kHour = "hour";
constexpr const char* kMin = "min";
constexpr const char* kIntervalMin = "interval_min";
constexpr const char* kLastHour = "last_hour";
constexpr const char* kLastMin = "last_min";
constexpr const char* kRunMissed = "run_missed";

constexpr std::array<std::string_view, 11> kMembers = {
    kMode,      kWeekName,          kDate, kRepeat, kHour, kMin, kIntervalMin, kLastHour, kLastMin,
    kRunMissed, "next_trigger_time"};

// The words in the order of the enumerators.
constexpr std::array<const char*, 2> kModes = {"weekly", "date"};
constexpr std::array<const char*, 7> kRepeats = {"never",     "daily",       "weekly", "monthly",
                                                 "quarterly", "half_yearly", "yearly"};

constexpr int kFirstYear = 1970;

// Reads the members one after the other; after the first one refused the rest is not looked at.
class SectionReader {
  public:
    explicit SectionReader(const Json::Value& sectionToRead) : section(sectionToRead) {}

    void Refuse(const char* name, const std::string& reason) {
        if (!problem) {
            problem = "schedule." + std::string(name) + ": " + reason;
        }
    }

    void Integer(const char* name, int low, int high, int& value) {
        const Json::Value* member = Member(name);
        if (member == nullptr) {
            return;
        }
        // Json's isInt() also holds for 5.0.
        const bool integer = member->type() == Json::intValue || member->type() == Json::uintValue;
        if (!integer || !member->isInt() || member->asInt() < low || member->asInt() > high) {
            Refuse(name,
                   "is no integer from " + std::to_string(low) + " to " + std::to_string(high));
            return;
        }
        value = member->asInt();
    }

    void Boolean(const char* name, bool& value) {
        const Json::Value* member = Member(name);
        if (member == nullptr) {
            return;
        }
        if (!member->isBool()) {
            Refuse(name, "is neither true nor false");
            return;
        }
        value = member->asBool();
    }

    // The member's text; nothing when the value that stands is to be kept.
    std::optional<std::string> Text(const char* name) {
        const Json::Value* member = Member(name);
        if (member == nullptr) {
            return std::nullopt;
        }
        if (!member->isString()) {
            Refuse(name, "is no text");
            return std::nullopt;
        }
        return member->asString();
    }

    template <class Enum, std::size_t size>
    void Word(const char* name, const std::array<const char*, size>& words, Enum& value) {
        const std::optional<std::string> text = Text(name);
        if (!text) {
            return;
        }
        const auto word = std::find(words.begin(), words.end(), *text);
        if (word == words.end()) {
            std::string known;
            for (const char* each : words) {
                known += (known.empty() ? "" : ", ") + std::string(each);
            }
            Refuse(name, "is none of " + known);
            return;
        }
        value = static_cast<Enum>(word - words.begin());
    }

    const std::optional<std::string>& Problem() const { return problem; }

  private:
    const Json::Value* Member(const char* name) const {
        if (problem || !section.isObject()) {
            return nullptr;
        }
        const Json::Value* member = section.find(name, name + std::char_traits<char>::length(name));
        return member == nullptr || member->isNull() ? nullptr : member;
    }

    const Json::Value& section;
    std::optional<std::string> problem;
};

// "1,3,5" in any order; the empty text is the empty set.
std::optional<std::uint8_t> ParseWeekDays(std::string_view text) {
    unsigned days = 0;
    if (text.empty()) {
        return static_cast<std::uint8_t>(days);
    }
    for (std::size_t at = 0;; at += 2) {
        if (at >= text.size() || text[at] < '0' || text[at] > '6') {
            return std::nullopt;
        }
        days |= 1U << static_cast<unsigned>(text[at] - '0');
        if (at + 1 == text.size()) {
            return static_cast<std::uint8_t>(days);
        }
        if (text[at + 1] != ',') {
            return std::nullopt;
        }
    }
}

std::optional<absl::CivilDay> ParseDate(std::string_view text) {
    if (text.size() != 10 || text[4] != '-' || text[7] != '-') {
        return std::nullopt;
    }
    const auto number = [text](std::size_t at, std::size_t length) {
        int value = -1;
        const char* end = text.data() + at + length;
        const auto [stop, error] = std::from_chars(text.data() + at, end, value);
        return error == std::errc() && stop == end ? value : -1;
    };
    const int year = number(0, 4);
    const int month = number(5, 2);
    const int day = number(8, 2);
    if (year < kFirstYear || month < 1 || day < 1) {
        return std::nullopt;
    }
    // A day that does not exist comes back as another one.
    const absl::CivilDay date(year, month, day);
    if (date.year() != year || date.month() != month || date.day() != day) {
        return std::nullopt;
    }
    return date;
}

std::string FormatDate(const std::optional<absl::CivilDay>& date) {
    if (!date) {
        return {};
    }
    char text[24];
    std::snprintf(text, sizeof text, "%04d-%02d-%02d", static_cast<int>(date->year()),
                  date->month(), date->day());
    return text;
}

std::string FormatWeekDays(unsigned days) {
    std::string text;
    for (unsigned day = 0; day < 7; ++day) {
        if ((days >> day & 1U) != 0) {
            text += text.empty() ? "" : ",";
            text += static_cast<char>('0' + day);
        }
    }
    return text;
}

void ReadWeekDays(SectionReader& reader, Schedule& schedule) {
    const std::optional<std::string> text = reader.Text(kWeekName);
    if (!text) {
        return;
    }
    const std::optional<std::uint8_t> days = ParseWeekDays(*text);
    if (!days) {
        reader.Refuse(kWeekName, "is no list of days from 0 (Sunday) to 6, as in \"1,3,5\"");
        return;
    }
    schedule.weekDays = *days;
}

// The form of a task that has no date holds an empty text, which comes back when it is saved.
void ReadDate(SectionReader& reader, Schedule& schedule) {
    const std::optional<std::string> text = reader.Text(kDate);
    if (!text) {
        return;
    }
    const std::optional<absl::CivilDay> date = ParseDate(*text);
    if (!date && !text->empty()) {
        reader.Refuse(kDate, "is no date from 1970-01-01 on, as in \"2030-12-31\"");
        return;
    }
    schedule.date = date;
}

// What no member shows by itself.
void CheckTogether(SectionReader& reader, const Schedule& schedule) {
    if (schedule.mode == Schedule::Mode::kWeekly && schedule.weekDays == 0) {
        reader.Refuse(kWeekName, "names no day");
    }
    if (schedule.mode == Schedule::Mode::kDate && !schedule.date) {
        reader.Refuse(kDate, "is missing");
    }
    if (schedule.intervalMinutes > 0 && schedule.lastMinute < schedule.firstMinute) {
        reader.Refuse(kLastHour, "the last start of the day is before the first");
    }
}

}  // namespace

std::optional<std::string> ApplyScheduleSection(const Json::Value& section, Schedule& schedule) {
    if (!section.isObject() && !section.isNull()) {
        return "schedule: is no object";
    }
    Schedule result = schedule;
    int hour = result.firstMinute / 60;
    int minute = result.firstMinute % 60;
    int lastHour = result.lastMinute / 60;
    int lastMinute = result.lastMinute % 60;

    SectionReader reader(section);
    reader.Word(kMode, kModes, result.mode);
    ReadWeekDays(reader, result);
    ReadDate(reader, result);
    reader.Word(kRepeat, kRepeats, result.repeat);
    reader.Integer(kHour, 0, 23, hour);
    reader.Integer(kMin, 0, 59, minute);
    reader.Integer(kIntervalMin, 0, Schedule::kMinutesPerDay - 1, result.intervalMinutes);
    reader.Integer(kLastHour, 0, 23, lastHour);
    reader.Integer(kLastMin, 0, 59, lastMinute);
    reader.Boolean(kRunMissed, result.runMissed);
    result.firstMinute = hour * 60 + minute;
    result.lastMinute = lastHour * 60 + lastMinute;
    CheckTogether(reader, result);
    if (!reader.Problem()) {
        schedule = result;
    }
    return reader.Problem();
}

Json::Value ScheduleSection(const Schedule& schedule) {
    Json::Value section(Json::objectValue);
    section[kMode] = kModes[static_cast<std::size_t>(schedule.mode)];
    section[kWeekName] = FormatWeekDays(schedule.weekDays);
    section[kDate] = FormatDate(schedule.date);
    section[kRepeat] = kRepeats[static_cast<std::size_t>(schedule.repeat)];
    section[kHour] = schedule.firstMinute / 60;
    section[kMin] = schedule.firstMinute % 60;
    section[kIntervalMin] = schedule.intervalMinutes;
    section[kLastHour] = schedule.lastMinute / 60;
    section[kLastMin] = schedule.lastMinute % 60;
    section[kRunMissed] = schedule.runMissed;
    return section;
}

bool IsScheduleMember(std::string_view name) {
    return std::find(kMembers.begin(), kMembers.end(), name) != kMembers.end();
}

}  // namespace orva
