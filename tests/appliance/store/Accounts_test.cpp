#include "appliance/store/Accounts.h"

#include <gtest/gtest.h>
#include <pwd.h>
#include <unistd.h>

namespace {

TEST(Accounts, KnowsTheMachinesAccounts) {
    EXPECT_TRUE(orva::AccountExists("root"));
    EXPECT_TRUE(orva::AccountExists("daemon"));
    EXPECT_FALSE(orva::AccountExists("no-such-account"));
    EXPECT_FALSE(orva::AccountExists(""));
    EXPECT_FALSE(orva::AccountExists(std::string("root\0x", 6)));
    EXPECT_FALSE(orva::AccountExists(std::string(100000, 'x')));
}

TEST(Accounts, NamesAnAccountByItsUserId) {
    EXPECT_EQ(orva::AccountName(0), "root");
    EXPECT_EQ(orva::AccountName(4000000001U), "");
    const passwd* self = ::getpwuid(::geteuid());
    EXPECT_EQ(orva::OwnAccount(), self == nullptr ? "" : self->pw_name);
}

}  // namespace
