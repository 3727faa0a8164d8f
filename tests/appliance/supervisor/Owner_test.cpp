#include "appliance/supervisor/Owner.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>

#include "appliance/store/Accounts.h"

namespace {

const std::string& OwnName() { return orva::OwnAccount(); }

TEST(OwnerTest, FindsThisProcesssOwnAccount) {
    std::string why;
    const std::optional<orva::Owner> owner = orva::FindOwner(OwnName(), why);
    ASSERT_TRUE(owner) << why;
    EXPECT_EQ(owner->name, OwnName());
    EXPECT_EQ(owner->user, ::geteuid());
    EXPECT_EQ(owner->home.substr(0, 1), "/");
}

TEST(OwnerTest, SaysThatAnAccountIsGone) {
    for (const std::string& name :
         {std::string("no-such-account-here"), std::string(), OwnName() + std::string("\0x", 2)}) {
        std::string why;
        EXPECT_FALSE(orva::FindOwner(name, why));
        EXPECT_EQ(why, "the owner is gone");
    }
}

TEST(OwnerTest, OnlyRootRunsWhatIsOthers) {
    std::string why;
    const std::optional<orva::Owner> other =
        orva::FindOwner(::geteuid() == 0 ? "nobody" : "root", why);
    EXPECT_EQ(other.has_value(), ::geteuid() == 0);
    EXPECT_EQ(why, ::geteuid() == 0 ? "" : "not permitted");
}

TEST(OwnerTest, IsOnlyTheAccountWithTheSameGroups) {
    std::string why;
    std::optional<orva::Owner> owner = orva::FindOwner(OwnName(), why);
    ASSERT_TRUE(owner);
    orva::Owner other = *owner;
    other.user += 1;
    EXPECT_FALSE(orva::IsOwner(other));
    other = *owner;
    other.group += 1;
    // Another user than root cannot change its groups anyway.
    EXPECT_EQ(orva::IsOwner(other), ::geteuid() != 0);
}

TEST(OwnerTest, TheEnvironmentIsTheSameWhateverThisProcesssIs) {
    const orva::Owner owner{"alice", "/home/alice", 1000, 1000};
    ::setenv("TZ", "Asia/Kolkata", 1);
    ::setenv("SECRET", "secret", 1);
    ::setenv("LANG", "de_DE.UTF-8", 1);
    ::setenv("ORVA_ROOT", "/", 1);
    EXPECT_EQ(
        orva::CleanEnvironment(owner, {}),
        (std::vector<std::string>{
            "PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin", "HOME=/home/alice",
            "USER=alice", "LOGNAME=alice", "SHELL=/bin/sh", "LANG=C.UTF-8", "TZ=Asia/Kolkata"}));
    ::unsetenv("TZ");
    ::unsetenv("SECRET");
    ::unsetenv("LANG");
    ::unsetenv("ORVA_ROOT");
}

TEST(OwnerTest, TheEnvironmentNamesAnotherRootAndWhatIsAskedFor) {
    const orva::Owner owner{"alice", "/home/alice", 1000, 1000};
    ::setenv("TZ", "UTC", 1);
    ::setenv("ORVA_ROOT", "/srv/appliance", 1);
    EXPECT_EQ(orva::CleanEnvironment(owner, {{"HOME", "/"}, {"MORE", "a=b"}}),
              (std::vector<std::string>{
                  "PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin", "HOME=/",
                  "USER=alice", "LOGNAME=alice", "SHELL=/bin/sh", "LANG=C.UTF-8", "TZ=UTC",
                  "ORVA_ROOT=/srv/appliance", "MORE=a=b"}));
    ::unsetenv("TZ");
    ::unsetenv("ORVA_ROOT");
}

TEST(OwnerTest, WithoutATimeZoneOfItsOwnItTakesTheMachines) {
    ::unsetenv("TZ");
    const std::vector<std::string> environment =
        orva::CleanEnvironment({"alice", "/home/alice", 1000, 1000}, {});
    EXPECT_EQ(environment[6].substr(0, 3), "TZ=");
    EXPECT_GT(environment[6].size(), 3U);
}

}  // namespace
