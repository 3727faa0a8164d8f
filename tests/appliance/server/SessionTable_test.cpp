#include "appliance/server/SessionTable.h"

#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <vector>

#include "tests/appliance/server/Requests.h"

namespace {

using orva::SessionTable;
using namespace std::chrono_literals;

class SessionTableTest : public testing::Test {
  protected:
    orva::test::TestClock clock;
    SessionTable sessions{clock.Read()};
};

TEST_F(SessionTableTest, KnowsTheSessionsThatItBegan) {
    const std::string one = sessions.Begin();
    const std::string two = sessions.Begin();
    EXPECT_EQ(one.size(), 64U);
    EXPECT_NE(one, two);
    EXPECT_TRUE(sessions.IsOpen(one));
    EXPECT_TRUE(sessions.IsOpen(two));
    for (const std::string& other : {std::string(), std::string("x"), std::string(64, '0'),
                                     one.substr(1), one + "0", std::string(100'000, 'a')}) {
        EXPECT_FALSE(sessions.IsOpen(other)) << other.size();
    }
}

TEST_F(SessionTableTest, EndsASessionThatIsSignedOut) {
    const std::string one = sessions.Begin();
    const std::string two = sessions.Begin();
    sessions.End(one);
    sessions.End("unknown");
    EXPECT_FALSE(sessions.IsOpen(one));
    EXPECT_TRUE(sessions.IsOpen(two));
}

TEST_F(SessionTableTest, EndsASessionAfterTwelveHours) {
    const std::string one = sessions.Begin();
    clock.Advance(12h - 1ms);
    EXPECT_TRUE(sessions.IsOpen(one));
    const std::string two = sessions.Begin();
    clock.Advance(1ms);
    EXPECT_FALSE(sessions.IsOpen(one));
    EXPECT_TRUE(sessions.IsOpen(two));
}

TEST_F(SessionTableTest, EndsTheOldestWhenThereAreTooMany) {
    std::vector<std::string> ids;
    for (int i = 0; i < 101; ++i) {
        ids.push_back(sessions.Begin());
    }
    EXPECT_FALSE(sessions.IsOpen(ids[0]));
    EXPECT_TRUE(sessions.IsOpen(ids[1]));
    EXPECT_TRUE(sessions.IsOpen(ids[100]));
}

TEST_F(SessionTableTest, TakesItsTimeFromTheMachineWhenNoOtherIsGiven) {
    SessionTable real;
    const std::string id = real.Begin();
    EXPECT_TRUE(real.IsOpen(id));
}

TEST_F(SessionTableTest, ServesThreadsAtOnce) {
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([this] {
            for (int i = 0; i < 20; ++i) {
                const std::string id = sessions.Begin();
                EXPECT_TRUE(sessions.IsOpen(id));
                sessions.End(id);
                EXPECT_FALSE(sessions.IsOpen(id));
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
}

}  // namespace
