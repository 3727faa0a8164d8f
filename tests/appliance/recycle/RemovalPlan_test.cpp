#include "appliance/recycle/RemovalPlan.h"

#include <gmock/gmock.h>

#include <string>

namespace orva {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

// Files of a bin that exists in these tests' numbers only.
class RemovalPlanTest : public testing::Test {
  protected:
    DirectoryTree::Index Folder(const char* name,
                                DirectoryTree::Index parent = DirectoryTree::kBin) {
        return tree.Add(parent, name, FileDescriptor(), 0);
    }

    void File(DirectoryTree::Index folder, const char* name, std::uint64_t bytes, FileTime changed,
              std::uint64_t inode) {
        files.push_back(
            {bytes, changed, inode, names.Add(name), folder, FileKind::kFile, /*linked=*/false});
    }

    RemovalPlan Plan(SizeOrder order) { return {files, order, tree, names}; }

    std::vector<std::string> Names(std::span<const Candidate> lot) const {
        std::vector<std::string> all;
        for (const Candidate& file : lot) {
            all.emplace_back(names.At(file.name));
        }
        return all;
    }

    std::vector<std::string> InOrder(SizeOrder order) { return Names(Plan(order).Next(kAllBytes)); }

    static constexpr ByteSum kAllBytes = ~ByteSum{0};

    DirectoryTree tree{FileDescriptor(), ".recycle", FileDescriptor(), {}};
    NameStore names;
    std::vector<Candidate> files;
};

TEST_F(RemovalPlanTest, TakesTheOldestFirst) {
    const auto folder = Folder("album");
    File(folder, "new", 30, 9, 1);
    File(folder, "old", 10, 2, 2);
    File(folder, "before all clocks", 20, -5, 3);
    EXPECT_THAT(InOrder(SizeOrder::kOldestFirst), ElementsAre("before all clocks", "old", "new"));
}

TEST_F(RemovalPlanTest, TakesTheLargestFirstAndTheOldestOfEquallyLargeOnes) {
    const auto folder = Folder("album");
    File(folder, "small", 1, 1, 1);
    File(folder, "young", 30, 9, 2);
    File(folder, "old", 30, 2, 3);
    File(folder, "huge", 0xFFFFFFFFFFFFFFFF, 5, 4);
    EXPECT_THAT(InOrder(SizeOrder::kLargestFirst), ElementsAre("huge", "old", "young", "small"));
}

TEST_F(RemovalPlanTest, TakesFilesOfOneTimeInTheOrderOfTheirPaths) {
    const auto b = Folder("b");
    const auto a = Folder("a");
    const auto inside = Folder("inside", a);
    File(b, "1", 7, 4, 1);
    File(inside, "2", 7, 4, 2);
    File(a, "4", 7, 4, 3);
    File(a, "3", 7, 4, 4);
    EXPECT_THAT(InOrder(SizeOrder::kOldestFirst), ElementsAre("3", "4", "2", "1"));
    EXPECT_THAT(InOrder(SizeOrder::kLargestFirst), ElementsAre("3", "4", "2", "1"));
}

TEST_F(RemovalPlanTest, TakesNoMoreFilesThanTheExcessNeeds) {
    const auto folder = Folder("album");
    File(folder, "a", 10, 1, 1);
    File(folder, "b", 0, 2, 2);
    File(folder, "c", 10, 3, 3);
    File(folder, "d", 10, 4, 4);
    EXPECT_THAT(Names(Plan(SizeOrder::kOldestFirst).Next(10)), ElementsAre("a"));
    RemovalPlan plan = Plan(SizeOrder::kOldestFirst);
    EXPECT_THAT(Names(plan.Next(11)), ElementsAre("a", "b", "c"));
    EXPECT_THAT(Names(plan.Rest()), ElementsAre("d"));
}

TEST_F(RemovalPlanTest, GoesOnInTheOrderForWhatWasNotFreed) {
    const auto folder = Folder("album");
    File(folder, "a", 10, 1, 1);
    File(folder, "b", 10, 2, 2);
    File(folder, "c", 10, 3, 3);
    File(folder, "d", 10, 4, 4);
    RemovalPlan plan = Plan(SizeOrder::kOldestFirst);
    EXPECT_THAT(Names(plan.Next(20)), ElementsAre("a", "b"));
    EXPECT_THAT(Names(plan.Next(5)), ElementsAre("c"));
    EXPECT_THAT(Names(plan.Next(0)), IsEmpty());
    EXPECT_THAT(Names(plan.Rest()), ElementsAre("d"));
    EXPECT_THAT(Names(plan.Next(11)), ElementsAre("d"));
    EXPECT_THAT(Names(plan.Next(1)), IsEmpty());
}

TEST_F(RemovalPlanTest, GivesNothingOfABinThatIsSmallEnough) {
    File(DirectoryTree::kBin, "a", 10, 1, 1);
    RemovalPlan plan = Plan(SizeOrder::kOldestFirst);
    EXPECT_THAT(Names(plan.Next(0)), IsEmpty());
    EXPECT_THAT(Names(plan.Rest()), ElementsAre("a"));
}

TEST_F(RemovalPlanTest, CountsBeyondWhatOneFileCanHold) {
    for (const char* name : {"a", "b", "c"}) {
        File(DirectoryTree::kBin, name, 0xFFFFFFFFFFFFFFFF, 1, 1);
    }
    const ByteSum one = 0xFFFFFFFFFFFFFFFF;
    EXPECT_THAT(Names(Plan(SizeOrder::kLargestFirst).Next(one + one)), ElementsAre("a", "b"));
    EXPECT_THAT(Names(Plan(SizeOrder::kLargestFirst).Next(one + one + 1)),
                ElementsAre("a", "b", "c"));
}

TEST_F(RemovalPlanTest, ArrangesFilesByFolderAndInode) {
    const auto first = Folder("z");
    const auto second = Folder("a");
    File(first, "z/60", 60, 0, 12);
    File(second, "a/50", 50, 0, 23);
    File(first, "z/40", 40, 0, 11);
    File(second, "a/30", 30, 0, 22);
    File(first, "z/20", 20, 0, 13);
    File(second, "a/10", 10, 0, 21);
    RemovalPlan plan = Plan(SizeOrder::kLargestFirst);
    const std::span<Candidate> chosen = plan.Next(151);
    ASSERT_THAT(Names(chosen), ElementsAre("z/60", "a/50", "z/40", "a/30"));
    ArrangeByFolder(chosen);
    EXPECT_THAT(Names(chosen), ElementsAre("z/40", "z/60", "a/30", "a/50"));
    EXPECT_THAT(Names(plan.Next(30)), ElementsAre("z/20", "a/10"));
}

}  // namespace
}  // namespace orva
