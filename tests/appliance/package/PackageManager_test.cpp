#include "platform/package.h"

#include <gmock/gmock.h>

#include <filesystem>

#include "platform/qlibc.h"
#include "tests/appliance/util/Sandbox.h"

namespace {

using ORVAPackageTool::PackageInfo;
using ORVAPackageTool::PackageManager;
using testing::ElementsAre;
using testing::IsEmpty;

class PackageManagerTest : public Sandbox {
  protected:
    void Install(const std::string& id, const std::string& description) const {
        Write("/usr/orva/packages/" + id + "/package.json", description);
    }
    std::string FileOf(const std::string& id) const {
        return RootPath() + "/usr/orva/packages/" + id + "/package.json";
    }
};

TEST_F(PackageManagerTest, HasNoPackagesWithoutTheDirectory) {
    PackageManager manager;
    EXPECT_TRUE(manager.init());
    EXPECT_THAT(manager.enumPackages(nullptr), IsEmpty());
}

TEST_F(PackageManagerTest, EnumeratesPackagesInByteOrder) {
    for (const char* id : {"b", "a", "B", "ä", "a.b", "a b"}) {
        Install(id, R"({"display_name": "x"})");
    }
    PackageManager manager;
    ASSERT_TRUE(manager.init());
    EXPECT_THAT(manager.enumPackages(nullptr), ElementsAre("B", "a", "a b", "a.b", "b", "ä"));
}

TEST_F(PackageManagerTest, GivesWhatAPackageSaysOfItself) {
    Install("mail", R"({"display_name": "Mail Server", "startable": true, "start": "go"})");
    Install("fonts", R"({"display_name": "Fonts", "startable": false})");
    PackageManager manager;
    ASSERT_TRUE(manager.init());
    PackageInfo info;
    EXPECT_TRUE(manager.getPackageInfo("mail", info, nullptr));
    EXPECT_EQ(info.displayName, "Mail Server");
    EXPECT_TRUE(info.startable);
    EXPECT_EQ(info.startCommand, "go");
    EXPECT_TRUE(manager.getPackageInfo("fonts", info, nullptr));
    EXPECT_EQ(info.displayName, "Fonts");
    EXPECT_FALSE(info.startable);
    EXPECT_EQ(info.startCommand, "");
}

TEST_F(PackageManagerTest, ABrokenDescriptionDoesNotHideTheOthers) {
    Install("a", R"({"display_name": "A"})");
    Install("b", "{broken");
    MakeDirectory("/usr/orva/packages/c");
    Install("d", R"({"display_name": "D"})");
    PackageManager manager;
    ASSERT_TRUE(manager.init());
    EXPECT_THAT(manager.enumPackages(nullptr), ElementsAre("a", "b", "c", "d"));
    PackageInfo info;
    for (int i = 0; i < 3; ++i) {
        EXPECT_TRUE(manager.getPackageInfo("a", info, nullptr));
        EXPECT_FALSE(manager.getPackageInfo("b", info, nullptr));
        EXPECT_EQ(QLIBCErrGet(), 0x0800);
        EXPECT_FALSE(manager.getPackageInfo("c", info, nullptr));
        EXPECT_EQ(QLIBCErrGet(), 0x0300);
        EXPECT_TRUE(manager.getPackageInfo("d", info, nullptr));
        EXPECT_EQ(info.displayName, "D");
    }
    EXPECT_THAT(TakeLog(), ElementsAre(FileOf("b") + ": line 1, column 2: an unexpected character",
                                       FileOf("c") + ": No such file or directory"));
}

TEST_F(PackageManagerTest, LeavesOutWhatIsNoPackageOrHasAnUnsafeId) {
    Install("good", R"({"display_name": "Good"})");
    Install("-rf", R"({"display_name": "Bad"})");
    Install("\xFF", R"({"display_name": "Bad"})");
    Install(".unpacking", R"({"display_name": "Half"})");
    Write("/usr/orva/packages/README", "");
    PackageManager manager;
    ASSERT_TRUE(manager.init());
    EXPECT_THAT(manager.enumPackages(nullptr), ElementsAre("good"));
}

TEST_F(PackageManagerTest, RefusesIdsThatLeadElsewhere) {
    Install("good", R"({"display_name": "Good"})");
    Write("/usr/orva/package.json", R"({"display_name": "Outside"})");
    PackageManager manager;
    ASSERT_TRUE(manager.init());
    PackageInfo info;
    info.displayName = "before";
    for (const char* id : {"..", "../packages/good", "-rf", "", "."}) {
        EXPECT_FALSE(manager.getPackageInfo(id, info, nullptr)) << id;
        EXPECT_EQ(QLIBCErrGet(), 0x0D00);
    }
    EXPECT_EQ(info.displayName, "before");
}

TEST_F(PackageManagerTest, SeesInstallationsAtTheNextInit) {
    PackageManager manager;
    ASSERT_TRUE(manager.init());
    Install("new", R"({"display_name": "New"})");
    EXPECT_THAT(manager.enumPackages(nullptr), IsEmpty());
    ASSERT_TRUE(manager.init());
    EXPECT_THAT(manager.enumPackages(nullptr), ElementsAre("new"));
    std::filesystem::remove_all(RootPath() + "/usr/orva/packages/new");
    ASSERT_TRUE(manager.init());
    EXPECT_THAT(manager.enumPackages(nullptr), IsEmpty());
}

TEST_F(PackageManagerTest, SeesWhatAPackageSaysNowWithoutAnotherInit) {
    Install("a", R"({"display_name": "Old"})");
    PackageManager manager;
    ASSERT_TRUE(manager.init());
    PackageInfo info;
    ASSERT_TRUE(manager.getPackageInfo("a", info, nullptr));
    EXPECT_EQ(info.displayName, "Old");
    Install("a", R"({"display_name": "New", "start": "go"})");
    ASSERT_TRUE(manager.getPackageInfo("a", info, nullptr));
    EXPECT_EQ(info.displayName, "New");
    EXPECT_EQ(info.startCommand, "go");
    Install("a", R"({"display_name": "Newer"})");
    ASSERT_TRUE(manager.getPackageInfo("a", info, nullptr));
    EXPECT_EQ(info.displayName, "Newer");
    EXPECT_EQ(info.startCommand, "");
}

TEST_F(PackageManagerTest, SeesAnotherDirectoryInThePlaceOfTheFirstAtTheNextInit) {
    Install("a", R"({"display_name": "First"})");
    PackageManager manager;
    PackageInfo info;
    ASSERT_TRUE(manager.init());
    ASSERT_TRUE(manager.getPackageInfo("a", info, nullptr));
    std::filesystem::rename(RootPath() + "/usr/orva/packages", RootPath() + "/former");
    Install("a", R"({"display_name": "Second"})");
    Install("b", R"({"display_name": "B"})");
    ASSERT_TRUE(manager.init());
    EXPECT_THAT(manager.enumPackages(nullptr), ElementsAre("a", "b"));
    ASSERT_TRUE(manager.getPackageInfo("a", info, nullptr));
    EXPECT_EQ(info.displayName, "Second");
    std::filesystem::remove_all(RootPath() + "/usr/orva/packages");
    ASSERT_TRUE(manager.init());
    EXPECT_THAT(manager.enumPackages(nullptr), IsEmpty());
    EXPECT_FALSE(manager.getPackageInfo("a", info, nullptr));
}

TEST_F(PackageManagerTest, ReadsADescriptionBeforeAnyInit) {
    Install("a", R"({"display_name": "A"})");
    PackageInfo info;
    ASSERT_TRUE(PackageManager().getPackageInfo("a", info, nullptr));
    EXPECT_EQ(info.displayName, "A");
}

TEST_F(PackageManagerTest, FailsWhenThePlaceOfThePackagesIsNoDirectory) {
    Write("/usr/orva/packages", "");
    PackageManager manager;
    EXPECT_FALSE(manager.init());
    EXPECT_EQ(QLIBCErrGet(), 0x0500);
    EXPECT_THAT(TakeLog(), ElementsAre(RootPath() + "/usr/orva/packages: Not a directory"));
}

}  // namespace
