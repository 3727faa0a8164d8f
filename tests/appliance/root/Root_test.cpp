#include "appliance/root/Root.h"

#include <gtest/gtest.h>
#include <stdlib.h>
#include <unistd.h>

#include <filesystem>

namespace {

TEST(RootTest, ResolvesPathsOfTheApplianceBelowTheRoot) {
    orva::SetRoot("/srv/box");
    EXPECT_EQ(orva::Root(), "/srv/box");
    EXPECT_EQ(orva::ResolvePath("/usr/orva/etc/orva.conf"), "/srv/box/usr/orva/etc/orva.conf");
}

TEST(RootTest, LeavesPathsOfAnInstalledApplianceAsTheyAre) {
    orva::SetRoot("/");
    EXPECT_EQ(orva::Root(), "/");
    EXPECT_EQ(orva::ResolvePath("/usr/orva/etc/orva.conf"), "/usr/orva/etc/orva.conf");
}

TEST(RootTest, TidiesTheDirectoryUp) {
    orva::SetRoot("/srv//box/./data/..///");
    EXPECT_EQ(orva::Root(), "/srv/box");
}

TEST(RootTest, TakesARelativeDirectoryFromTheWorkingDirectory) {
    orva::SetRoot("box");
    EXPECT_EQ(orva::Root(), std::filesystem::current_path().string() + "/box");
}

TEST(RootTest, TellsChildrenOfTheProgram) {
    orva::SetRoot("/srv/box");
    EXPECT_STREQ(::getenv("ORVA_ROOT"), "/srv/box");
}

TEST(RootTest, SaysWhyItCanHoldNoAppliance) {
    orva::SetRoot("/no/such/place");
    EXPECT_EQ(orva::RootProblem(), "the root /no/such/place: No such file or directory");
    orva::SetRoot("/dev/null");
    EXPECT_EQ(orva::RootProblem(), "the root /dev/null: Not a directory");
    orva::SetRoot("/dev");
    EXPECT_EQ(orva::RootProblem(), "");
}

// What a fresh process makes of its environment; it says so by its exit status.
void ExpectFirstRoot(const char* environment, const char* root) {
    EXPECT_EXIT(
        {
            if (environment != nullptr) {
                ::setenv("ORVA_ROOT", environment, 1);
            } else {
                ::unsetenv("ORVA_ROOT");
            }
            ::_exit(orva::Root() == root ? 0 : 1);
        },
        testing::ExitedWithCode(0), "");
}

TEST(RootDeathTest, StartsAsTheEnvironmentSays) {
    testing::GTEST_FLAG(death_test_style) = "threadsafe";
    ExpectFirstRoot("/srv/other/", "/srv/other");
    ExpectFirstRoot("", "/");
    ExpectFirstRoot(nullptr, "/");
}

}  // namespace
