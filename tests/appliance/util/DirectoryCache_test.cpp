#include "appliance/util/DirectoryCache.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <filesystem>

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

}  // namespace
