#include "appliance/util/FileCache.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <filesystem>
#include <thread>

#include "appliance/util/AtomicFile.h"
#include "appliance/util/FileDescriptor.h"
#include "tests/appliance/util/Sandbox.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr auto kDeadline = std::chrono::seconds(30);

class FileCacheTest : public Sandbox {
  protected:
    std::string Path(const std::string& name) const { return RootPath() + "/" + name; }

    std::atomic<int> parsed = 0;
    const std::function<std::string(const std::string&, const std::string&)> upperCase =
        [this](const std::string& content, const std::string& /*path*/) {
            ++parsed;
            std::string text = content;
            for (char& byte : text) {
                byte = static_cast<char>(std::toupper(static_cast<unsigned char>(byte)));
            }
            return text;
        };
    orva::FileCache<std::string> cache{
        {.files = 3, .totalBytes = 250, .fileBytes = 100}, false, upperCase};
};

TEST_F(FileCacheTest, GivesWhatTheParserMadeOfTheFile) {
    Write("/a", "text");
    EXPECT_EQ(*cache.Get(Path("a")), "TEXT");
}

TEST_F(FileCacheTest, ParsesAnUnchangedFileOnceAndSharesTheResult) {
    Write("/a", "text");
    const auto first = cache.Get(Path("a"));
    for (int i = 0; i < 100; ++i) {
        EXPECT_EQ(cache.Get(Path("a")), first);
    }
    EXPECT_EQ(parsed, 1);
}

TEST_F(FileCacheTest, StillSharesTheResultWhenTheFileIsNoLongerFresh) {
    Write("/a", "text");
    const auto first = cache.Get(Path("a"));
    orva::FileIdentity identity;
    ASSERT_EQ(orva::GetFileIdentity(Path("a"), identity), 0);
    const auto end = std::chrono::steady_clock::now() + kDeadline;
    while (!identity.IsSettled() && std::chrono::steady_clock::now() < end) {
        std::this_thread::yield();
    }
    ASSERT_TRUE(identity.IsSettled());
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(cache.Get(Path("a")), first);
    }
    EXPECT_EQ(parsed, 1);
    Write("/a", "TEXT, and more");
    EXPECT_EQ(*cache.Get(Path("a")), "TEXT, AND MORE");
}

TEST_F(FileCacheTest, SharesTheResultOfAFileWhoseTimesSayNothing) {
    Write("/a", "text");
    const timespec future[2] = {{4000000000, 0}, {4000000000, 0}};
    ASSERT_EQ(::utimensat(AT_FDCWD, Path("a").c_str(), future, 0), 0);
    const auto first = cache.Get(Path("a"));
    EXPECT_EQ(cache.Get(Path("a")), first);
    EXPECT_EQ(cache.Get(Path("a")), first);
    EXPECT_EQ(parsed, 1);
}

TEST_F(FileCacheTest, SeesAChangeAtOnceEvenWithinOneStepOfTheClock) {
    for (int i = 0; i < 1000; ++i) {
        const std::string text = std::to_string(1000 + i);
        Write("/a", text);
        ASSERT_EQ(*cache.Get(Path("a")), text);
    }
}

TEST_F(FileCacheTest, SeesAFileThatTookTheOldOnesPlace) {
    Write("/a", "old");
    Write("/b", "new");
    EXPECT_EQ(*cache.Get(Path("a")), "OLD");
    std::filesystem::rename(Path("b"), Path("a"));
    EXPECT_EQ(*cache.Get(Path("a")), "NEW");
}

TEST_F(FileCacheTest, SeesAChangeThatKeepsSizeAndTimeOfModification) {
    Write("/a", "old");
    const timespec times[2] = {{1000, 0}, {1000, 0}};
    ASSERT_EQ(::utimensat(AT_FDCWD, Path("a").c_str(), times, 0), 0);
    EXPECT_EQ(*cache.Get(Path("a")), "OLD");
    Write("/a", "new");
    ASSERT_EQ(::utimensat(AT_FDCWD, Path("a").c_str(), times, 0), 0);
    EXPECT_EQ(*cache.Get(Path("a")), "NEW");
}

TEST_F(FileCacheTest, KeepsAResultThatSomebodyHoldsWhenTheFileChanges) {
    Write("/a", "old");
    const auto held = cache.Get(Path("a"));
    Write("/a", "other");
    EXPECT_EQ(*cache.Get(Path("a")), "OTHER");
    EXPECT_EQ(*held, "OLD");
}

TEST_F(FileCacheTest, GivesNothingForAMissingFileAndSeesItComeAndGo) {
    EXPECT_EQ(cache.Get(Path("a")), nullptr);
    Write("/a", "text");
    EXPECT_EQ(*cache.Get(Path("a")), "TEXT");
    std::filesystem::remove(Path("a"));
    EXPECT_EQ(cache.Get(Path("a")), nullptr);
    EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(FileCacheTest, LogsAMissingFileOnceWhereThatIsAsked) {
    orva::FileCache<std::string> logging({.files = 3, .totalBytes = 250, .fileBytes = 100}, true,
                                         upperCase);
    EXPECT_EQ(logging.Get(Path("a")), nullptr);
    EXPECT_EQ(logging.Get(Path("a")), nullptr);
    EXPECT_THAT(TakeLog(), ElementsAre(Path("a") + ": No such file or directory"));
    Write("/a", "text");
    EXPECT_EQ(*logging.Get(Path("a")), "TEXT");
    std::filesystem::remove(Path("a"));
    EXPECT_EQ(logging.Get(Path("a")), nullptr);
    EXPECT_THAT(TakeLog(), ElementsAre(Path("a") + ": No such file or directory"));
}

TEST_F(FileCacheTest, LogsOnceWhatCannotBeRead) {
    MakeDirectory("/directory");
    ASSERT_EQ(::mkfifo(Path("pipe").c_str(), 0600), 0);
    Write("/big", std::string(101, 'x'));
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(cache.Get(Path("directory")), nullptr);
        EXPECT_EQ(cache.Get(Path("pipe")), nullptr);
        EXPECT_EQ(cache.Get(Path("big")), nullptr);
    }
    EXPECT_THAT(TakeLog(),
                ElementsAre(Path("directory") + ": Invalid argument",
                            Path("pipe") + ": Invalid argument", Path("big") + ": File too large"));
}

TEST_F(FileCacheTest, ReadsAFileOfTheGreatestSize) {
    Write("/full", std::string(100, 'x'));
    EXPECT_EQ(*cache.Get(Path("full")), std::string(100, 'X'));
}

TEST_F(FileCacheTest, ForgetsTheFileAskedForLeastRecently) {
    for (const char* name : {"a", "b", "c", "d"}) {
        Write(std::string("/") + name, name);
    }
    const auto a = cache.Get(Path("a"));
    const auto b = cache.Get(Path("b"));
    cache.Get(Path("c"));
    EXPECT_EQ(cache.Get(Path("a")), a);
    cache.Get(Path("d"));
    EXPECT_EQ(cache.Size(), 3U);
    EXPECT_EQ(cache.Get(Path("a")), a);
    EXPECT_EQ(parsed, 4);
    EXPECT_NE(cache.Get(Path("b")), b);
    EXPECT_EQ(parsed, 5);
}

TEST_F(FileCacheTest, ForgetsTheFileAskedForLeastRecentlyWhenAllAreTooLarge) {
    Write("/a", std::string(90, 'a'));
    Write("/b", std::string(90, 'b'));
    Write("/c", std::string(70, 'c'));
    const auto a = cache.Get(Path("a"));
    cache.Get(Path("b"));
    const auto c = cache.Get(Path("c"));
    EXPECT_EQ(cache.Size(), 3U);
    EXPECT_EQ(cache.Get(Path("a")), a);
    Write("/c", std::string(71, 'c'));
    EXPECT_NE(cache.Get(Path("c")), c);
    EXPECT_EQ(cache.Size(), 2U);
    EXPECT_EQ(cache.Get(Path("a")), a);
    EXPECT_EQ(parsed, 4);
    cache.Get(Path("b"));
    EXPECT_EQ(parsed, 5);
    EXPECT_EQ(cache.Size(), 2U);
}

TEST_F(FileCacheTest, CountsNoBytesForFilesThatAreGoneOrForgotten) {
    for (int i = 0; i < 20; ++i) {
        const std::string name = std::to_string(i);
        Write("/" + name, std::string(100, 'x'));
        cache.Get(Path(name));
        EXPECT_EQ(cache.Size(), i == 0 ? 1U : 2U) << i;
    }
    std::filesystem::remove(Path("18"));
    std::filesystem::remove(Path("19"));
    EXPECT_EQ(cache.Get(Path("18")), nullptr);
    EXPECT_EQ(cache.Get(Path("19")), nullptr);
    Write("/a", std::string(100, 'a'));
    const auto a = cache.Get(Path("a"));
    EXPECT_EQ(cache.Size(), 3U);
    Write("/b", std::string(100, 'b'));
    const auto b = cache.Get(Path("b"));
    EXPECT_EQ(cache.Get(Path("a")), a);
    EXPECT_EQ(cache.Get(Path("b")), b);
}

TEST_F(FileCacheTest, FindsAFileFromAnOpenFolderToo) {
    Write("/folder/a", "one");
    const orva::FileDescriptor folder(
        ::open(Path("folder").c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    ASSERT_TRUE(folder.IsOpen());
    const auto first = cache.Get(Path("folder/a"), folder.Get(), "a");
    EXPECT_EQ(*first, "ONE");
    EXPECT_EQ(*cache.Get(Path("folder/a")), "ONE");
    EXPECT_EQ(cache.Size(), 1U);
    Write("/folder/a", "two");
    EXPECT_EQ(*cache.Get(Path("folder/a"), folder.Get(), "a"), "TWO");
    std::filesystem::remove(Path("folder/a"));
    EXPECT_EQ(cache.Get(Path("folder/a"), folder.Get(), "a"), nullptr);
}

TEST_F(FileCacheTest, ParsesAFileOnceForManyThreads) {
    Write("/a", "text");
    std::vector<std::thread> threads;
    std::atomic<int> right = 0;
    for (int i = 0; i < 8; ++i) {
        threads.emplace_back([&] {
            for (int round = 0; round < 200; ++round) {
                const auto value = cache.Get(Path("a"));
                right += value != nullptr && *value == "TEXT" ? 1 : 0;
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(right, 1600);
    EXPECT_EQ(parsed, 1);
}

TEST_F(FileCacheTest, NeverGivesReadersAnOlderVersionThanTheySaw) {
    constexpr int kVersions = 200;
    ASSERT_EQ(orva::WriteFileAtomically(Path("a"), "1000"), 0);
    std::atomic<bool> stop = false;
    std::atomic<int> wrong = 0;
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&] {
            int last = 1000;
            while (!stop) {
                const auto value = cache.Get(Path("a"));
                const int now = value != nullptr ? std::stoi(*value) : 0;
                wrong += now < last ? 1 : 0;
                last = now;
            }
        });
    }
    for (int i = 1; i <= kVersions; ++i) {
        const std::string text = std::to_string(1000 + i);
        EXPECT_EQ(orva::WriteFileAtomically(Path("a"), text), 0);
        EXPECT_EQ(*cache.Get(Path("a")), text);
    }
    stop = true;
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(wrong, 0);
}

}  // namespace
