#include "appliance/util/DirectoryCache.h"

#include <gmock/gmock.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <filesystem>
#include <thread>
#include <vector>

#include "tests/appliance/util/Sandbox.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class DirectoryCacheTest : public Sandbox {
  protected:
    orva::DirectoryCache cache;
};

TEST_F(DirectoryCacheTest, GivesFoldersAndLinksToFoldersInByteOrder) {
    MakeDirectory("/d/b");
    MakeDirectory("/d/B");
    MakeDirectory("/d/ä");
    MakeDirectory("/d/.hidden");
    Write("/d/file", "");
    std::filesystem::create_symlink(RootPath() + "/d/b", RootPath() + "/d/a");
    std::filesystem::create_symlink("file", RootPath() + "/d/c");
    std::filesystem::create_symlink("nowhere", RootPath() + "/d/e");
    EXPECT_THAT(*cache.Get(RootPath() + "/d"), ElementsAre("B", "a", "b", "ä"));
}

TEST_F(DirectoryCacheTest, SharesTheListUntilItChanges) {
    MakeDirectory("/d/a");
    const auto first = cache.Get(RootPath() + "/d");
    EXPECT_EQ(cache.Get(RootPath() + "/d"), first);
    for (int i = 0; i < 200; ++i) {
        MakeDirectory("/d/b");
        ASSERT_THAT(*cache.Get(RootPath() + "/d"), ElementsAre("a", "b"));
        std::filesystem::remove(RootPath() + "/d/b");
        ASSERT_THAT(*cache.Get(RootPath() + "/d"), ElementsAre("a"));
    }
}

TEST_F(DirectoryCacheTest, TellsDirectoriesApart) {
    MakeDirectory("/d/a");
    MakeDirectory("/e/b");
    EXPECT_THAT(*cache.Get(RootPath() + "/d"), ElementsAre("a"));
    EXPECT_THAT(*cache.Get(RootPath() + "/e"), ElementsAre("b"));
}

TEST_F(DirectoryCacheTest, SeesThatALinkNoLongerLeadsToAFolder) {
    MakeDirectory("/d/a");
    MakeDirectory("/target");
    std::filesystem::create_symlink(RootPath() + "/target", RootPath() + "/d/b");
    // Nothing in /d itself changes from here on. Only a settled list is remembered.
    orva::FileIdentity identity;
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(30);
    do {
        ASSERT_EQ(orva::GetFileIdentity(RootPath() + "/d", identity), 0);
        ASSERT_LT(std::chrono::steady_clock::now(), deadline);
    } while (!identity.IsSettled());
    EXPECT_THAT(*cache.Get(RootPath() + "/d"), ElementsAre("a", "b"));
    std::filesystem::remove(RootPath() + "/target");
    EXPECT_THAT(*cache.Get(RootPath() + "/d"), ElementsAre("a"));
    MakeDirectory("/target");
    EXPECT_THAT(*cache.Get(RootPath() + "/d"), ElementsAre("a", "b"));
}

TEST_F(DirectoryCacheTest, TellsWhyADirectoryCouldNotBeRead) {
    int error = -1;
    EXPECT_THAT(*cache.Get(RootPath() + "/none", error), IsEmpty());
    EXPECT_EQ(error, ENOENT);
    Write("/file", "");
    EXPECT_THAT(*cache.Get(RootPath() + "/file", error), IsEmpty());
    EXPECT_EQ(error, ENOTDIR);
    TakeLog();
    MakeDirectory("/d/a");
    EXPECT_THAT(*cache.Get(RootPath() + "/d", error), ElementsAre("a"));
    EXPECT_EQ(error, 0);
}

TEST_F(DirectoryCacheTest, IsEmptyWithoutTheDirectory) {
    EXPECT_THAT(*cache.Get(RootPath() + "/none"), IsEmpty());
    EXPECT_THAT(TakeLog(), IsEmpty());
    MakeDirectory("/none/a");
    EXPECT_THAT(*cache.Get(RootPath() + "/none"), ElementsAre("a"));
}

TEST_F(DirectoryCacheTest, LogsOnceWhatIsNoDirectory) {
    Write("/d", "");
    EXPECT_THAT(*cache.Get(RootPath() + "/d"), IsEmpty());
    EXPECT_THAT(*cache.Get(RootPath() + "/d"), IsEmpty());
    EXPECT_THAT(TakeLog(), ElementsAre(RootPath() + "/d: Not a directory"));
    std::vector<std::string> names = {"old"};
    EXPECT_EQ(orva::ListFolders(RootPath() + "/d", names), ENOTDIR);
    EXPECT_THAT(names, IsEmpty());
}

TEST_F(DirectoryCacheTest, GivesEveryThreadAListThatWasTrueWhileAFolderComesAndGoes) {
    MakeDirectory("/d/a");
    const std::vector<std::string> without = {"a"};
    const std::vector<std::string> with = {"a", "b"};
    std::atomic<bool> over = false;
    std::atomic<int> seen = 0;
    {
        std::vector<std::jthread> readers;
        for (int reader = 0; reader < 4; ++reader) {
            readers.emplace_back([&] {
                do {
                    const auto folders = cache.Get(RootPath() + "/d");
                    EXPECT_THAT(*folders, testing::AnyOf(without, with));
                    ++seen;
                } while (!over);
            });
        }
        for (int round = 0; round < 100; ++round) {
            MakeDirectory("/d/b");
            EXPECT_EQ(*cache.Get(RootPath() + "/d"), with);
            std::filesystem::remove(RootPath() + "/d/b");
            EXPECT_EQ(*cache.Get(RootPath() + "/d"), without);
        }
        over = true;
    }
    EXPECT_GE(seen, 4);
}

}  // namespace
