#include "appliance/schedule/StartText.h"

#include <gtest/gtest.h>

namespace orva {
namespace {

TEST(StartText, OnlyAStartThatAClockChangeTouchedHasANote) {
    EXPECT_EQ(ClockChangeNote(Start::ClockChange::kNone), "");
    EXPECT_EQ(ClockChangeNote(Start::ClockChange::kJumpedOver), "moved: the clock skips this time");
    EXPECT_EQ(ClockChangeNote(Start::ClockChange::kFirstPass),
              "the clock shows this time twice: the first of them");
    EXPECT_EQ(ClockChangeNote(Start::ClockChange::kSecondPass),
              "the clock shows this time twice: the second of them");
}

TEST(StartText, AnOffsetHasASignHoursAndMinutes) {
    const auto offset = [](const char* name, std::int64_t second) {
        absl::TimeZone zone;
        EXPECT_TRUE(absl::LoadTimeZone(name, &zone)) << name;
        return FormatOffset(absl::FromUnixSeconds(second), zone);
    };
    EXPECT_EQ(offset("UTC", 1800000000), "+00:00");
    EXPECT_EQ(offset("Asia/Kolkata", 1800000000), "+05:30");
    EXPECT_EQ(offset("America/New_York", 1800000000), "-05:00");
    EXPECT_EQ(offset("Europe/Berlin", 1815000000), "+02:00");
}

TEST(StartText, AZoneOfAPlainFileHasNoNameOfItsOwn) {
    absl::TimeZone zone;
    ASSERT_TRUE(absl::LoadTimeZone("Europe/Berlin", &zone));
    EXPECT_EQ(ZoneName(zone), "Europe/Berlin");
    ASSERT_TRUE(absl::LoadTimeZone("/./usr/share/zoneinfo/Asia/Tokyo", &zone));
    EXPECT_EQ(ZoneName(zone), "localtime");
    EXPECT_EQ(ZoneName(absl::UTCTimeZone()), "UTC");
}

TEST(StartText, OnlyAWholeUtcInstantIsOne) {
    EXPECT_EQ(ParseUtcInstant("2027-01-15T08:00:00Z"), absl::FromUnixSeconds(1800000000));
    EXPECT_EQ(ParseUtcInstant("2027-01-15T08:00:00.250Z"), absl::FromUnixMillis(1800000000250));
    for (const char* text :
         {"", "2027-01-15", "2027-01-15T08:00:00", "2027-01-15T08:00:00+01:00",
          "2027-01-15 08:00:00Z", " 2027-01-15T08:00:00Z", "2027-01-15T08:00:00Z ",
          "2027-01-15T08:00:00Zulu", "2027-02-30T08:00:00Z", "2027-01-15T24:00:00Z",
          "infinite-past", "27-01-15T08:00:00Z"}) {
        EXPECT_EQ(ParseUtcInstant(text), std::nullopt) << text;
    }
}

}  // namespace
}  // namespace orva
