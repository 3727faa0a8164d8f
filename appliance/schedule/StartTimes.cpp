#include "appliance/schedule/StartTimes.h"

#include <absl/time/civil_time.h>

#include <algorithm>
#include <cstdio>

namespace orva {
namespace {

using ClockChange = Start::ClockChange;
using TimeInfo = absl::TimeZone::TimeInfo;

// Yesterday, today and the day of the next start are enough but for the few days in history that a
// zone skipped or lived twice; this leaves room for those.
constexpr int kDaysToLookAt = 10;

int MonthsPerStep(Schedule::Repeat repeat) {
    switch (repeat) {
        case Schedule::Repeat::kMonthly:
            return 1;
        case Schedule::Repeat::kQuarterly:
            return 3;
        case Schedule::Repeat::kHalfYearly:
            return 6;
        case Schedule::Repeat::kYearly:
            return 12;
        default:
            return 0;
    }
}

absl::CivilDay DayInMonth(absl::CivilMonth month, int day) {
    const absl::CivilDay last = absl::CivilDay(month + 1) - 1;
    return std::min(absl::CivilDay(month) + (day - 1), last);
}

std::optional<absl::CivilDay> FirstDateFrom(const Schedule& schedule, absl::CivilDay from) {
    if (!schedule.date) {
        return std::nullopt;
    }
    const absl::CivilDay date = *schedule.date;
    if (from <= date) {
        return date;
    }
    switch (schedule.repeat) {
        case Schedule::Repeat::kNever:
            return std::nullopt;
        case Schedule::Repeat::kDaily:
            return from;
        case Schedule::Repeat::kWeekly:
            return date + (from - date + 6) / 7 * 7;
        default:
            break;
    }
    const int step = MonthsPerStep(schedule.repeat);
    const absl::CivilMonth firstMonth(date);
    const absl::CivilMonth month = firstMonth + (absl::CivilMonth(from) - firstMonth) / step * step;
    const absl::CivilDay day = DayInMonth(month, date.day());
    return day >= from ? day : DayInMonth(month + step, date.day());
}

// The first day, not before `from`, that the schedule starts on.
std::optional<absl::CivilDay> FirstStartDayFrom(const Schedule& schedule, absl::CivilDay from) {
    if (schedule.mode == Schedule::Mode::kDate) {
        return FirstDateFrom(schedule, from);
    }
    // Weekday enumerates from Monday, the bits from Sunday.
    const unsigned today = (static_cast<unsigned>(absl::GetWeekday(from)) + 1) % 7;
    for (unsigned ahead = 0; ahead < 7; ++ahead) {
        if ((schedule.weekDays >> ((today + ahead) % 7) & 1U) != 0) {
            return from + ahead;
        }
    }
    return std::nullopt;
}

Start FirstPass(const TimeInfo& info) {
    switch (info.kind) {
        case TimeInfo::SKIPPED:
            return {info.trans, ClockChange::kJumpedOver};
        case TimeInfo::REPEATED:
            return {info.pre, ClockChange::kFirstPass};
        case TimeInfo::UNIQUE:
            break;
    }
    return {info.pre, ClockChange::kNone};
}

// Keeps the earliest of the starts offered that are later than `after`.
class Earliest {
  public:
    explicit Earliest(absl::Time afterTime) : after(afterTime) {}

    void Offer(const Start& start) {
        if (start.at > after && (!best || start.at < best->at)) {
            best = start;
        }
    }
    void Offer(const std::optional<Start>& start) {
        if (start) {
            Offer(*start);
        }
    }
    const std::optional<Start>& Best() const { return best; }

  private:
    absl::Time after;
    std::optional<Start> best;
};

// A day's series of starts on a day on which the clock is put forward or back.
std::optional<Start> FirstOfSeriesAtClockChange(const Schedule& schedule,
                                                const absl::TimeZone& zone, absl::CivilMinute first,
                                                absl::CivilMinute last, absl::Time after) {
    const absl::Duration interval = absl::Minutes(schedule.intervalMinutes);
    Earliest earliest(after);
    bool stretchSeen = false;
    for (absl::CivilMinute planned = first; planned <= last; planned += schedule.intervalMinutes) {
        const TimeInfo info = zone.At(absl::CivilSecond(planned));
        earliest.Offer(FirstPass(info));
        if (info.kind != TimeInfo::REPEATED || stretchSeen) {
            continue;
        }
        stretchSeen = true;
        const absl::Time end = info.trans + (info.post - info.pre);
        for (absl::Time at = info.pre + interval; at < end; at += interval) {
            if (at >= info.trans && absl::ToCivilMinute(at, zone) <= last) {
                earliest.Offer(Start{at, ClockChange::kSecondPass});
            }
        }
    }
    return earliest.Best();
}

// The first start later than `after` of those that belong to `day`.
std::optional<Start> FirstOfDay(const Schedule& schedule, const absl::TimeZone& zone,
                                absl::CivilDay day, absl::Time after) {
    const absl::CivilMinute first = absl::CivilMinute(day) + schedule.firstMinute;
    const TimeInfo firstInfo = zone.At(absl::CivilSecond(first));
    const Start firstStart = FirstPass(firstInfo);
    if (schedule.intervalMinutes == 0) {
        return firstStart.at > after ? std::optional(firstStart) : std::nullopt;
    }

    const int steps = (schedule.lastMinute - schedule.firstMinute) / schedule.intervalMinutes;
    const int minutes = steps * schedule.intervalMinutes;
    const TimeInfo lastInfo = zone.At(absl::CivilSecond(first + minutes));
    const bool steadyClock = firstInfo.kind == TimeInfo::UNIQUE &&
                             lastInfo.kind == TimeInfo::UNIQUE &&
                             lastInfo.pre - firstInfo.pre == absl::Minutes(minutes);
    if (!steadyClock) {
        return FirstOfSeriesAtClockChange(schedule, zone, first,
                                          absl::CivilMinute(day) + schedule.lastMinute, after);
    }
    if (firstStart.at > after) {
        return firstStart;
    }
    const absl::Duration interval = absl::Minutes(schedule.intervalMinutes);
    absl::Duration rest;
    const std::int64_t step = absl::IDivDuration(after - firstStart.at, interval, &rest) + 1;
    if (step > steps) {
        return std::nullopt;
    }
    return Start{firstStart.at + step * interval, ClockChange::kNone};
}

}  // namespace

std::optional<Start> FindNextStart(const Schedule& schedule, const absl::TimeZone& zone,
                                   absl::Time after) {
    Earliest earliest(after);
    // A clock put back over midnight returns to the day before, hence one day earlier and, once a
    // start is found, one day later than the calendar alone would ask for.
    absl::CivilDay from = absl::ToCivilDay(after, zone) - 1;
    std::optional<absl::CivilDay> found;
    for (int looked = 0; looked < kDaysToLookAt; ++looked) {
        const std::optional<absl::CivilDay> day = FirstStartDayFrom(schedule, from);
        if (!day || (found && *day > *found + 1)) {
            break;
        }
        earliest.Offer(FirstOfDay(schedule, zone, *day, after));
        if (found) {
            break;
        }
        if (earliest.Best()) {
            found = day;
        }
        from = *day + 1;
    }
    return earliest.Best();
}

std::optional<absl::Time> NextStart(const Schedule& schedule, const absl::TimeZone& zone,
                                    absl::Time after) {
    const std::optional<Start> start = FindNextStart(schedule, zone, after);
    return start ? std::optional(start->at) : std::nullopt;
}

std::vector<Start> NextStarts(const Schedule& schedule, const absl::TimeZone& zone,
                              absl::Time after, std::size_t count) {
    std::vector<Start> starts;
    while (starts.size() < count) {
        const std::optional<Start> start = FindNextStart(schedule, zone, after);
        if (!start) {
            break;
        }
        starts.push_back(*start);
        after = start->at;
    }
    return starts;
}

std::string FormatLocalMinute(absl::Time time, const absl::TimeZone& zone) {
    const absl::CivilMinute local = absl::ToCivilMinute(time, zone);
    char text[40];
    const int length = std::snprintf(text, sizeof text, "%04lld-%02d-%02d %02d:%02d",
                                     static_cast<long long>(local.year()), local.month(),
                                     local.day(), local.hour(), local.minute());
    return {text, static_cast<std::size_t>(length)};
}

}  // namespace orva
