#include "appliance/recycle/SizeCleaner.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <linux/capability.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <thread>

#include "tests/appliance/recycle/BinTest.h"

namespace orva {
namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::IsSupersetOf;
using testing::Pair;
using testing::UnorderedElementsAre;

// While it lives, the modes of folders bind this thread even when it is root's.
class BoundByModes {
  public:
    BoundByModes() {
        __user_cap_data_struct fewer[_LINUX_CAPABILITY_U32S_3];
        EXPECT_EQ(::syscall(SYS_capget, &header, before), 0);
        std::copy(std::begin(before), std::end(before), fewer);
        fewer[0].effective &= ~(1U << CAP_DAC_OVERRIDE);
        EXPECT_EQ(::syscall(SYS_capset, &header, fewer), 0);
    }
    ~BoundByModes() { EXPECT_EQ(::syscall(SYS_capset, &header, before), 0); }
    BoundByModes(const BoundByModes&) = delete;
    BoundByModes& operator=(const BoundByModes&) = delete;

  private:
    __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
    __user_cap_data_struct before[_LINUX_CAPABILITY_U32S_3] = {};
};

// Stops a clean in its middle: at the first failure.
class StoppingReport final : public CleanReport {
  public:
    struct Stop {};

    StoppingReport() : CleanReport(stdout, stderr, false) {}

    void BeginBin(const std::string&) override {}
    void EndBin(const CleanTotals&) override {}
    void Goes(const ReportedEntry&) override {}
    void Stays(const ReportedEntry&, KeepReason) override {}
    void Failed(std::string_view, std::string_view, int) override { throw Stop(); }
    void Problem(const std::string&, const std::string&) override {}
    void Note(const std::string&, const std::string&) override {}
    bool Finish() override { return true; }
};

class SizeCleanerTest : public BinTest {
  protected:
    static CleanRules Limit(std::uint64_t bytes, SizeOrder order = SizeOrder::kOldestFirst) {
        CleanRules rules;
        rules.sizeLimit = bytes;
        rules.order = order;
        return rules;
    }

    // The folder "locked" lets nobody remove its files meanwhile.
    CleanTotals CleanWhileLocked(const CleanRules& rules) {
        const Lock lock(InBin("locked"));
        return Clean(rules);
    }

    // Ends in the middle, at the first file of "locked".
    void CleanUntilAFailure(const CleanRules& rules) {
        const Lock lock(InBin("locked"));
        const CleanJudge judge(rules, 0);
        StoppingReport stopping;
        LinkTimes links;
        CleanRun run{judge, stopping, links};
        BinOpening opening = OpenAndLockBin(SharePath(), false, [] {});
        EXPECT_THROW(CleanBin(std::move(*opening.bin), run), StoppingReport::Stop);
    }

  private:
    class Lock {
      public:
        explicit Lock(std::string folderPath) : folder(std::move(folderPath)) {
            EXPECT_EQ(::chmod(folder.c_str(), 0555), 0);
        }
        ~Lock() { EXPECT_EQ(::chmod(folder.c_str(), 0755), 0); }
        Lock(const Lock&) = delete;
        Lock& operator=(const Lock&) = delete;

      private:
        std::string folder;
        BoundByModes bound;
    };
};

TEST_F(SizeCleanerTest, RemovesTheOldestUntilTheRestFits) {
    File("b/first", 10);
    File("a/second", 10);
    File("third", 10);
    const CleanTotals totals = Clean(Limit(15));
    EXPECT_THAT(Contents(), ElementsAre("third"));
    EXPECT_EQ(totals.removedFiles, 2U);
    EXPECT_EQ(totals.removedDirectories, 2U);
    EXPECT_EQ(totals.keptBytes, 10U);
    EXPECT_EQ(totals.overLimit, 0U);
}

TEST_F(SizeCleanerTest, RemovesTheLargestUntilTheRestFits) {
    File("small", 1);
    File("large", 100);
    File("middle", 50);
    Clean(Limit(51, SizeOrder::kLargestFirst));
    EXPECT_THAT(Contents(), UnorderedElementsAre("small", "middle"));
}

TEST_F(SizeCleanerTest, RemovesNoFileWhenTheBinFitsExactly) {
    File("a", 10);
    File("b", 5);
    EXPECT_EQ(Clean(Limit(15)).removedFiles, 0U);
    EXPECT_EQ(Clean(Limit(14)).removedFiles, 1U);
    EXPECT_THAT(Contents(), ElementsAre("b"));
}

TEST_F(SizeCleanerTest, RemovesTheOldestOfEquallyLargeFilesFirst) {
    File("z", 10);
    File("a", 10);
    File("m", 10);
    Preview(Limit(5, SizeOrder::kLargestFirst));
    EXPECT_THAT(report->goes, ElementsAre("z", "a", "m"));
}

TEST_F(SizeCleanerTest, TakesFilesOfOneTimeInTheOrderOfTheirPaths) {
    // Hard links share their size and their time.
    File("start", 10);
    for (const char* folder : {"b", "a", "a/c", "a/b"}) {
        Directory(folder);
    }
    for (const char* name : {"b/1", "a/z", "a/c/0", "a/b/2", "a/b/1", "a/y"}) {
        ASSERT_EQ(::link(InBin("start").c_str(), InBin(name).c_str()), 0);
    }
    Preview(Limit(0));
    std::vector<std::string> files;
    for (const std::string& path : report->goes) {
        if (path.back() != '/') {
            files.push_back(path);
        }
    }
    EXPECT_THAT(files, ElementsAre("start", "a/y", "a/z", "a/b/1", "a/b/2", "a/c/0", "b/1"));
    Clean(Limit(0));
    EXPECT_THAT(Contents(), IsEmpty());
}

TEST_F(SizeCleanerTest, CountsKeptFilesAndNeverRemovesThem) {
    File("keep.doc", 100);
    File("go", 10);
    CleanRules rules = Limit(50);
    rules.keepExtensions = {"doc"};
    const CleanTotals totals = Clean(rules);
    EXPECT_THAT(Contents(), ElementsAre("keep.doc"));
    EXPECT_EQ(totals.overLimit, 50U);
    EXPECT_EQ(totals.failures, 0U);
}

TEST_F(SizeCleanerTest, RemovesEmptyFoldersWhateverTheSize) {
    File("file", 1);
    Directory("empty/inside");
    const CleanTotals totals = Clean(Limit(100));
    EXPECT_THAT(Contents(), ElementsAre("file"));
    EXPECT_EQ(totals.removedDirectories, 2U);
}

TEST_F(SizeCleanerTest, CountsFilesWithMoreBytesThanCanBeCounted) {
    // Each claims almost 2^63 bytes on the file systems that can; fewer on others.
    constexpr off_t kHuge[] = {0x7FFFFFFFFFFFF000, 0xFFFFFFFF000};
    for (const char* name : {"a", "b", "c"}) {
        File(name);
        if (::truncate(InBin(name).c_str(), kHuge[0]) != 0) {
            ASSERT_EQ(::truncate(InBin(name).c_str(), kHuge[1]), 0);
        }
    }
    const CleanTotals totals = Clean(Limit(0));
    EXPECT_EQ(totals.removedFiles, 3U);
    EXPECT_THAT(Contents(), IsEmpty());
}

TEST_F(SizeCleanerTest, PreviewsWhatItThenDoes) {
    File("a/one", 10);
    File("a/two", 20);
    File("b/keep.doc", 5);
    File("three", 30);
    CleanRules rules = Limit(40);
    rules.keepExtensions = {"doc"};
    const CleanTotals foreseen = Preview(rules);
    EXPECT_THAT(report->goes, ElementsAre("a/one", "a/two", "a/"));
    EXPECT_THAT(report->stays,
                ElementsAre(Pair("b/keep.doc", "extension"), Pair("three", "within_size")));
    const CleanTotals totals = Clean(rules);
    EXPECT_THAT(Contents(), UnorderedElementsAre("b/", "b/keep.doc", "three"));
    EXPECT_EQ(foreseen.removedBytes, totals.removedBytes);
    EXPECT_EQ(foreseen.removedDirectories, totals.removedDirectories);
    EXPECT_EQ(foreseen.keptBytes, totals.keptBytes);
}

TEST_F(SizeCleanerTest, StopsInAFolderThatWasMovedOutOfTheBin) {
    constexpr std::ptrdiff_t kFiles = 1000;
    const std::string restored = SharePath() + "/restored";
    const auto count = [](const std::string& folder) {
        std::error_code gone;
        return std::distance(std::filesystem::directory_iterator(folder, gone), {});
    };
    // The clean may be done before the folder is moved; then it is tried again.
    for (bool moved = false; !moved;) {
        Directory("album/day");
        for (std::ptrdiff_t at = 0; at < kFiles; ++at) {
            std::ofstream(InBin("album/day/file") + std::to_string(at)) << "x";
        }
        std::ptrdiff_t leftThen = 0;
        std::atomic<bool> done = false;
        std::thread user([&] {
            while (!done && std::filesystem::exists(InBin("album/day/file0"))) {
            }
            moved = ::rename(InBin("album").c_str(), restored.c_str()) == 0;
            leftThen = moved ? count(restored + "/day") : 0;
        });
        Clean(Limit(0));
        done = true;
        user.join();
        if (moved) {
            EXPECT_GE(count(restored + "/day"), leftThen - 70);
            moved = leftThen > 70;
            std::filesystem::remove_all(restored);
        }
    }
    EXPECT_THAT(report->failed, IsEmpty());
    EXPECT_THAT(Contents(), IsEmpty());
}

TEST_F(SizeCleanerTest, GoesThroughManyFoldersInTheOrderOfSize) {
    // More folders than are kept open, and every next file lies in another one.
    constexpr std::size_t kFolders = 700;
    constexpr std::size_t kPerFolder = 3;
    for (std::size_t size = 0; size < kFolders * kPerFolder; ++size) {
        const std::string folder = "album" + std::to_string(size % kFolders);
        Directory(folder);
        std::ofstream(InBin(folder) + "/file" + std::to_string(size)) << std::string(size + 1, 'x');
    }
    // The two smallest files hold 3 bytes together.
    const CleanTotals totals = Clean(Limit(3, SizeOrder::kLargestFirst));
    EXPECT_EQ(totals.failures, 0U);
    EXPECT_EQ(totals.removedFiles, 2098U);
    EXPECT_EQ(totals.removedDirectories, 698U);
    EXPECT_THAT(Contents(), ElementsAre("album0/", "album0/file0", "album1/", "album1/file1"));
}

TEST_F(SizeCleanerTest, TakesTheNextInOrderForAFileThatCannotBeRemoved) {
    File("locked/1", 10);
    File("open/2", 10);
    File("locked/3", 10);
    File("open/4", 10);
    File("open/5", 10);
    const CleanTotals totals = CleanWhileLocked(Limit(30));
    // Files 1 and 2 were to go; 4 makes up for 1, as 3 cannot be removed either.
    EXPECT_THAT(Contents(),
                UnorderedElementsAre("locked/", "locked/1", "locked/3", "open/", "open/5"));
    EXPECT_THAT(report->failed, ElementsAre(Pair("locked/1", "remove " + std::to_string(EACCES)),
                                            Pair("locked/3", "remove " + std::to_string(EACCES))));
    EXPECT_EQ(totals.removedFiles, 2U);
    EXPECT_EQ(totals.removedBytes, 20U);
    EXPECT_EQ(totals.failures, 2U);
    EXPECT_EQ(totals.keptFiles, 1U);
    EXPECT_EQ(totals.overLimit, 0U);
}

TEST_F(SizeCleanerTest, SaysHowMuchIsLeftOverTheLimitWhenNothingElseCanGo) {
    File("locked/1", 10);
    File("2", 10);
    const CleanTotals totals = CleanWhileLocked(Limit(3));
    EXPECT_THAT(Contents(), UnorderedElementsAre("locked/", "locked/1"));
    EXPECT_EQ(totals.failures, 1U);
    EXPECT_EQ(totals.overLimit, 7U);
}

TEST_F(SizeCleanerTest, FinishesEachFolderBeforeTheNext) {
    // In the order of size the folders take turns.
    std::size_t bytes = 12;
    for (const char* name : {"1", "2", "3"}) {
        for (const char* folder : {"a/", "b/", "c/", "locked/"}) {
            File(std::string(folder) + name, bytes--);
        }
    }
    CleanUntilAFailure(Limit(0, SizeOrder::kLargestFirst));
    const std::set<std::string> left = Contents();
    for (const std::string& folder : std::vector<std::string>{"a/", "b/", "c/", "locked/"}) {
        const auto files =
            left.count(folder + "1") + left.count(folder + "2") + left.count(folder + "3");
        EXPECT_EQ(files, left.count(folder) * 3) << folder;
    }
    EXPECT_EQ(left.count("locked/"), 1U);
}

TEST_F(SizeCleanerTest, HasRemovedNothingButWhatWasToGoWhenItIsStopped) {
    // File N holds N bytes; those up to 10 are to stay.
    for (std::size_t number = 1; number <= 50; ++number) {
        const std::string folder = number == 35 ? "locked" : "album" + std::to_string(number % 4);
        File(folder + "/" + std::to_string(number), number);
    }
    const std::set<std::string> stay = {"album0/",  "album0/4", "album0/8", "album1/",   "album1/1",
                                        "album1/5", "album1/9", "album2/",  "album2/10", "album2/2",
                                        "album2/6", "album3/",  "album3/3", "album3/7"};
    const CleanRules rules = Limit(55, SizeOrder::kLargestFirst);
    CleanUntilAFailure(rules);
    EXPECT_THAT(Contents(), IsSupersetOf(stay));
    EXPECT_THAT(Contents(), Contains("locked/35"));

    Clean(rules);
    EXPECT_EQ(Contents(), stay);
}

}  // namespace
}  // namespace orva
