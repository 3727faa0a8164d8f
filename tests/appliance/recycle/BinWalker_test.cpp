#include "appliance/recycle/BinWalker.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <filesystem>
#include <fstream>
#include <functional>
#include <thread>

#include "tests/appliance/recycle/BinTest.h"

namespace orva {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

// Removes everything, and calls `before` with each path that it is about to remove.
class RemovingVisitor final : public BinVisitor {
  public:
    RemovingVisitor(DirectoryTree& binTree, std::function<void(const std::string&)> hook)
        : tree(binTree), before(std::move(hook)) {}

    Fate File(DirectoryTree::Index directory, int fd, const char* name, const FileInfo&) override {
        before(tree.Path(directory) + name);
        removed.insert(tree.Path(directory) + name);
        return ::unlinkat(fd, name, 0) == 0 ? Fate::kGone : Fate::kStays;
    }
    Fate EmptyDirectory(DirectoryTree::Index directory) override {
        before(tree.Path(directory));
        const int parent = tree.Fd(tree.Parent(directory));
        if (parent >= 0 && ::unlinkat(parent, tree.Name(directory), AT_REMOVEDIR) == 0) {
            return Fate::kGone;
        }
        return errno == ENOTEMPTY ? Fate::kRefilled : Fate::kStays;
    }
    bool KeptDirectory(DirectoryTree::Index) override { return false; }
    void MountPoint(DirectoryTree::Index, const char*) override { ++mounts; }
    void Unreadable(DirectoryTree::Index, const char*, int) override { ++unreadable; }
    bool Removes() const override { return true; }

    std::set<std::string> removed;
    int mounts = 0;
    int unreadable = 0;

  private:
    DirectoryTree& tree;
    std::function<void(const std::string&)> before;
};

class BinWalkerTest : public BinTest {
  protected:
    // Walks the bin and gives what was removed.
    std::set<std::string> Walk(const std::function<void(const std::string&)>& hook) {
        BinOpening opening = OpenAndLockBin(SharePath(), false, [] {});
        DirectoryTree tree(std::move(opening.bin->share), kBinFolder, std::move(opening.bin->bin),
                           opening.bin->info);
        RemovingVisitor visitor(tree, hook);
        BinWalker(tree, visitor).Walk();
        EXPECT_EQ(visitor.unreadable, 0);
        return visitor.removed;
    }

    void Outside(const std::string& name) const { Write("/volume1/photo/outside/" + name, "x"); }
    bool IsOutside(const std::string& name) const {
        return std::filesystem::exists(SharePath() + "/outside/" + name);
    }
};

TEST_F(BinWalkerTest, VisitsEveryFileOnce) {
    File("a/1");
    File("a/b/2");
    File("3");
    EXPECT_THAT(Walk([](const std::string&) {}), UnorderedElementsAre("a/1", "a/b/2", "3"));
    EXPECT_THAT(Contents(), IsEmpty());
}

TEST_F(BinWalkerTest, GoesNowhereThroughALinkInTheLastMoment) {
    Outside("precious");
    File("first");
    File("folder/precious");
    Walk([&](const std::string& path) {
        if (path == "first") {
            std::filesystem::remove_all(InBin("folder"));
            ASSERT_EQ(::symlink("../outside", InBin("folder").c_str()), 0);
        }
    });
    EXPECT_TRUE(IsOutside("precious"));
    EXPECT_THAT(Contents(), ElementsAre("folder"));
}

TEST_F(BinWalkerTest, StopsInAFolderThatWasMovedOutOfTheBin) {
    constexpr int kFiles = 1000;
    for (int at = 0; at < kFiles; ++at) {
        std::ofstream(InBin("file") + std::to_string(at));
    }
    Directory("folder/deeper");
    for (int at = 0; at < kFiles; ++at) {
        std::ofstream(InBin("folder/deeper/file") + std::to_string(at));
    }
    bool moved = false;
    Walk([&](const std::string& path) {
        if (!moved && path.starts_with("folder/deeper/file")) {
            std::filesystem::rename(InBin("folder"), SharePath() + "/restored");
            moved = true;
        }
    });
    ASSERT_TRUE(moved);
    const auto left =
        std::distance(std::filesystem::directory_iterator(SharePath() + "/restored/deeper"), {});
    // The removals until the next look at the folder's place are lost, no more.
    EXPECT_GE(left, kFiles - 40);
    EXPECT_THAT(Contents(), IsEmpty());
}

TEST_F(BinWalkerTest, LeavesTheOtherFoldersOfAMovedFolderAlone) {
    for (const char* name : {"1", "2", "3"}) {
        Directory("folder/" + std::string(name));
        for (int at = 0; at < 100; ++at) {
            std::ofstream(InBin("folder/") + name + "/file" + std::to_string(at));
        }
    }
    bool moved = false;
    Walk([&](const std::string&) {
        if (!moved) {
            std::filesystem::rename(InBin("folder"), SharePath() + "/restored");
            moved = true;
        }
    });
    std::ptrdiff_t left = 0;
    for (const char* name : {"/1", "/2", "/3"}) {
        left += std::distance(std::filesystem::directory_iterator(SharePath() + "/restored" + name),
                              {});
    }
    EXPECT_GE(left, 300 - 40);
}

TEST_F(BinWalkerTest, TakesFilesThatAppearInAFolderMeanwhile) {
    File("folder/one");
    int added = 0;
    Walk([&](const std::string& path) {
        if (path == "folder/" && added < 2) {
            File("folder/late" + std::to_string(added++));
        }
    });
    EXPECT_EQ(added, 2);
    EXPECT_THAT(Contents(), IsEmpty());
}

TEST_F(BinWalkerTest, EndsThoughFilesKeepAppearing) {
    File("folder/one");
    int added = 0;
    Walk([&](const std::string& path) {
        if (path == "folder/") {
            File("folder/late" + std::to_string(added++));
        }
    });
    EXPECT_GT(added, 1);
    EXPECT_LT(added, 10);
    EXPECT_FALSE(Contents().empty());
}

TEST_F(BinWalkerTest, NeverRemovesAFileOutsideWhileFoldersTurnIntoLinks) {
    constexpr int kRounds = 300;
    Outside("file");
    std::atomic<bool> done = false;
    std::atomic<int> swaps = 0;
    std::thread attacker([&] {
        const std::string folder = InBin("folder");
        const std::string aside = SharePath() + "/aside";
        while (!done) {
            // The same name is by turns a folder with a file and a link to one with such a file.
            if (::rename(folder.c_str(), aside.c_str()) == 0 &&
                ::symlink("../outside", folder.c_str()) == 0) {
                ++swaps;
                ::unlink(folder.c_str());
            }
            ::rename(aside.c_str(), folder.c_str());
        }
    });
    for (int round = 0; round < kRounds; ++round) {
        std::error_code ignored;
        std::filesystem::create_directory(InBin("folder"), ignored);
        const std::ofstream made(InBin("folder/file"));
        Walk([](const std::string&) {});
        ASSERT_TRUE(IsOutside("file")) << "round " << round;
    }
    while (swaps < 100) {
        std::error_code ignored;
        std::filesystem::create_directory(InBin("folder"), ignored);
        Walk([](const std::string&) {});
        ASSERT_TRUE(IsOutside("file"));
    }
    done = true;
    attacker.join();
}

TEST_F(BinWalkerTest, WorksWhileOthersCreateAndRemoveFiles) {
    std::atomic<bool> done = false;
    std::atomic<int> rounds = 0;
    std::thread busy([&] {
        for (int at = 0; !done; at = (at + 1) % 50) {
            const std::string folder = InBin("folder" + std::to_string(at % 7));
            ::mkdir(folder.c_str(), 0755);
            const std::string file = folder + "/file" + std::to_string(at);
            ::close(::open(file.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0644));
            if (at % 3 == 0) {
                ::unlink(file.c_str());
            }
            ++rounds;
        }
    });
    for (int round = 0; round < 100 || rounds < 1000; ++round) {
        Walk([](const std::string&) {});
    }
    done = true;
    busy.join();
    Walk([](const std::string&) {});
    EXPECT_THAT(Contents(), IsEmpty());
}

}  // namespace
}  // namespace orva
