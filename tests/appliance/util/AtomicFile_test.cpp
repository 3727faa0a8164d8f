#include "appliance/util/AtomicFile.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>

#include "platform/qlibc.h"
#include "tests/appliance/util/Sandbox.h"

namespace {

class AtomicFileTest : public Sandbox {
  protected:
    std::string Path(const std::string& name) const { return RootPath() + "/" + name; }

    std::size_t Entries() const {
        std::size_t count = 0;
        for ([[maybe_unused]] const auto& entry : std::filesystem::directory_iterator(RootPath())) {
            ++count;
        }
        return count;
    }
};

TEST_F(AtomicFileTest, MakesANewFile) {
    EXPECT_EQ(orva::WriteFileAtomically(Path("file"), "content"), 0);
    EXPECT_EQ(Read("/file"), "content");
    EXPECT_EQ(Entries(), 1U);
}

TEST_F(AtomicFileTest, ReplacesTheFileAndKeepsItsMode) {
    Write("/file", "a long former content");
    ASSERT_EQ(::chmod(Path("file").c_str(), 0640), 0);
    EXPECT_EQ(orva::WriteFileAtomically(Path("file"), "new"), 0);
    EXPECT_EQ(Read("/file"), "new");
    struct stat status {};
    ASSERT_EQ(::stat(Path("file").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0640U);
    EXPECT_EQ(Entries(), 1U);
}

TEST_F(AtomicFileTest, WritesOverWhatACrashLeftBehind) {
    Write("/file", "old");
    Write("/file.new", "half of a text that was being written");
    EXPECT_EQ(orva::WriteFileAtomically(Path("file"), "new"), 0);
    EXPECT_EQ(Read("/file"), "new");
    EXPECT_EQ(Entries(), 1U);
}

TEST_F(AtomicFileTest, FollowsNoLinkInThePlaceOfThePreparedFile) {
    Write("/elsewhere", "precious");
    std::filesystem::create_symlink(Path("elsewhere"), Path("file.new"));
    EXPECT_EQ(orva::WriteFileAtomically(Path("file"), "new"), 0);
    EXPECT_EQ(Read("/file"), "new");
    EXPECT_EQ(Read("/elsewhere"), "precious");
}

TEST_F(AtomicFileTest, ReplacesWhatACrashOfAnotherAccountLeftBehind) {
    Write("/file.new", "half");
    ASSERT_EQ(::chmod(Path("file.new").c_str(), 0400), 0);
    struct stat before {};
    ASSERT_EQ(::stat(Path("file.new").c_str(), &before), 0);
    EXPECT_EQ(orva::WriteFileAtomically(Path("file"), "new"), 0);
    struct stat after {};
    ASSERT_EQ(::stat(Path("file").c_str(), &after), 0);
    EXPECT_EQ(after.st_mode & 07777, 0644U);
    EXPECT_EQ(Read("/file"), "new");
}

TEST_F(AtomicFileTest, LeavesTheFormerFileWhenTheDirectoryIsGone) {
    EXPECT_LT(orva::WriteFileAtomically(Path("none/file"), "new"), 0);
    EXPECT_EQ(errno, ENOENT);
    EXPECT_EQ(QLIBCErrGet(), 0x0500);
}

TEST_F(AtomicFileTest, LeavesNothingWhenTheFileCannotBeReplaced) {
    MakeDirectory("/file/with content");
    EXPECT_LT(orva::WriteFileAtomically(Path("file"), "new"), 0);
    EXPECT_EQ(errno, EISDIR);
    EXPECT_EQ(Entries(), 1U);
}

}  // namespace
