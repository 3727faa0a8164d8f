#include "appliance/share/RecycleBin.h"

#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>

#include "platform/qlibc.h"
#include "tests/appliance/util/Sandbox.h"

namespace {

class RecycleBinTest : public Sandbox {
  protected:
    RecycleBinTest() { MakeDirectory("/share"); }

    std::string SharePath() const { return RootPath() + "/share"; }

    mode_t ModeOf(const std::string& path) const {
        struct stat status {};
        EXPECT_EQ(::lstat(path.c_str(), &status), 0) << path;
        return status.st_mode & 07777;
    }
};

TEST_F(RecycleBinTest, MakesTheFolderWithTheSharesRightsAndNoneForOthers) {
    ASSERT_EQ(::chmod(SharePath().c_str(), 0777), 0);
    EXPECT_EQ(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_EQ(ModeOf(SharePath() + "/.recycle"), 0770U);
}

TEST_F(RecycleBinTest, GivesTheGroupNoMoreThanTheShareDoes) {
    ASSERT_EQ(::chmod(SharePath().c_str(), 0750), 0);
    EXPECT_EQ(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_EQ(ModeOf(SharePath() + "/.recycle"), 0750U);
}

TEST_F(RecycleBinTest, IsNotNarrowedByTheProgramsUmask) {
    ASSERT_EQ(::chmod(SharePath().c_str(), 0770), 0);
    const mode_t former = ::umask(0077);
    EXPECT_EQ(orva::MakeRecycleBin(SharePath()), 0);
    ::umask(former);
    EXPECT_EQ(ModeOf(SharePath() + "/.recycle"), 0770U);
}

TEST_F(RecycleBinTest, LeavesAnExistingFolderAsItIs) {
    Write("/share/.recycle/deleted", "content");
    ASSERT_EQ(::chmod((SharePath() + "/.recycle").c_str(), 0700), 0);
    EXPECT_EQ(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_EQ(ModeOf(SharePath() + "/.recycle"), 0700U);
    EXPECT_EQ(Read("/share/.recycle/deleted"), "content");
}

TEST_F(RecycleBinTest, RefusesALinkInTheFoldersPlace) {
    MakeDirectory("/elsewhere");
    ASSERT_EQ(::chmod((RootPath() + "/elsewhere").c_str(), 0700), 0);
    std::filesystem::create_symlink(RootPath() + "/elsewhere", SharePath() + "/.recycle");
    EXPECT_LT(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0400);
    EXPECT_EQ(ModeOf(RootPath() + "/elsewhere"), 0700U);
}

TEST_F(RecycleBinTest, RefusesALinkThatLeadsNowhere) {
    std::filesystem::create_symlink(RootPath() + "/nowhere", SharePath() + "/.recycle");
    EXPECT_LT(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0400);
    EXPECT_FALSE(std::filesystem::exists(RootPath() + "/nowhere"));
}

TEST_F(RecycleBinTest, RefusesAFileInTheFoldersPlace) {
    Write("/share/.recycle", "a file");
    EXPECT_LT(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0400);
    EXPECT_EQ(Read("/share/.recycle"), "a file");
}

TEST_F(RecycleBinTest, RefusesAShareThatIsALink) {
    std::filesystem::create_symlink("share", RootPath() + "/link");
    EXPECT_LT(orva::MakeRecycleBin(RootPath() + "/link"), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0400);
    EXPECT_FALSE(std::filesystem::exists(SharePath() + "/.recycle"));
}

TEST_F(RecycleBinTest, FailsWithoutTheShare) {
    EXPECT_LT(orva::MakeRecycleBin(RootPath() + "/none"), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0300);
}

}  // namespace
