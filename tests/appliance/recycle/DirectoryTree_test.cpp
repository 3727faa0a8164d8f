#include "appliance/recycle/DirectoryTree.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>

#include "tests/appliance/recycle/BinTest.h"

namespace orva {
namespace {

class DirectoryTreeTest : public BinTest {
  protected:
    DirectoryTree Tree() const {
        FileDescriptor share(OpenDirectoryAt(AT_FDCWD, SharePath().c_str()));
        FileDescriptor bin(OpenDirectoryAt(share.Get(), ".recycle"));
        FileInfo info;
        EXPECT_EQ(ReadFileInfo(bin.Get(), "", info), 0);
        return {std::move(share), ".recycle", std::move(bin), info};
    }

    static DirectoryTree::Index AddChild(DirectoryTree& tree, DirectoryTree::Index parent,
                                         const char* name) {
        FileDescriptor fd(OpenDirectoryAt(tree.Fd(parent), name));
        FileInfo info;
        EXPECT_EQ(ReadFileInfo(fd.Get(), "", info), 0);
        return tree.Add(parent, name, std::move(fd), info.inode);
    }

    static std::uint64_t InodeOf(int fd) {
        struct stat status {};
        EXPECT_EQ(::fstat(fd, &status), 0);
        return status.st_ino;
    }

    std::uint64_t InodeAt(const std::string& name) const {
        struct stat status {};
        EXPECT_EQ(::stat(InBin(name).c_str(), &status), 0);
        return status.st_ino;
    }
};

TEST_F(DirectoryTreeTest, KeepsDescriptorsOfDirectoriesThatAreStillInTheBin) {
    Directory("a/b");
    DirectoryTree tree = Tree();
    const auto a = AddChild(tree, DirectoryTree::kBin, "a");
    const auto b = AddChild(tree, a, "b");
    const int before = tree.Fd(b);
    tree.Distrust();
    EXPECT_EQ(tree.Fd(b), before);
    EXPECT_EQ(InodeOf(tree.Fd(b)), InodeAt("a/b"));
    EXPECT_EQ(tree.Path(b), "a/b/");
    EXPECT_EQ(tree.Path(DirectoryTree::kBin), "");
}

TEST_F(DirectoryTreeTest, KeepsFewDescriptorsForManyDirectories) {
    constexpr std::size_t kDirectories = 800;
    DirectoryTree tree = Tree();
    std::vector<DirectoryTree::Index> added;
    for (std::size_t at = 0; at < kDirectories; ++at) {
        const std::string name = "folder" + std::to_string(at);
        Directory(name);
        added.push_back(AddChild(tree, DirectoryTree::kBin, name.c_str()));
    }
    const auto open = [] {
        return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
    };
    EXPECT_LT(open(), 600);
    for (std::size_t at = 0; at < kDirectories; ++at) {
        EXPECT_EQ(InodeOf(tree.Fd(added[at])), InodeAt("folder" + std::to_string(at)));
    }
    EXPECT_LT(open(), 600);
}

TEST_F(DirectoryTreeTest, KeepsFewerDescriptorsWhenFewMayBeOpen) {
    rlimit before{};
    ASSERT_EQ(::getrlimit(RLIMIT_NOFILE, &before), 0);
    rlimit few = before;
    few.rlim_cur = 160;
    ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &few), 0);
    DirectoryTree tree = Tree();
    for (int at = 0; at < 300; ++at) {
        const std::string name = "folder" + std::to_string(at);
        Directory(name);
        const auto added = AddChild(tree, DirectoryTree::kBin, name.c_str());
        EXPECT_EQ(InodeOf(tree.Fd(added)), InodeAt(name));
    }
    ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &before), 0);
}

TEST_F(DirectoryTreeTest, DoesNotOpenAnotherDirectoryOfTheSameName) {
    Directory("a");
    DirectoryTree tree = Tree();
    const auto a = AddChild(tree, DirectoryTree::kBin, "a");
    tree.Distrust();
    std::filesystem::rename(InBin("a"), SharePath() + "/restored");
    EXPECT_EQ(tree.Fd(a), -1);
    EXPECT_EQ(errno, ESTALE);
    Directory("a");
    EXPECT_EQ(tree.Fd(a), -1);
    EXPECT_EQ(errno, ESTALE);
    std::filesystem::remove(InBin("a"));
    ASSERT_EQ(::symlink("../restored", InBin("a").c_str()), 0);
    EXPECT_EQ(tree.Fd(a), -1);
    EXPECT_EQ(errno, ESTALE);
}

TEST_F(DirectoryTreeTest, NoticesThatADirectoryWasMovedAway) {
    Directory("a/b");
    DirectoryTree tree = Tree();
    const auto a = AddChild(tree, DirectoryTree::kBin, "a");
    const auto b = AddChild(tree, a, "b");
    EXPECT_TRUE(tree.IsInPlace(b));
    std::filesystem::rename(InBin("a"), SharePath() + "/restored");
    EXPECT_FALSE(tree.IsInPlace(b));
    EXPECT_FALSE(tree.IsInPlace(a));
    EXPECT_TRUE(tree.IsInPlace(DirectoryTree::kBin));
    std::filesystem::rename(BinPath(), SharePath() + "/oldBin");
    EXPECT_FALSE(tree.IsInPlace(DirectoryTree::kBin));
}

TEST_F(DirectoryTreeTest, NoticesThatADirectoryAboveWasMovedAway) {
    Directory("a/b/c");
    DirectoryTree tree = Tree();
    const auto a = AddChild(tree, DirectoryTree::kBin, "a");
    const auto b = AddChild(tree, a, "b");
    const auto c = AddChild(tree, b, "c");
    std::filesystem::rename(InBin("a"), SharePath() + "/restored");
    EXPECT_GE(tree.Fd(c), 0);
    tree.Distrust();
    // A link to where it went does not make it part of the bin again.
    ASSERT_EQ(::symlink("../restored", InBin("a").c_str()), 0);
    EXPECT_EQ(tree.Fd(c), -1);
    EXPECT_EQ(errno, ESTALE);
    EXPECT_FALSE(tree.IsInPlace(c));
}

TEST_F(DirectoryTreeTest, FindsADirectoryThatCameBackIntoTheBin) {
    Directory("a");
    DirectoryTree tree = Tree();
    const auto a = AddChild(tree, DirectoryTree::kBin, "a");
    std::filesystem::rename(InBin("a"), SharePath() + "/restored");
    tree.Distrust();
    EXPECT_EQ(tree.Fd(a), -1);
    std::filesystem::rename(SharePath() + "/restored", InBin("a"));
    EXPECT_EQ(InodeOf(tree.Fd(a)), InodeAt("a"));
}

TEST_F(DirectoryTreeTest, NoticesThatTheBinWasMovedAway) {
    Directory("a");
    DirectoryTree tree = Tree();
    const auto a = AddChild(tree, DirectoryTree::kBin, "a");
    std::filesystem::rename(BinPath(), SharePath() + "/oldBin");
    Directory("");
    tree.Distrust();
    EXPECT_EQ(tree.Fd(a), -1);
    EXPECT_EQ(errno, ESTALE);
    EXPECT_EQ(tree.Fd(DirectoryTree::kBin), -1);
    EXPECT_EQ(errno, ESTALE);
}

TEST_F(DirectoryTreeTest, TellsThePlaceOfDirectoriesDeeperThanAPathCanBe) {
    constexpr int kLevels = 1100;
    DirectoryTree tree = Tree();
    DirectoryTree::Index deepest = DirectoryTree::kBin;
    for (int level = 0; level < kLevels; ++level) {
        ASSERT_EQ(::mkdirat(tree.Fd(deepest), "d", 0755), 0);
        deepest = AddChild(tree, deepest, "d");
    }
    tree.Distrust();
    EXPECT_GE(tree.Fd(deepest), 0);
    EXPECT_TRUE(tree.IsInPlace(deepest));
    std::filesystem::rename(InBin("d"), SharePath() + "/restored");
    EXPECT_FALSE(tree.IsInPlace(deepest));
    tree.Distrust();
    EXPECT_EQ(tree.Fd(deepest), -1);
    EXPECT_EQ(errno, ESTALE);
    // What removes the test's folder wants a path of each file.
    std::filesystem::rename(SharePath() + "/restored", InBin("d"));
    Clean(CleanRules{});
    EXPECT_TRUE(Contents().empty());
}

TEST_F(DirectoryTreeTest, GivesThePlaceOfADroppedDirectoryToTheNext) {
    Directory("a");
    Directory("b");
    DirectoryTree tree = Tree();
    const auto a = AddChild(tree, DirectoryTree::kBin, "a");
    tree.Drop(a);
    const auto b = AddChild(tree, DirectoryTree::kBin, "b");
    EXPECT_EQ(a, b);
    EXPECT_EQ(tree.Path(b), "b/");
    EXPECT_EQ(InodeOf(tree.Fd(b)), InodeAt("b"));
}

}  // namespace
}  // namespace orva
