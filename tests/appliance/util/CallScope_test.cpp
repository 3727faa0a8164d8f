#include "appliance/util/CallScope.h"

#include <gtest/gtest.h>

#include <thread>

namespace {

using orva::CallScope;

TEST(CallScopeTest, EachCallOfAThreadHasANumberOfItsOwnUntilItEnds) {
    EXPECT_EQ(CallScope::Current(), 0U);
    std::uint64_t first = 0;
    {
        const CallScope call;
        first = CallScope::Current();
        EXPECT_NE(first, 0U);
        EXPECT_EQ(CallScope::Current(), first);
    }
    EXPECT_EQ(CallScope::Current(), 0U);
    const CallScope call;
    EXPECT_NE(CallScope::Current(), 0U);
    EXPECT_NE(CallScope::Current(), first);
}

TEST(CallScopeTest, AThreadIsInNoCallBecauseAnotherOneIs) {
    const CallScope call;
    std::uint64_t other = 1;
    std::thread([&] { other = CallScope::Current(); }).join();
    EXPECT_EQ(other, 0U);
}

}  // namespace
