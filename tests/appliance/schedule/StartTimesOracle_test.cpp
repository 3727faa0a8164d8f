// Next starts against an independent reckoner: `systemd-analyze calendar`, given the same schedule
// in its own language. The two mean different things where the clock changes, so days on which it
// does are left out here; what happens on those is in StartTimes_test.cpp.
#include <absl/time/time.h>
#include <gtest/gtest.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <memory>
#include <random>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "appliance/schedule/StartTimes.h"

namespace orva {
namespace {

// How many schedules are compared; the build may say less where the reckoning is slow.
#ifndef ORVA_ORACLE_SCHEDULES
#define ORVA_ORACLE_SCHEDULES 5000
#endif
constexpr std::size_t kSchedules = ORVA_ORACLE_SCHEDULES;
constexpr unsigned kSeed = 20270131;
// The oracle is asked about so many schedules of one zone from one instant at once, each for so
// many starts.
constexpr std::size_t kBatch = 50;
constexpr int kStarts = 4;

constexpr std::array<const char*, 10> kZones = {
    "UTC",           "Europe/Berlin",      "America/New_York", "Australia/Lord_Howe",
    "Europe/Dublin", "America/Sao_Paulo",  "Asia/Kolkata",     "Pacific/Auckland",
    "Asia/Tokyo",    "America/Los_Angeles"};
constexpr std::array<const char*, 7> kDayNames = {"Sun", "Mon", "Tue", "Wed", "Thu", "Fri", "Sat"};

absl::TimeZone Zone(const std::string& name) {
    absl::TimeZone zone;
    if (!absl::LoadTimeZone(name, &zone)) {
        throw std::runtime_error("no time zone " + name);
    }
    return zone;
}

// A schedule and what the oracle calls it.
struct Question {
    Schedule schedule;
    std::string calendar;
};

class QuestionMaker {
  public:
    explicit QuestionMaker(unsigned seed) : random(seed) {}

    int Number(int low, int high) { return std::uniform_int_distribution(low, high)(random); }

    Question Make(const std::string& zone) {
        Question question;
        Schedule& schedule = question.schedule;
        schedule.firstMinute = Number(0, Schedule::kMinutesPerDay - 1);
        const std::string days = Number(0, 3) == 0 ? MakeWeekDays(schedule) : MakeDate(schedule);
        question.calendar = days + " " + MakeTimes(schedule) + " " + zone;
        return question;
    }

  private:
    std::string MakeWeekDays(Schedule& schedule) {
        schedule.weekDays = static_cast<std::uint8_t>(Number(1, Schedule::kAllWeekDays));
        std::string names;
        for (std::size_t day = 0; day < kDayNames.size(); ++day) {
            if ((schedule.weekDays >> day & 1U) != 0) {
                names += (names.empty() ? "" : ",") + std::string(kDayNames[day]);
            }
        }
        return names + " *-*-*";
    }

    // What repeats begins before every instant that is asked about: the oracle's language knows no
    // first day. Days are those that every month has, or the last of a month, which both languages
    // can say.
    std::string MakeDate(Schedule& schedule) {
        using Repeat = Schedule::Repeat;
        schedule.mode = Schedule::Mode::kDate;
        schedule.repeat = static_cast<Repeat>(Number(0, static_cast<int>(Repeat::kYearly)));
        const bool once = schedule.repeat == Repeat::kNever;
        const int year = once ? Number(2020, 2040) : Number(1970, 2019);
        int month = Number(1, 12);
        int day = Number(1, 28);
        std::string dayText = "-" + TwoDigits(day);
        if (schedule.repeat >= Repeat::kMonthly && Number(0, 4) == 0) {
            month = std::array{1, 3, 5, 7, 8, 10, 12}.at(static_cast<std::size_t>(Number(0, 6)));
            day = 31;
            dayText = "~01";
        }
        if (schedule.repeat == Repeat::kYearly && Number(0, 4) == 0) {
            schedule.date = absl::CivilDay(1972 + 4 * Number(0, 11), 2, 29);
            return "*-02~01";
        }
        const absl::CivilDay date(year, month, day);
        schedule.date = date;
        switch (schedule.repeat) {
            case Repeat::kNever:
                return std::to_string(year) + "-" + TwoDigits(month) + dayText;
            case Repeat::kDaily:
                return "*-*-*";
            case Repeat::kWeekly:
                // Weekday enumerates from Monday, the names from Sunday.
                return std::string(kDayNames.at(
                           (static_cast<std::size_t>(absl::GetWeekday(date)) + 1) % 7)) +
                       " *-*-*";
            case Repeat::kMonthly:
                return "*-*" + dayText;
            case Repeat::kQuarterly:
                return "*-" + Months(month, 3) + dayText;
            case Repeat::kHalfYearly:
                return "*-" + Months(month, 6) + dayText;
            case Repeat::kYearly:
                break;
        }
        return "*-" + TwoDigits(month) + dayText;
    }

    // Every so many months, of which `month` is one.
    static std::string Months(int month, int step) {
        std::string text;
        for (int each = (month - 1) % step + 1; each <= 12; each += step) {
            text += (text.empty() ? "" : ",") + TwoDigits(each);
        }
        return text;
    }

    // Half of the schedules start several times a day.
    std::string MakeTimes(Schedule& schedule) {
        if (Number(0, 1) == 0) {
            return TwoDigits(schedule.firstMinute / 60) + ":" +
                   TwoDigits(schedule.firstMinute % 60) + ":00";
        }
        // The oracle's times of day are hours crossed with minutes: a series within one hour, or
        // one at the same minute of several hours.
        const int hour = schedule.firstMinute / 60;
        const int minute = schedule.firstMinute % 60;
        if (Number(0, 1) == 0) {
            const int interval = Number(1, 59);
            schedule.intervalMinutes = interval;
            schedule.lastMinute = hour * 60 + Number(minute, 59);
            const int lastOfHour = schedule.lastMinute % 60;
            return TwoDigits(hour) + ":" + TwoDigits(minute) + ".." + TwoDigits(lastOfHour) + "/" +
                   std::to_string(interval) + ":00";
        }
        const int hours = Number(1, 23);
        schedule.intervalMinutes = hours * 60;
        const int lastHour = Number(hour, 23);
        schedule.lastMinute = lastHour * 60 + Number(minute, 59);
        return TwoDigits(hour) + ".." + TwoDigits(lastHour) + "/" + std::to_string(hours) + ":" +
               TwoDigits(minute) + ":00";
    }

    static std::string TwoDigits(int number) {
        return (number < 10 ? "0" : "") + std::to_string(number);
    }

    std::mt19937 random;
};

// "Next elapse: Mon 2026-11-23 02:30:00 UTC", or "Iter. #2: ..." when the process's zone is UTC.
std::string InstantOfLine(std::string_view line) {
    constexpr std::size_t kInstant = std::string_view("2026-11-23 02:30:00 UTC").size();
    return line.size() < kInstant ? std::string()
                                  : std::string(line.substr(line.size() - kInstant));
}

// What the oracle answers to each question: its next starts, in UTC.
std::vector<std::vector<std::string>> AskOracle(const std::vector<Question>& questions,
                                                absl::Time from) {
    std::string command =
        "TZ=UTC LC_ALL=C systemd-analyze calendar --iterations=" + std::to_string(kStarts) +
        " --base-time='" + absl::FormatTime("%Y-%m-%d %H:%M:%S UTC", from, absl::UTCTimeZone()) +
        "'";
    for (const Question& question : questions) {
        command += " '" + question.calendar + "'";
    }
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> pipe(::popen(command.c_str(), "r"),
                                                               ::pclose);
    std::vector<std::vector<std::string>> answers;
    char* buffer = nullptr;
    std::size_t capacity = 0;
    for (ssize_t length = 0; (length = ::getline(&buffer, &capacity, pipe.get())) > 0;) {
        std::string_view line(buffer, static_cast<std::size_t>(length));
        line.remove_suffix(line.back() == '\n' ? 1 : 0);
        if (line.find("Normalized form: ") != std::string_view::npos) {
            answers.emplace_back();
        } else if (line.find(": never") != std::string_view::npos) {
            continue;
        } else if (line.find("Next elapse: ") != std::string_view::npos ||
                   line.find("Iter. #") != std::string_view::npos) {
            answers.back().push_back(InstantOfLine(line));
        }
    }
    std::free(buffer);
    return answers;
}

// Whether the clock of the zone runs evenly from a day before `from` to a day after `to`: that is,
// whether its offset stays what it is.
bool ClockIsSteady(const absl::TimeZone& zone, absl::Time from, absl::Time to) {
    absl::TimeZone::CivilTransition change;
    return !zone.NextTransition(from - absl::Hours(48), &change) ||
           absl::FromCivil(change.to, zone) > to + absl::Hours(48);
}

// The starts up to the first whose day is near a change of the clock.
std::vector<std::string> OutsideClockChanges(const std::vector<Start>& starts,
                                             const absl::TimeZone& zone) {
    std::vector<std::string> texts;
    for (const Start& start : starts) {
        if (!ClockIsSteady(zone, start.at, start.at)) {
            break;
        }
        texts.push_back(absl::FormatTime("%Y-%m-%d %H:%M:%S UTC", start.at, absl::UTCTimeZone()));
    }
    return texts;
}

TEST(StartTimesOracle, AgreesWithAnIndependentReckonerAwayFromClockChanges) {
    std::printf("seed %u\n", kSeed);
    QuestionMaker make(kSeed);
    std::size_t schedules = 0;
    std::size_t compared = 0;
    std::map<std::string, std::size_t> kinds;
    for (std::size_t batch = 0; schedules < kSchedules; ++batch) {
        const std::string zoneName = kZones[batch % kZones.size()];
        const absl::TimeZone zone = Zone(zoneName);
        // Any second from 2020 to 2037: the oracle's own zone files may end there.
        const absl::Time from = absl::FromUnixSeconds(
            1577836800 + std::int64_t{60} * make.Number(0, 9'400'000) + make.Number(0, 59));
        std::vector<Question> questions;
        for (std::size_t each = 0; each < kBatch; ++each) {
            questions.push_back(make.Make(zoneName));
        }
        std::vector<std::vector<std::string>> answers = AskOracle(questions, from);
        ASSERT_EQ(answers.size(), questions.size()) << "the oracle failed";
        for (std::size_t each = 0; each < questions.size(); ++each) {
            const Schedule& schedule = questions[each].schedule;
            const std::vector<Start> starts = NextStarts(schedule, zone, from, kStarts);
            const std::vector<std::string> expected = OutsideClockChanges(starts, zone);
            if (expected.empty() && !starts.empty()) {
                continue;
            }
            // All of the oracle's starts when the schedule ends before the clock changes.
            std::vector<std::string>& answer = answers[each];
            if (answer.size() > expected.size() && expected.size() < starts.size()) {
                answer.resize(expected.size());
            }
            ASSERT_EQ(expected, answer)
                << questions[each].calendar << " after "
                << absl::FormatTime("%Y-%m-%d %H:%M:%S UTC", from, absl::UTCTimeZone());
            ++schedules;
            compared += expected.size();
            ++kinds[schedule.mode == Schedule::Mode::kWeekly ? "by weekday" : "by date"];
            kinds["over"] += expected.empty() ? 1 : 0;
        }
    }
    std::printf(
        "%zu schedules (%zu by weekday, %zu by date; %zu of them over) in %zu time zones, %zu "
        "starts\n",
        schedules, kinds["by weekday"], kinds["by date"], kinds["over"], kZones.size(), compared);
    EXPECT_GE(schedules, kSchedules);
}

}  // namespace
}  // namespace orva
