#include "appliance/schedule/StartTimes.h"

#include <absl/time/clock.h>
#include <absl/time/time.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

namespace orva {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using ClockChange = Start::ClockChange;

absl::TimeZone Zone(const std::string& name) {
    absl::TimeZone zone;
    if (!absl::LoadTimeZone(name, &zone)) {
        throw std::runtime_error("no time zone " + name);
    }
    return zone;
}

absl::Time Utc(const std::string& text) {
    absl::Time time;
    std::string error;
    if (!absl::ParseTime("%Y-%m-%d %H:%M:%E*S", text, &time, &error)) {
        throw std::runtime_error(error);
    }
    return time;
}

// Times of day are given as 1430 for 14:30.
int Minutes(int clock) { return clock / 100 * 60 + clock % 100; }

Schedule Daily(int clock) {
    Schedule schedule;
    schedule.firstMinute = Minutes(clock);
    return schedule;
}

Schedule Weekly(std::uint8_t days, int clock) {
    Schedule schedule = Daily(clock);
    schedule.weekDays = days;
    return schedule;
}

Schedule Series(int first, int interval, int last) {
    Schedule schedule = Daily(first);
    schedule.intervalMinutes = interval;
    schedule.lastMinute = Minutes(last);
    return schedule;
}

Schedule OnDate(int year, int month, int day, Schedule::Repeat repeat, int clock = 0) {
    Schedule schedule = Daily(clock);
    schedule.mode = Schedule::Mode::kDate;
    schedule.date = absl::CivilDay(year, month, day);
    schedule.repeat = repeat;
    return schedule;
}

// The next starts, in UTC, seconds included: no start may ever lie inside a minute.
std::vector<std::string> Next(const Schedule& schedule, const std::string& zone,
                              const std::string& afterUtc, std::size_t count) {
    std::vector<std::string> texts;
    for (const Start& start : NextStarts(schedule, Zone(zone), Utc(afterUtc), count)) {
        texts.push_back(absl::FormatTime("%Y-%m-%d %H:%M:%S", start.at, absl::UTCTimeZone()));
    }
    return texts;
}

std::vector<std::string> NextLocal(const Schedule& schedule, const std::string& zone,
                                   const std::string& afterUtc, std::size_t count) {
    std::vector<std::string> texts;
    for (const Start& start : NextStarts(schedule, Zone(zone), Utc(afterUtc), count)) {
        texts.push_back(FormatLocalMinute(start.at, Zone(zone)));
    }
    return texts;
}

constexpr std::uint8_t kMonWedFri = 0b0101010;
constexpr std::uint8_t kSunday = 0b0000001;

TEST(StartTimes, AStartAtThisVeryInstantIsNotNext) {
    EXPECT_THAT(Next(Daily(1200), "UTC", "2026-05-01 12:00:00", 1),
                ElementsAre("2026-05-02 12:00:00"));
    EXPECT_THAT(Next(Daily(1200), "UTC", "2026-05-01 11:59:59.999999999", 1),
                ElementsAre("2026-05-01 12:00:00"));
}

TEST(StartTimes, WeeklyStartsOnItsDaysOnly) {
    EXPECT_THAT(Next(Weekly(kMonWedFri, 630), "UTC", "2026-05-01 06:30:00", 4),
                ElementsAre("2026-05-04 06:30:00", "2026-05-06 06:30:00", "2026-05-08 06:30:00",
                            "2026-05-11 06:30:00"));
    EXPECT_THAT(Next(Weekly(kSunday, 0), "UTC", "2026-05-03 00:00:00", 2),
                ElementsAre("2026-05-10 00:00:00", "2026-05-17 00:00:00"));
}

TEST(StartTimes, LocalTimeDecidesWhichDayItIs) {
    EXPECT_THAT(Next(Weekly(kSunday, 100), "Asia/Kolkata", "2026-05-01 00:00:00", 1),
                ElementsAre("2026-05-02 19:30:00"));
    EXPECT_THAT(Next(Daily(2330), "Asia/Kolkata", "2026-03-29 18:00:00", 2),
                ElementsAre("2026-03-30 18:00:00", "2026-03-31 18:00:00"));
}

TEST(StartTimes, ASeriesStartsFromFirstToLastAndAgainTheNextDay) {
    EXPECT_THAT(Next(Series(800, 240, 1800), "UTC", "2026-05-01 08:00:00", 4),
                ElementsAre("2026-05-01 12:00:00", "2026-05-01 16:00:00", "2026-05-02 08:00:00",
                            "2026-05-02 12:00:00"));
    EXPECT_THAT(Next(Series(800, 300, 1800), "UTC", "2026-05-01 07:59:59", 4),
                ElementsAre("2026-05-01 08:00:00", "2026-05-01 13:00:00", "2026-05-01 18:00:00",
                            "2026-05-02 08:00:00"));
    EXPECT_THAT(Next(Series(0, 1, 2359), "UTC", "2026-05-01 23:58:30", 3),
                ElementsAre("2026-05-01 23:59:00", "2026-05-02 00:00:00", "2026-05-02 00:01:00"));
}

TEST(StartTimes, AOnceOnlyDateIsOverAfterItsStart) {
    const Schedule once = OnDate(2026, 5, 1, Schedule::Repeat::kNever, 900);
    EXPECT_THAT(Next(once, "UTC", "2020-01-01 00:00:00", 3), ElementsAre("2026-05-01 09:00:00"));
    EXPECT_THAT(Next(once, "UTC", "2026-05-01 09:00:00", 3), IsEmpty());
    EXPECT_EQ(NextStart(once, Zone("UTC"), Utc("2026-05-01 09:00:00")), std::nullopt);
}

TEST(StartTimes, ADateRepeatsDailyAndWeeklyFromThatDayOn) {
    EXPECT_THAT(
        Next(OnDate(2026, 5, 10, Schedule::Repeat::kDaily), "UTC", "2026-05-01 00:00:00", 2),
        ElementsAre("2026-05-10 00:00:00", "2026-05-11 00:00:00"));
    EXPECT_THAT(
        Next(OnDate(2026, 5, 1, Schedule::Repeat::kWeekly), "UTC", "2031-05-01 12:00:00", 2),
        ElementsAre("2031-05-02 00:00:00", "2031-05-09 00:00:00"));
    EXPECT_THAT(
        Next(OnDate(2026, 5, 1, Schedule::Repeat::kWeekly), "UTC", "2026-05-01 00:00:00", 1),
        ElementsAre("2026-05-08 00:00:00"));
}

TEST(StartTimes, ADayThatAMonthLacksMeansItsLastDay) {
    EXPECT_THAT(
        Next(OnDate(2026, 1, 31, Schedule::Repeat::kMonthly), "UTC", "2026-01-31 00:00:00", 4),
        ElementsAre("2026-02-28 00:00:00", "2026-03-31 00:00:00", "2026-04-30 00:00:00",
                    "2026-05-31 00:00:00"));
    EXPECT_THAT(
        Next(OnDate(2026, 11, 30, Schedule::Repeat::kQuarterly), "UTC", "2026-11-30 00:00:00", 3),
        ElementsAre("2027-02-28 00:00:00", "2027-05-30 00:00:00", "2027-08-30 00:00:00"));
    EXPECT_THAT(
        Next(OnDate(2026, 8, 31, Schedule::Repeat::kHalfYearly), "UTC", "2026-08-31 00:00:00", 3),
        ElementsAre("2027-02-28 00:00:00", "2027-08-31 00:00:00", "2028-02-29 00:00:00"));
}

TEST(StartTimes, ALeapDayRepeatsYearlyOnTheLastOfFebruary) {
    const Schedule leap = OnDate(2024, 2, 29, Schedule::Repeat::kYearly, 1200);
    EXPECT_THAT(Next(leap, "UTC", "2024-02-29 12:00:00", 4),
                ElementsAre("2025-02-28 12:00:00", "2026-02-28 12:00:00", "2027-02-28 12:00:00",
                            "2028-02-29 12:00:00"));
    // 2100 has no leap day.
    EXPECT_THAT(Next(leap, "UTC", "2099-12-31 00:00:00", 1), ElementsAre("2100-02-28 12:00:00"));
}

TEST(StartTimes, ClocksStillChangeInTheYear2099) {
    // 29 March and 25 October 2099 are the last Sundays of their months.
    EXPECT_THAT(Next(Daily(1200), "Europe/Berlin", "2099-03-28 00:00:00", 2),
                ElementsAre("2099-03-28 11:00:00", "2099-03-29 10:00:00"));
    EXPECT_THAT(Next(Daily(1200), "Europe/Berlin", "2099-10-24 00:00:00", 2),
                ElementsAre("2099-10-24 10:00:00", "2099-10-25 11:00:00"));
}

TEST(StartTimes, AnAncientDateIsFoundWithoutWalkingThroughTheYears) {
    EXPECT_THAT(
        Next(OnDate(1970, 1, 31, Schedule::Repeat::kMonthly), "UTC", "9998-02-01 00:00:00", 1),
        ElementsAre("9998-02-28 00:00:00"));
}

TEST(StartTimes, AStartThatTheClockJumpsOverHappensAtTheFirstInstantAfterIt) {
    EXPECT_THAT(Next(Daily(230), "Europe/Berlin", "2026-03-28 00:00:00", 3),
                ElementsAre("2026-03-28 01:30:00", "2026-03-29 01:00:00", "2026-03-30 00:30:00"));
    EXPECT_THAT(Next(Daily(200), "America/New_York", "2026-03-07 12:00:00", 2),
                ElementsAre("2026-03-08 07:00:00", "2026-03-09 06:00:00"));
    EXPECT_THAT(Next(Daily(215), "Australia/Lord_Howe", "2026-10-03 00:00:00", 2),
                ElementsAre("2026-10-03 15:30:00", "2026-10-04 15:15:00"));
    // Winter is the time that is put back by a negative amount there; the clock jumps all the same.
    EXPECT_THAT(Next(Daily(130), "Europe/Dublin", "2026-03-28 12:00:00", 2),
                ElementsAre("2026-03-29 01:00:00", "2026-03-30 00:30:00"));
}

TEST(StartTimes, MidnightThatDoesNotExistIsOneOClock) {
    EXPECT_THAT(Next(Daily(0), "America/Sao_Paulo", "2018-11-03 12:00:00", 2),
                ElementsAre("2018-11-04 03:00:00", "2018-11-05 02:00:00"));
}

TEST(StartTimes, AZoneThatGaveUpChangingItsClockHasEvenDays) {
    // Sao Paulo's last change was in February 2019.
    EXPECT_THAT(Next(Daily(0), "America/Sao_Paulo", "2019-11-02 12:00:00", 3),
                ElementsAre("2019-11-03 03:00:00", "2019-11-04 03:00:00", "2019-11-05 03:00:00"));
    EXPECT_THAT(NextLocal(Series(0, 480, 2359), "Asia/Kolkata", "2026-03-28 18:30:00", 4),
                ElementsAre("2026-03-29 08:00", "2026-03-29 16:00", "2026-03-30 00:00",
                            "2026-03-30 08:00"));
}

TEST(StartTimes, AllStartsOfASeriesThatTheClockJumpsOverBecomeOne) {
    EXPECT_THAT(NextLocal(Series(0, 15, 2359), "Europe/Berlin", "2026-03-29 00:30:00", 4),
                ElementsAre("2026-03-29 01:45", "2026-03-29 03:00", "2026-03-29 03:15",
                            "2026-03-29 03:30"));
    EXPECT_THAT(NextLocal(Series(10, 20, 2359), "Europe/Berlin", "2026-03-29 00:30:00", 4),
                ElementsAre("2026-03-29 01:50", "2026-03-29 03:00", "2026-03-29 03:10",
                            "2026-03-29 03:30"));
    EXPECT_THAT(NextLocal(Series(205, 10, 255), "Europe/Berlin", "2026-03-28 12:00:00", 2),
                ElementsAre("2026-03-29 03:00", "2026-03-30 02:05"));
}

TEST(StartTimes, AOnceADayStartInARepeatedHourHappensOnTheFirstPassOnly) {
    EXPECT_THAT(Next(Daily(230), "Europe/Berlin", "2026-10-24 12:00:00", 2),
                ElementsAre("2026-10-25 00:30:00", "2026-10-26 01:30:00"));
    EXPECT_THAT(Next(Daily(130), "America/New_York", "2026-10-31 12:00:00", 2),
                ElementsAre("2026-11-01 05:30:00", "2026-11-02 06:30:00"));
    EXPECT_THAT(Next(Daily(145), "Australia/Lord_Howe", "2026-04-04 00:00:00", 2),
                ElementsAre("2026-04-04 14:45:00", "2026-04-05 15:15:00"));
    EXPECT_THAT(Next(Daily(130), "Europe/Dublin", "2026-10-24 12:00:00", 2),
                ElementsAre("2026-10-25 00:30:00", "2026-10-26 01:30:00"));
    EXPECT_THAT(Next(Daily(2330), "America/Sao_Paulo", "2018-02-17 12:00:00", 2),
                ElementsAre("2018-02-18 01:30:00", "2018-02-19 02:30:00"));
}

TEST(StartTimes, ASeriesKeepsItsSpacingThroughBothPassesOfARepeatedHour) {
    EXPECT_THAT(Next(Series(0, 30, 2359), "Europe/Berlin", "2026-10-24 23:30:00", 6),
                ElementsAre("2026-10-25 00:00:00", "2026-10-25 00:30:00", "2026-10-25 01:00:00",
                            "2026-10-25 01:30:00", "2026-10-25 02:00:00", "2026-10-25 02:30:00"));
    // 01:40, 02:30, then 50 minutes later 02:20 on the second pass, then the wall clock's 03:20.
    EXPECT_THAT(Next(Series(0, 50, 2359), "Europe/Berlin", "2026-10-24 23:00:00", 4),
                ElementsAre("2026-10-24 23:40:00", "2026-10-25 00:30:00", "2026-10-25 01:20:00",
                            "2026-10-25 02:20:00"));
    EXPECT_THAT(NextLocal(Series(0, 120, 2359), "Europe/Berlin", "2026-10-24 22:00:00", 3),
                ElementsAre("2026-10-25 02:00", "2026-10-25 04:00", "2026-10-25 06:00"));
    EXPECT_THAT(Next(Series(0, 15, 2359), "Australia/Lord_Howe", "2026-04-04 14:30:00", 5),
                ElementsAre("2026-04-04 14:45:00", "2026-04-04 15:00:00", "2026-04-04 15:15:00",
                            "2026-04-04 15:30:00", "2026-04-04 15:45:00"));
}

TEST(StartTimes, ASeriesThatEndsInARepeatedHourEndsThereOnBothPasses) {
    EXPECT_THAT(Next(Series(100, 30, 200), "Europe/Berlin", "2026-10-24 22:59:00", 5),
                ElementsAre("2026-10-24 23:00:00", "2026-10-24 23:30:00", "2026-10-25 00:00:00",
                            "2026-10-25 01:00:00", "2026-10-26 00:00:00"));
}

TEST(StartTimes, ARepeatedHourThatReachesOverMidnightLosesNoStart) {
    // At 00:01 on 7 November the clock went back to 23:01 on the 6th.
    EXPECT_THAT(Next(Series(2330, 20, 2359), "America/St_Johns", "2010-11-07 01:00:00", 6),
                ElementsAre("2010-11-07 02:00:00", "2010-11-07 02:20:00", "2010-11-07 02:40:00",
                            "2010-11-07 03:00:00", "2010-11-07 03:20:00", "2010-11-08 03:00:00"));
    EXPECT_THAT(Next(Daily(0), "America/St_Johns", "2010-11-06 12:00:00", 2),
                ElementsAre("2010-11-07 02:30:00", "2010-11-08 03:30:00"));
}

TEST(StartTimes, ADayThatAZoneSkippedStartsAtItsEnd) {
    EXPECT_THAT(Next(Daily(1200), "Pacific/Apia", "2011-12-29 12:00:00", 3),
                ElementsAre("2011-12-29 22:00:00", "2011-12-30 10:00:00", "2011-12-30 22:00:00"));
}

TEST(StartTimes, AStartTellsWhatTheClockDidToIt) {
    const absl::TimeZone berlin = Zone("Europe/Berlin");
    const auto change = [&berlin](const Schedule& schedule, const std::string& after) {
        return FindNextStart(schedule, berlin, Utc(after))->change;
    };
    EXPECT_EQ(change(Daily(1200), "2026-03-29 00:00:00"), ClockChange::kNone);
    EXPECT_EQ(change(Daily(230), "2026-03-29 00:00:00"), ClockChange::kJumpedOver);
    EXPECT_EQ(change(Daily(230), "2026-10-25 00:00:00"), ClockChange::kFirstPass);
    EXPECT_EQ(change(Series(0, 30, 2359), "2026-10-25 00:30:00"), ClockChange::kSecondPass);
}

TEST(StartTimes, NextIsAlwaysLaterAndNothingIsLeftOut) {
    // Walking a dense schedule start by start and asking from any instant between must agree.
    for (const char* name : {"Europe/Berlin", "America/New_York", "Australia/Lord_Howe",
                             "America/St_Johns", "Pacific/Apia"}) {
        const absl::TimeZone zone = Zone(name);
        for (const char* from : {"2010-11-06 00:00:00", "2011-12-29 00:00:00",
                                 "2026-03-07 00:00:00", "2026-10-24 00:00:00"}) {
            const std::vector<Start> starts = NextStarts(Series(5, 25, 2350), zone, Utc(from), 200);
            ASSERT_EQ(starts.size(), 200U);
            for (std::size_t at = 1; at < starts.size(); ++at) {
                ASSERT_LT(starts[at - 1].at, starts[at].at) << name << " " << from;
                const absl::Time between = starts[at].at - absl::Nanoseconds(1);
                ASSERT_EQ(NextStart(Series(5, 25, 2350), zone, between), starts[at].at)
                    << name << " " << from;
            }
        }
    }
}

TEST(StartTimes, FormatsLocalMinutesWithLeadingZeros) {
    EXPECT_EQ(FormatLocalMinute(Utc("2026-01-02 03:04:59"), Zone("UTC")), "2026-01-02 03:04");
    EXPECT_EQ(FormatLocalMinute(Utc("2026-07-01 23:30:00"), Zone("Europe/Berlin")),
              "2026-07-02 01:30");
}

}  // namespace
}  // namespace orva
