#include "appliance/scheduler/ClockTrust.h"

#include <gtest/gtest.h>

#include "tests/appliance/scheduler/Instants.h"

namespace {

using orva::ClockTrust;

const absl::Time kMade = Utc("2026-05-01 00:00:00");

TEST(ClockTrustTest, AClockAfterEverythingOnRecordIsTrusted) {
    ClockTrust clock(kMade);
    EXPECT_TRUE(clock.Trusts(Utc("2026-05-01 12:00:00"), false));
    clock.Remember(Utc("2026-05-03 12:00:00"));
    EXPECT_TRUE(clock.Trusts(Utc("2026-05-03 12:00:01"), false));
}

TEST(ClockTrustTest, AClockPutBackByLessThanADayIsTrusted) {
    ClockTrust clock(kMade);
    clock.Remember(Utc("2026-05-03 12:00:00"));
    EXPECT_TRUE(clock.Trusts(Utc("2026-05-02 12:00:00"), false));
    EXPECT_FALSE(clock.Trusts(Utc("2026-05-02 11:59:59"), false));
}

TEST(ClockTrustTest, OnlyTheLatestRecordCounts) {
    ClockTrust clock(kMade);
    clock.Remember(Utc("2026-06-03 12:00:00"));
    clock.Remember(Utc("2026-05-03 12:00:00"));
    EXPECT_FALSE(clock.Trusts(Utc("2026-05-20 12:00:00"), false));
}

TEST(ClockTrustTest, AClockThatATimeServiceHasSetIsTrustedWhateverIsOnRecord) {
    ClockTrust clock(kMade);
    clock.Remember(Utc("2027-05-03 12:00:00"));
    EXPECT_TRUE(clock.Trusts(Utc("2026-05-03 12:00:00"), true));
    EXPECT_FALSE(clock.Trusts(Utc("2026-05-03 12:00:00"), false));
}

TEST(ClockTrustTest, AClockThatWasSetWhileWatchedIsTrustedWhateverIsOnRecord) {
    ClockTrust clock(kMade);
    clock.Remember(Utc("2027-05-03 12:00:00"));
    clock.ClockWasSet();
    EXPECT_TRUE(clock.Trusts(Utc("2026-05-03 12:00:00"), false));
}

TEST(ClockTrustTest, NoClockIsTrustedThatStandsBeforeTheProgramWasMade) {
    ClockTrust clock(kMade);
    clock.ClockWasSet();
    EXPECT_TRUE(clock.Trusts(Utc("2026-04-30 00:00:00"), true));
    EXPECT_FALSE(clock.Trusts(Utc("2026-04-29 23:59:59"), true));
    EXPECT_FALSE(clock.Trusts(Utc("2000-01-01 00:00:00"), true));
}

}  // namespace
