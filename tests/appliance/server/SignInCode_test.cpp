#include "appliance/server/SignInCode.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "tests/appliance/server/Requests.h"
#include "tests/system/Process.h"

namespace {

using orva::AccessToken;
using orva::MakeSignInCode;
using orva::SignInCodes;
using namespace std::chrono_literals;

class SignInCodeTest : public testing::Test {
  protected:
    AccessToken TokenOf(const std::string& digits) const {
        const std::string file = sandbox.Write("token-" + digits.substr(0, 4), digits);
        ::chmod(file.c_str(), 0600);
        std::string error;
        return AccessToken::LoadOrCreate(file, error).value();
    }

    orva::test::Sandbox sandbox;
    orva::test::TestClock clock;
    AccessToken token = TokenOf(orva::test::kToken);
    SignInCodes codes{token, clock.Read()};
};

TEST_F(SignInCodeTest, IsGoodOnce) {
    const std::string code = MakeSignInCode(token, clock.Read());
    EXPECT_EQ(code.size(), 64U);
    EXPECT_EQ(code.find_first_not_of("0123456789abcdef"), std::string::npos);
    EXPECT_TRUE(codes.Redeem(code));
    EXPECT_FALSE(codes.Redeem(code));
}

TEST_F(SignInCodeTest, IsGoodBesideOthers) {
    const std::string one = MakeSignInCode(token, clock.Read());
    const std::string two = MakeSignInCode(token, clock.Read());
    EXPECT_NE(one, two);
    EXPECT_TRUE(codes.Redeem(two));
    EXPECT_TRUE(codes.Redeem(one));
}

TEST_F(SignInCodeTest, IsGoodForTenMinutes) {
    const std::string early = MakeSignInCode(token, clock.Read());
    clock.Advance(1ms);
    const std::string late = MakeSignInCode(token, clock.Read());
    clock.Advance(10min - 1ms);
    EXPECT_FALSE(codes.Redeem(early));
    EXPECT_TRUE(codes.Redeem(late));
    clock.Advance(10min);
    EXPECT_FALSE(codes.Redeem(late));
}

TEST_F(SignInCodeTest, IsRefusedBeforeItsTime) {
    orva::test::TestClock ahead;
    ahead.Advance(1ms);
    EXPECT_FALSE(codes.Redeem(MakeSignInCode(token, ahead.Read())));
}

TEST_F(SignInCodeTest, IsRefusedByAServerThatStartedAfterIt) {
    const std::string code = MakeSignInCode(token, clock.Read());
    clock.Advance(1ms);
    SignInCodes restarted{token, clock.Read()};
    EXPECT_FALSE(restarted.Redeem(code));
    EXPECT_TRUE(codes.Redeem(code));
}

TEST_F(SignInCodeTest, IsRefusedWhenAnythingOfItIsAnother) {
    const std::string code = MakeSignInCode(token, clock.Read());
    for (std::size_t i = 0; i < code.size(); ++i) {
        std::string other = code;
        other[i] = other[i] == '0' ? '1' : '0';
        EXPECT_FALSE(codes.Redeem(other)) << i;
    }
    for (const std::string& other :
         {std::string(), code.substr(1), code + "0", std::string(64, '0'), std::string(64, 'x')}) {
        EXPECT_FALSE(codes.Redeem(other)) << other;
    }
    EXPECT_TRUE(codes.Redeem(code));
}

TEST_F(SignInCodeTest, IsRefusedWhenItComesFromAnotherToken) {
    const AccessToken other = TokenOf(std::string(64, 'f'));
    EXPECT_FALSE(codes.Redeem(MakeSignInCode(other, clock.Read())));
}

TEST_F(SignInCodeTest, IsGoodOnceHoweverManyTryItAtATime) {
    const std::string code = MakeSignInCode(token, clock.Read());
    std::atomic<int> redeemed = 0;
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([&] { redeemed += codes.Redeem(code) ? 1 : 0; });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(redeemed, 1);
}

}  // namespace
