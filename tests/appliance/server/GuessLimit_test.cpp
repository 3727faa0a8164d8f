#include "appliance/server/GuessLimit.h"

#include <gtest/gtest.h>
#include <syslog.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "tests/appliance/server/Requests.h"

namespace {

using orva::GuessLimit;
using orva::PeerAddress;
using orva::test::Peer;
using namespace std::chrono_literals;

class GuessLimitTest : public testing::Test {
  protected:
    // The seconds to wait; 0 when the guess is looked at.
    long Take(const PeerAddress& address) {
        return static_cast<long>(limit.Take(address).value_or(0s).count());
    }

    orva::test::TestClock clock;
    GuessLimit limit{clock.Read()};
};

TEST_F(GuessLimitTest, LooksAtFiveGuessesAMinute) {
    for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(Take(Peer(1)), 0) << i;
        clock.Advance(1s);
    }
    EXPECT_EQ(Take(Peer(1)), 55);
    clock.Advance(100ms);
    EXPECT_EQ(Take(Peer(1)), 55);
    clock.Advance(54'899ms);
    EXPECT_EQ(Take(Peer(1)), 1);
    clock.Advance(1ms);
    EXPECT_EQ(Take(Peer(1)), 0);
    EXPECT_EQ(Take(Peer(1)), 1);
}

TEST_F(GuessLimitTest, CountsEachAddressByItself) {
    for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(Take(Peer(1)), 0);
    }
    EXPECT_EQ(Take(Peer(1)), 60);
    EXPECT_EQ(Take(Peer(2)), 0);
}

TEST_F(GuessLimitTest, DoesNotCountWhatWasRight) {
    for (int i = 0; i < 20; ++i) {
        EXPECT_EQ(Take(Peer(1)), 0);
        limit.GiveBack(Peer(1));
    }
    limit.GiveBack(Peer(2));
    for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(Take(Peer(1)), 0);
    }
    EXPECT_EQ(Take(Peer(1)), 60);
}

TEST_F(GuessLimitTest, DoesNotLetRefusedGuessesProlongTheWait) {
    for (int i = 0; i < 5; ++i) {
        Take(Peer(1));
    }
    for (int i = 0; i < 59; ++i) {
        clock.Advance(1s);
        EXPECT_EQ(Take(Peer(1)), 59 - i);
    }
    clock.Advance(1s);
    EXPECT_EQ(Take(Peer(1)), 0);
}

TEST_F(GuessLimitTest, ForgetsTheAddressThatGuessedLongestAgoWhenThereAreTooMany) {
    const auto numbered = [](std::size_t number) {
        PeerAddress address = Peer(0);
        address[14] = static_cast<std::uint8_t>(number / 256);
        address[15] = static_cast<std::uint8_t>(number % 256);
        return address;
    };
    for (std::size_t i = 0; i < GuessLimit::kMostAddresses; ++i) {
        for (int guess = 0; guess < 5; ++guess) {
            EXPECT_EQ(Take(numbered(i)), 0);
        }
        clock.Advance(1ms);
    }
    EXPECT_NE(Take(numbered(0)), 0);
    EXPECT_EQ(Take(numbered(GuessLimit::kMostAddresses)), 0);
    EXPECT_NE(Take(numbered(1)), 0);
    EXPECT_EQ(Take(numbered(0)), 0);
}

TEST_F(GuessLimitTest, LogsOnceThatAnAddressIsRefused) {
    ::openlog("test", LOG_PERROR, LOG_USER);
    testing::internal::CaptureStderr();
    for (int i = 0; i < 9; ++i) {
        Take(Peer(7));
    }
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "test: 192.0.2.7 presents wrong tokens; its further guesses are not looked at\n");
}

TEST_F(GuessLimitTest, LooksAtNoMoreGuessesWhenTheyComeAtOnce) {
    std::atomic<int> looked = 0;
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([&] {
            for (int i = 0; i < 50; ++i) {
                looked += Take(Peer(1)) == 0 ? 1 : 0;
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(looked, 5);
}

}  // namespace
