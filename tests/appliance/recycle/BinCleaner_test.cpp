#include "appliance/recycle/BinCleaner.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <sys/un.h>
#include <unistd.h>

#include <filesystem>

#include "tests/appliance/recycle/BinTest.h"

namespace orva {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;
using testing::UnorderedElementsAre;

class BinCleanerTest : public BinTest {};

TEST_F(BinCleanerTest, EmptiesTheBinAndLeavesTheBinItself) {
    File("a/b/one", 10);
    File("a/two", 5);
    File("three");
    Directory("empty/inside");
    const CleanTotals totals = Clean({});
    EXPECT_THAT(Contents(), IsEmpty());
    EXPECT_TRUE(std::filesystem::is_directory(BinPath()));
    EXPECT_EQ(totals.removedFiles, 3U);
    EXPECT_EQ(totals.removedBytes, 15U);
    EXPECT_EQ(totals.removedDirectories, 4U);
    EXPECT_EQ(totals.keptFiles, 0U);
    EXPECT_EQ(totals.failures, 0U);
}

TEST_F(BinCleanerTest, LeavesFoldersThatStillHoldSomething) {
    File("a/b/keep.PDF", 3);
    File("a/b/go.txt");
    File("c/go.txt");
    CleanRules rules;
    rules.keepExtensions = {"pdf"};
    const CleanTotals totals = Clean(rules);
    EXPECT_THAT(Contents(), UnorderedElementsAre("a/", "a/b/", "a/b/keep.PDF"));
    EXPECT_EQ(totals.keptFiles, 1U);
    EXPECT_EQ(totals.keptBytes, 3U);
    EXPECT_EQ(totals.removedDirectories, 1U);
}

TEST_F(BinCleanerTest, RemovesOnlyWhatIsLongerInTheBinThanTheDays) {
    File("older");
    File("newer");
    CleanRules rules;
    rules.days = 30;
    Clean(rules, ChangedTime("newer") + 30 * kDay);
    EXPECT_THAT(Contents(), ElementsAre("newer"));
    Clean(rules, ChangedTime("newer") + 30 * kDay + 1);
    EXPECT_THAT(Contents(), IsEmpty());
}

TEST_F(BinCleanerTest, GoesByTheTimeInTheBinAndNotByTheTimeOfTheContents) {
    File("photo.jpg");
    const timespec longAgo[2] = {{1, 0}, {1, 0}};
    ASSERT_EQ(::utimensat(AT_FDCWD, InBin("photo.jpg").c_str(), longAgo, 0), 0);
    CleanRules rules;
    rules.days = 1;
    Clean(rules);
    EXPECT_THAT(Contents(), ElementsAre("photo.jpg"));
}

TEST_F(BinCleanerTest, KeepsBySize) {
    File("small", 9);
    File("middle", 10);
    File("large", 101);
    CleanRules rules;
    rules.keepLarger = 100;
    rules.keepSmaller = 10;
    Clean(rules);
    EXPECT_THAT(Contents(), UnorderedElementsAre("small", "large"));
}

TEST_F(BinCleanerTest, RemovesLinksAndNeverWhatTheyPointTo) {
    Write("/volume1/photo/outside/file", "precious");
    ASSERT_EQ(::symlink("../outside", InBin("toFolder").c_str()), 0);
    ASSERT_EQ(::symlink("../outside/file", InBin("toFile").c_str()), 0);
    ASSERT_EQ(::symlink("nowhere", InBin("broken").c_str()), 0);
    ASSERT_EQ(::symlink(".", InBin("loop").c_str()), 0);
    const CleanTotals totals = Clean({});
    EXPECT_THAT(Contents(), IsEmpty());
    EXPECT_EQ(totals.removedFiles, 4U);
    EXPECT_EQ(Read("/volume1/photo/outside/file"), "precious");
}

TEST_F(BinCleanerTest, RemovesFilesOfEveryKind) {
    ASSERT_EQ(::mkfifo(InBin("fifo").c_str(), 0600), 0);
    const int fd = ::socket(AF_UNIX, SOCK_STREAM, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    ASSERT_LT(InBin("socket").size(), sizeof address.sun_path);
    InBin("socket").copy(address.sun_path, sizeof address.sun_path - 1);
    ASSERT_EQ(::bind(fd, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    ::close(fd);
    if (::geteuid() == 0) {
        ASSERT_EQ(::mknod(InBin("device").c_str(), S_IFCHR | 0600, makedev(1, 3)), 0);
    }
    const CleanTotals totals = Clean({});
    EXPECT_THAT(Contents(), IsEmpty());
    EXPECT_EQ(totals.removedBytes, 0U);
    EXPECT_EQ(totals.failures, 0U);
}

TEST_F(BinCleanerTest, RemovesNamesOfAnyBytes) {
    for (const char* name : {"\xff\xfe", "a\nb", " ", "-rf", "...", "\\", "*", "'\""}) {
        File(name);
    }
    File(std::string(255, 'n'));
    Clean({});
    EXPECT_THAT(Contents(), IsEmpty());
}

TEST_F(BinCleanerTest, TakesTheAgeOfAFileBeforeItsOtherLinksWent) {
    File("one");
    for (const char* name : {"two", "three"}) {
        ASSERT_EQ(::link(InBin("one").c_str(), InBin(name).c_str()), 0);
    }
    CleanRules rules;
    rules.days = 0;
    const FileTime now = ChangedTime("one") + 1;
    EXPECT_EQ(Preview(rules, now).removedFiles, 3U);
    EXPECT_EQ(Clean(rules, now).removedFiles, 3U);
    EXPECT_THAT(Contents(), IsEmpty());
}

TEST_F(BinCleanerTest, LeavesTheOtherLinksOfAFileAlone) {
    File("photo.jpg", 7);
    ASSERT_EQ(::link(InBin("photo.jpg").c_str(), (SharePath() + "/photo.jpg").c_str()), 0);
    Clean({});
    EXPECT_THAT(Contents(), IsEmpty());
    EXPECT_EQ(Read("/volume1/photo/photo.jpg"), "xxxxxxx");
}

TEST_F(BinCleanerTest, PreviewsWhatItThenDoes) {
    File("a/go.txt", 2);
    File("a/keep.doc");
    File("b/c/go.txt");
    Directory("empty");
    CleanRules rules;
    rules.keepExtensions = {"doc"};
    const std::set<std::string> before = Contents();
    const CleanTotals foreseen = Preview(rules);
    EXPECT_EQ(Contents(), before);
    EXPECT_THAT(report->goes,
                UnorderedElementsAre("a/go.txt", "b/c/go.txt", "b/c/", "b/", "empty/"));
    EXPECT_THAT(report->stays, ElementsAre(Pair("a/keep.doc", "extension")));
    const CleanTotals totals = Clean(rules);
    EXPECT_THAT(Contents(), UnorderedElementsAre("a/", "a/keep.doc"));
    EXPECT_EQ(foreseen.removedFiles, totals.removedFiles);
    EXPECT_EQ(foreseen.removedBytes, totals.removedBytes);
    EXPECT_EQ(foreseen.removedDirectories, totals.removedDirectories);
    EXPECT_EQ(foreseen.keptFiles, totals.keptFiles);
}

// A chain of folders, each named "d", with a file in each; its paths are too long for one call.
void MakeChain(const std::string& bin, int levels) {
    int fd = ::open(bin.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    for (int level = 0; level < levels && fd >= 0; ++level) {
        ASSERT_EQ(::mkdirat(fd, "d", 0755), 0);
        const int next = ::openat(fd, "d", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
        ::close(fd);
        fd = next;
        ::close(::openat(fd, "f", O_CREAT | O_WRONLY | O_CLOEXEC, 0644));
    }
    ASSERT_GE(fd, 0);
    ::close(fd);
}

TEST_F(BinCleanerTest, EmptiesATreeOfTenThousandLevels) {
    MakeChain(BinPath(), 10'000);
    const CleanTotals totals = Clean({});
    EXPECT_EQ(totals.removedFiles, 10'000U);
    EXPECT_EQ(totals.removedDirectories, 10'000U);
    EXPECT_EQ(totals.failures, 0U);
    EXPECT_THAT(Contents(), IsEmpty());
}

TEST_F(BinCleanerTest, EmptiesADeepTreeBySize) {
    MakeChain(BinPath(), 3'000);
    File("start");
    File("large", 1);
    File("later");
    CleanRules rules;
    rules.sizeLimit = 0;
    const CleanTotals totals = Clean(rules);
    // The newest file is not needed for getting to the limit.
    EXPECT_EQ(totals.removedFiles, 3'002U);
    EXPECT_EQ(totals.removedDirectories, 3'000U);
    EXPECT_THAT(Contents(), ElementsAre("later"));
}

}  // namespace
}  // namespace orva
