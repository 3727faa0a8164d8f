#include "appliance/util/StopSignals.h"

#include <gtest/gtest.h>

#include <cstdlib>

namespace orva {
namespace {

bool IsHeld(const StopSignals& signals, int number) {
    return sigismember(&signals.Held(), number) == 1;
}

TEST(StopSignalsTest, HoldsBackTheSignalsThatAskToStop) {
    const StopSignals signals;
    EXPECT_TRUE(IsHeld(signals, SIGTERM));
    EXPECT_TRUE(IsHeld(signals, SIGINT));
    EXPECT_TRUE(IsHeld(signals, SIGHUP));
    EXPECT_FALSE(IsHeld(signals, SIGQUIT));
    ::raise(SIGTERM);
    const timespec none{};
    EXPECT_EQ(::sigtimedwait(&signals.Held(), nullptr, &none), SIGTERM);
}

TEST(StopSignalsTest, LeavesIgnoredSignalsIgnored) {
    const auto former = ::signal(SIGHUP, SIG_IGN);
    {
        const StopSignals signals;
        EXPECT_FALSE(IsHeld(signals, SIGHUP));
        EXPECT_TRUE(IsHeld(signals, SIGTERM));
        ::raise(SIGHUP);
    }
    ::signal(SIGHUP, former);
}

TEST(StopSignalsTest, ASignalThatNobodyTookTakesEffectAtTheEnd) {
    testing::FLAGS_gtest_death_test_style = "threadsafe";
    EXPECT_EXIT(
        {
            {
                const StopSignals signals;
                ::raise(SIGINT);
            }
            std::_Exit(0);
        },
        testing::KilledBySignal(SIGINT), "");
}

TEST(StopSignalsTest, AProgramEndsByTheSignalThatItHeldBack) {
    testing::FLAGS_gtest_death_test_style = "threadsafe";
    EXPECT_EXIT(
        {
            const StopSignals signals;
            EndBySignal(SIGTERM);
            std::_Exit(0);
        },
        testing::KilledBySignal(SIGTERM), "");
}

}  // namespace
}  // namespace orva
