#include "appliance/recycle/DirectoryTree.h"

#include <fcntl.h>
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

TEST_F(DirectoryTreeTest, OpensDirectoriesAgainAfterTheyWereClosed) {
    Directory("a/b");
    DirectoryTree tree = Tree();
    const auto a = AddChild(tree, DirectoryTree::kBin, "a");
    const auto b = AddChild(tree, a, "b");
    tree.CloseAll();
    EXPECT_EQ(InodeOf(tree.Fd(b)), InodeAt("a/b"));
    EXPECT_EQ(tree.Path(b), "a/b/");
    EXPECT_EQ(tree.Path(DirectoryTree::kBin), "");
}

TEST_F(DirectoryTreeTest, KeepsFewDescriptorsForManyDirectories) {
    DirectoryTree tree = Tree();
    std::vector<DirectoryTree::Index> added;
    for (int at = 0; at < 500; ++at) {
        const std::string name = "folder" + std::to_string(at);
        Directory(name);
        added.push_back(AddChild(tree, DirectoryTree::kBin, name.c_str()));
    }
    const auto open = [] {
        return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
    };
    EXPECT_LT(open(), 200);
    EXPECT_EQ(InodeOf(tree.Fd(added[3])), InodeAt("folder3"));
    EXPECT_EQ(InodeOf(tree.Fd(added[499])), InodeAt("folder499"));
}

TEST_F(DirectoryTreeTest, DoesNotOpenAnotherDirectoryOfTheSameName) {
    Directory("a");
    DirectoryTree tree = Tree();
    const auto a = AddChild(tree, DirectoryTree::kBin, "a");
    tree.CloseAll();
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
