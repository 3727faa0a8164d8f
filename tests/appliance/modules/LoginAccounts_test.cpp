#include "appliance/modules/LoginAccounts.h"

#include <gmock/gmock.h>

#include <algorithm>

namespace orva {
namespace {

using testing::Contains;
using testing::Not;

TEST(LoginAccounts, BeginWithRootAndLeaveOutAccountsOfPrograms) {
    const std::vector<std::string> accounts = LoginAccounts();
    ASSERT_FALSE(accounts.empty());
    EXPECT_EQ(accounts[0], "root");
    EXPECT_TRUE(std::is_sorted(accounts.begin() + 1, accounts.end()));
    // Its shell is one that logs nobody in.
    EXPECT_THAT(accounts, Not(Contains("nobody")));
    EXPECT_EQ(std::count(accounts.begin(), accounts.end(), "root"), 1);
}

}  // namespace
}  // namespace orva
