#include "appliance/scheduler/PassedStarts.h"

#include <gtest/gtest.h>

#include "appliance/schedule/StartTimes.h"
#include "tests/appliance/scheduler/Instants.h"

namespace {

using orva::FindPassedStarts;
using orva::PassedStarts;
using orva::Schedule;

const absl::TimeZone kUtc = absl::UTCTimeZone();

Schedule DailyAt(int hour, int minute) {
    Schedule schedule;
    schedule.firstMinute = hour * 60 + minute;
    return schedule;
}

Schedule EveryMinute() {
    Schedule schedule;
    schedule.intervalMinutes = 1;
    return schedule;
}

TEST(PassedStartsTest, AStartThatHasJustComeIsTheOnlyOne) {
    const PassedStarts passed = FindPassedStarts(
        DailyAt(6, 30), kUtc, UtcSecond("2026-05-01 06:30:00"), 0, Utc("2026-05-01 06:30:00.01"));
    EXPECT_EQ(passed.latest, UtcSecond("2026-05-01 06:30:00"));
    EXPECT_FALSE(passed.before);
}

TEST(PassedStartsTest, OfAWeekOfDaysTheLastTwoAreFound) {
    const PassedStarts passed = FindPassedStarts(
        DailyAt(6, 30), kUtc, UtcSecond("2026-05-01 06:30:00"), 0, Utc("2026-05-08 05:00:00"));
    EXPECT_EQ(passed.latest, UtcSecond("2026-05-07 06:30:00"));
    EXPECT_EQ(passed.before, UtcSecond("2026-05-06 06:30:00"));
}

TEST(PassedStartsTest, TheStoredStartIsTheOneBeforeWhenOnlyTwoHaveCome) {
    const PassedStarts passed = FindPassedStarts(
        DailyAt(6, 30), kUtc, UtcSecond("2026-05-01 06:30:00"), 0, Utc("2026-05-02 06:30:00"));
    EXPECT_EQ(passed.latest, UtcSecond("2026-05-02 06:30:00"));
    EXPECT_EQ(passed.before, UtcSecond("2026-05-01 06:30:00"));
}

TEST(PassedStartsTest, OfAYearOfMinutesTheLastTwoAreFound) {
    const PassedStarts passed = FindPassedStarts(
        EveryMinute(), kUtc, UtcSecond("2025-05-01 00:00:00"), 0, Utc("2026-05-01 12:00:59"));
    EXPECT_EQ(passed.latest, UtcSecond("2026-05-01 12:00:00"));
    EXPECT_EQ(passed.before, UtcSecond("2026-05-01 11:59:00"));
}

// Saved again with another schedule after its start had come.
TEST(PassedStartsTest, AStoredStartThatTheScheduleDoesNotNameCounts) {
    const PassedStarts passed = FindPassedStarts(
        DailyAt(6, 30), kUtc, UtcSecond("2026-05-01 11:17:00"), 0, Utc("2026-05-01 12:00:00"));
    EXPECT_EQ(passed.latest, UtcSecond("2026-05-01 11:17:00"));
    EXPECT_FALSE(passed.before);
}

TEST(PassedStartsTest, BesideTheStoredStartOnlyThoseCountThatTheScheduleHoldsFor) {
    const auto find = [](const std::string& since) {
        return FindPassedStarts(DailyAt(6, 30), kUtc, UtcSecond("2026-05-01 11:17:00"),
                                UtcSecond(since), Utc("2026-05-04 12:00:00"));
    };
    EXPECT_EQ(find("2026-05-04 06:29:59").latest, UtcSecond("2026-05-04 06:30:00"));
    EXPECT_EQ(find("2026-05-04 06:29:59").before, UtcSecond("2026-05-01 11:17:00"));
    EXPECT_EQ(find("2026-05-03 06:00:00").before, UtcSecond("2026-05-03 06:30:00"));
    EXPECT_EQ(find("2026-05-04 06:30:00").latest, UtcSecond("2026-05-01 11:17:00"));
    EXPECT_FALSE(find("2026-05-04 06:30:00").before);
    // By a clock that was put back meanwhile.
    EXPECT_EQ(find("2027-01-01 00:00:00").latest, UtcSecond("2026-05-01 11:17:00"));
    EXPECT_EQ(find("2026-04-01 00:00:00").before, UtcSecond("2026-05-03 06:30:00"));
}

TEST(PassedStartsTest, TheSearchAgreesWithAWalkOverAllStarts) {
    absl::TimeZone berlin;
    ASSERT_TRUE(absl::LoadTimeZone("Europe/Berlin", &berlin));
    Schedule schedule = DailyAt(1, 10);
    schedule.intervalMinutes = 7;
    schedule.lastMinute = 4 * 60;
    schedule.weekDays = 0b1001001;
    // Over the night in which the clock goes back.
    const absl::Time first = *orva::NextStart(schedule, berlin, Utc("2026-10-20 00:00:00"));
    for (int step = 0; step < 400; ++step) {
        const absl::Time now = first + step * absl::Minutes(37);
        absl::Time latest = first;
        std::optional<std::int64_t> before;
        for (;;) {
            const absl::Time next = *orva::NextStart(schedule, berlin, latest);
            if (next > now) {
                break;
            }
            before = absl::ToUnixSeconds(latest);
            latest = next;
        }
        const PassedStarts passed =
            FindPassedStarts(schedule, berlin, absl::ToUnixSeconds(first), 0, now);
        ASSERT_EQ(passed.latest, absl::ToUnixSeconds(latest)) << step;
        ASSERT_EQ(passed.before, before) << step;
    }
}

}  // namespace
