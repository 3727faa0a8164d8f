#include "appliance/util/FileRead.h"

#include <sys/stat.h>

#include <cerrno>
#include <ctime>

#include "tests/appliance/util/Sandbox.h"

namespace {

using orva::FileIdentity;

constexpr std::int64_t kSecond = 1'000'000'000;

std::int64_t Now() {
    timespec now{};
    ::clock_gettime(CLOCK_REALTIME, &now);
    return now.tv_sec * kSecond + now.tv_nsec;
}

TEST(FileIdentityTest, IsSettledOnceItsTimesAreWellPast) {
    const std::int64_t now = Now();
    EXPECT_TRUE((FileIdentity{1, 2, 3, now - kSecond, now - kSecond}.IsSettled()));
    EXPECT_FALSE((FileIdentity{1, 2, 3, now - kSecond, now + 3600 * kSecond}.IsSettled()));
    EXPECT_FALSE((FileIdentity{1, 2, 3, now + 3600 * kSecond, now - kSecond}.IsSettled()));
    // Just changed: another change may still leave the same times behind.
    EXPECT_FALSE((FileIdentity{1, 2, 3, now, Now()}.IsSettled()));
}

class FileReadTest : public Sandbox {
  protected:
    std::string content = "before";
    FileIdentity identity;
};

TEST_F(FileReadTest, ReadsTheWholeFileWithItsIdentity) {
    const std::string text(100000, 'x');
    Write("/file", text);
    EXPECT_EQ(orva::ReadFile(RootPath() + "/file", 100000, content, identity), 0);
    EXPECT_EQ(content, text);
    EXPECT_EQ(identity.size, 100000);
    FileIdentity same;
    EXPECT_EQ(orva::GetFileIdentity(RootPath() + "/file", same), 0);
    EXPECT_EQ(identity, same);
}

TEST_F(FileReadTest, ReadsAnEmptyFile) {
    Write("/file", "");
    EXPECT_EQ(orva::ReadFile(RootPath() + "/file", 10, content, identity), 0);
    EXPECT_EQ(content, "");
}

TEST_F(FileReadTest, SaysWhyAFileCannotBeRead) {
    MakeDirectory("/directory");
    Write("/file", "12345678901");
    ASSERT_EQ(::mkfifo((RootPath() + "/pipe").c_str(), 0600), 0);
    EXPECT_EQ(orva::ReadFile(RootPath() + "/none", 10, content, identity), ENOENT);
    EXPECT_EQ(orva::ReadFile(RootPath() + "/file/x", 10, content, identity), ENOTDIR);
    EXPECT_EQ(orva::ReadFile(RootPath() + "/directory", 10, content, identity), EINVAL);
    EXPECT_EQ(orva::ReadFile(RootPath() + "/pipe", 10, content, identity), EINVAL);
    EXPECT_EQ(orva::ReadFile(RootPath() + "/file", 10, content, identity), EFBIG);
    EXPECT_EQ(orva::GetFileIdentity(RootPath() + "/none", identity), ENOENT);
}

}  // namespace
