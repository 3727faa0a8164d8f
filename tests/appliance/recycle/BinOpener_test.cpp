#include "appliance/recycle/BinOpener.h"

#include <sys/file.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>
#include <future>

#include "tests/appliance/recycle/BinTest.h"

namespace orva {
namespace {

class BinOpenerTest : public BinTest {
  protected:
    BinOpening Open(bool preview = false) {
        return OpenAndLockBin(SharePath(), preview, [this] { ++waits; });
    }
    int waits = 0;
};

TEST_F(BinOpenerTest, OpensAShareWithABin) {
    const BinOpening opening = Open();
    ASSERT_TRUE(opening.bin.has_value());
    EXPECT_EQ(opening.bin->info.kind, FileKind::kDirectory);
    EXPECT_EQ(waits, 0);
}

TEST_F(BinOpenerTest, SaysWhenThereIsNoBin) {
    std::filesystem::remove(BinPath());
    const BinOpening opening = Open();
    EXPECT_FALSE(opening.bin.has_value());
    EXPECT_TRUE(opening.noBin);
    EXPECT_FALSE(opening.noFolder);
}

TEST_F(BinOpenerTest, SaysWhenThereIsNotEvenTheFolderOfTheShare) {
    std::filesystem::remove_all(SharePath());
    const BinOpening opening = Open();
    EXPECT_FALSE(opening.bin.has_value());
    EXPECT_TRUE(opening.noFolder);
    EXPECT_EQ(opening.problem, "cannot open the share's folder: No such file or directory");
}

TEST_F(BinOpenerTest, RefusesABinThatIsALink) {
    MakeDirectory("/volume1/other");
    std::filesystem::remove(BinPath());
    ASSERT_EQ(::symlink("../other", BinPath().c_str()), 0);
    const BinOpening opening = Open();
    EXPECT_FALSE(opening.bin.has_value());
    EXPECT_FALSE(opening.noBin);
    EXPECT_EQ(opening.problem, "the recycle bin is a link or no folder: Not a directory");
}

TEST_F(BinOpenerTest, RefusesAShareThatIsALink) {
    std::filesystem::rename(SharePath(), RootPath() + "/volume1/real");
    ASSERT_EQ(::symlink("real", SharePath().c_str()), 0);
    const BinOpening opening = Open();
    EXPECT_FALSE(opening.bin.has_value());
    EXPECT_EQ(opening.problem, "the share's folder is a link or no folder: Not a directory");
}

TEST_F(BinOpenerTest, LetsPreviewsWorkBesideEachOther) {
    const BinOpening first = Open(true);
    const BinOpening second = Open(true);
    EXPECT_TRUE(second.bin.has_value());
    EXPECT_EQ(waits, 0);
}

TEST_F(BinOpenerTest, WaitsUntilTheOtherCleanIsDone) {
    std::optional<BinOpening> first = Open();
    ASSERT_TRUE(first->bin.has_value());
    std::promise<void> waiting;
    std::future<BinOpening> second = std::async(std::launch::async, [&] {
        return OpenAndLockBin(SharePath(), false, [&] { waiting.set_value(); });
    });
    waiting.get_future().wait();
    first.reset();
    EXPECT_TRUE(second.get().bin.has_value());
}

TEST_F(BinOpenerTest, DoesNotWaitForEver) {
    const BinOpening first = Open();
    const BinOpening second = OpenAndLockBin(
        SharePath(), true, [this] { ++waits; }, std::chrono::milliseconds(1));
    EXPECT_EQ(waits, 1);
    EXPECT_FALSE(second.bin.has_value());
    EXPECT_FALSE(second.noBin);
    EXPECT_EQ(second.problem, "another process has held the recycle bin for 1 second");
}

TEST_F(BinOpenerTest, OpensTheNewBinWhenTheOldOneWasReplacedWhileWaiting) {
    std::optional<BinOpening> first = Open();
    std::promise<void> waiting;
    std::future<BinOpening> second = std::async(std::launch::async, [&] {
        return OpenAndLockBin(SharePath(), false, [&] { waiting.set_value(); });
    });
    waiting.get_future().wait();
    std::filesystem::rename(BinPath(), SharePath() + "/restored");
    std::filesystem::create_directory(BinPath());
    first.reset();
    const BinOpening opening = second.get();
    struct stat named {};
    ASSERT_EQ(::stat(BinPath().c_str(), &named), 0);
    ASSERT_TRUE(opening.bin.has_value());
    EXPECT_EQ(opening.bin->info.inode, named.st_ino);
}

}  // namespace
}  // namespace orva
