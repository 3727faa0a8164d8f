#include "appliance/share/ShareRegistry.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <grp.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <filesystem>
#include <string>
#include <thread>

#include "appliance/util/FileDescriptor.h"

#include "platform/qlibc.h"
#include "tests/appliance/util/Sandbox.h"

namespace {

// An account that owns nothing else here.
constexpr uid_t kServer = 54321;
constexpr gid_t kServersGroup = 54322;

using orva::Share;
using orva::ShareRegistry;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr const char* kFile = "/usr/orva/etc/shares.json";

class ShareRegistryTest : public Sandbox {
  protected:
    ShareRegistryTest() {
        MakeDirectory("/usr/orva/etc");
        MakeDirectory("/volume1/photo");
    }

    std::vector<std::string> Names() const {
        std::vector<std::string> names;
        const auto shares = registry.List();
        EXPECT_TRUE(shares.has_value());
        for (const Share& share : shares.value_or(std::vector<Share>())) {
            names.push_back(share.name);
        }
        return names;
    }

    // Gives the registry's folder and the share to the server's account where the tests may, that
    // is, as root.
    void GiveToServer() const {
        for (const char* place : {"/usr/orva/etc", "/volume1/photo"}) {
            if (::geteuid() == 0) {
                EXPECT_EQ(::chown((RootPath() + place).c_str(), kServer, kServersGroup), 0);
            }
            EXPECT_EQ(::chmod((RootPath() + place).c_str(), 0750), 0);
        }
        EXPECT_EQ(::chmod(RootPath().c_str(), 0711), 0);
    }

    // Switches the bin of "photo" on by the server's account; what it logged, or "on".
    static std::string EnableAsServer() {
        int ends[2] = {};
        EXPECT_EQ(::pipe(ends), 0);
        const pid_t child = ::fork();
        if (child == 0) {
            if (::geteuid() == 0 &&
                (::setgroups(0, nullptr) != 0 ||
                 ::setresgid(kServersGroup, kServersGroup, kServersGroup) != 0 ||
                 ::setresuid(kServer, kServer, kServer) != 0)) {
                ::_exit(1);
            }
            std::string outcome = ShareRegistry().SetRecycle("photo", true) == 0 ? "on" : "failed";
            for (const std::string& line : TakeLog()) {
                outcome += "\n" + line;
            }
            ::_exit(::write(ends[1], outcome.data(), outcome.size()) > 0 ? 0 : 1);
        }
        ::close(ends[1]);
        std::string outcome;
        char block[4096];
        for (ssize_t got = 0; (got = ::read(ends[0], block, sizeof block)) > 0;) {
            outcome.append(block, static_cast<std::size_t>(got));
        }
        ::close(ends[0]);
        int status = -1;
        EXPECT_EQ(::waitpid(child, &status, 0), child);
        EXPECT_EQ(status, 0);
        return outcome;
    }

    orva::FileDescriptor OpenFolder() const {
        return orva::FileDescriptor(
            ::open((RootPath() + "/usr/orva/etc").c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    }

    const ShareRegistry registry{};
};

TEST_F(ShareRegistryTest, IsEmptyWithoutAFile) {
    EXPECT_THAT(Names(), IsEmpty());
    EXPECT_FALSE(registry.Find("photo").has_value());
    EXPECT_EQ(QLIBCErrGet(), 0x0300);
    EXPECT_FALSE(std::filesystem::exists(RootPath() + kFile));
}

TEST_F(ShareRegistryTest, WritesADocumentThatPeopleCanRead) {
    ASSERT_EQ(registry.Add({"Süden", "/volume1/süden", 1, false}), 0);
    EXPECT_EQ(Read(kFile), R"({
  "shares" : 
  [
    {
      "kind" : 1,
      "name" : "Süden",
      "path" : "/volume1/süden",
      "recycle_bin" : false
    }
  ]
}
)");
}

TEST_F(ShareRegistryTest, GivesSharesInByteOrder) {
    for (const char* name : {"b", "a", "B", "ä", "a b"}) {
        ASSERT_EQ(registry.Add({name, "/volume1/x", 1, false}), 0);
    }
    EXPECT_THAT(Names(), ElementsAre("B", "a", "a b", "b", "ä"));
}

TEST_F(ShareRegistryTest, FindsAShareAsItWasAdded) {
    ASSERT_EQ(registry.Add({"photo", "/volume1/photo", 0x201, true}), 0);
    const auto share = registry.Find("photo");
    ASSERT_TRUE(share.has_value());
    EXPECT_EQ(share->name, "photo");
    EXPECT_EQ(share->path, "/volume1/photo");
    EXPECT_EQ(share->kind, 0x201);
    EXPECT_TRUE(share->recycleBin);
}

TEST_F(ShareRegistryTest, RefusesASecondShareOfTheName) {
    ASSERT_EQ(registry.Add({"photo", "/volume1/photo", 1, false}), 0);
    EXPECT_LT(registry.Add({"photo", "/volume1/other", 1, false}), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0400);
    EXPECT_EQ(registry.Find("photo")->path, "/volume1/photo");
}

TEST_F(ShareRegistryTest, RefusesUnsafeSharesAndWritesNothing) {
    const std::vector<Share> refused = {
        {"", "/volume1/x", 1, false},      {"-rf", "/volume1/x", 1, false},
        {"a/b", "/volume1/x", 1, false},   {".", "/volume1/x", 1, false},
        {"..", "/volume1/x", 1, false},    {std::string(1, '\0'), "/volume1/x", 1, false},
        {"\xFF", "/volume1/x", 1, false},  {"x", "", 1, false},
        {"x", "volume1/x", 1, false},      {"x", "/volume1/../etc", 1, false},
        {"x", "/volume1/..", 1, false},    {"x", std::string("/a\0b", 4), 1, false},
        {"x", "/volume1/\xFF", 1, false},  {"x", "/volume1/x", 0, false},
        {"x", "/volume1/x", 0x400, false}, {"x", "/volume1/x", 0x311, false},
        {"x", "/volume1/x", -1, false}};
    for (const Share& share : refused) {
        EXPECT_LT(registry.Add(share), 0) << share.name << " " << share.path << " " << share.kind;
        EXPECT_EQ(QLIBCErrGet(), 0x0D00);
    }
    EXPECT_FALSE(std::filesystem::exists(RootPath() + kFile));
    EXPECT_EQ(registry.Add({"x", "/volume1/..x/y..", 0x30f, false}), 0);
}

TEST_F(ShareRegistryTest, SwitchesARecycleBinOnAndOff) {
    ASSERT_EQ(registry.Add({"photo", "/volume1/photo", 1, false}), 0);
    EXPECT_EQ(registry.SetRecycle("photo", true), 0);
    EXPECT_TRUE(registry.Find("photo")->recycleBin);
    EXPECT_TRUE(std::filesystem::is_directory(RootPath() + "/volume1/photo/.recycle"));
    Write("/volume1/photo/.recycle/deleted.jpg", "picture");
    EXPECT_EQ(registry.SetRecycle("photo", false), 0);
    EXPECT_FALSE(registry.Find("photo")->recycleBin);
    EXPECT_EQ(Read("/volume1/photo/.recycle/deleted.jpg"), "picture");
}

TEST_F(ShareRegistryTest, MakesAMissingFolderOfABinThatIsOn) {
    ASSERT_EQ(registry.Add({"photo", "/volume1/photo", 1, true}), 0);
    EXPECT_EQ(registry.SetRecycle("photo", true), 0);
    EXPECT_TRUE(std::filesystem::is_directory(RootPath() + "/volume1/photo/.recycle"));
}

TEST_F(ShareRegistryTest, LeavesTheSwitchWhenTheFolderCannotBeMade) {
    ASSERT_EQ(registry.Add({"gone", "/volume1/gone", 1, false}), 0);
    EXPECT_LT(registry.SetRecycle("gone", true), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0300);
    EXPECT_FALSE(registry.Find("gone")->recycleBin);
    EXPECT_EQ(registry.SetRecycle("gone", false), 0);
}

TEST_F(ShareRegistryTest, FailsForAnUnknownShare) {
    EXPECT_LT(registry.SetRecycle("none", true), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0300);
}

TEST_F(ShareRegistryTest, KeepsMembersItDoesNotKnow) {
    Write(kFile, R"({"version": 3, "shares": [{"name": "photo", "path": "/volume1/photo",
                     "kind": 1, "recycle_bin": false, "comment": "family"}]})");
    ASSERT_EQ(registry.SetRecycle("photo", true), 0);
    const std::string text = Read(kFile);
    EXPECT_NE(text.find("\"comment\" : \"family\""), std::string::npos) << text;
    EXPECT_NE(text.find("\"version\" : 3"), std::string::npos) << text;
    EXPECT_NE(text.find("\"recycle_bin\" : true"), std::string::npos) << text;
}

TEST_F(ShareRegistryTest, NeverWritesOverADamagedRegistry) {
    const std::string share = R"({"name":"a","path":"/volume1/a","kind":1,"recycle_bin":false})";
    const std::vector<std::string> damaged = {
        "",
        "{",
        "[]",
        "{}",
        R"({"shares": {}})",
        R"({"shares": [7]})",
        R"({"shares": [{}]})",
        R"({"shares": [{"name":"-a","path":"/volume1/a","kind":1,"recycle_bin":false}]})",
        R"({"shares": [{"name":"a","path":"a","kind":1,"recycle_bin":false}]})",
        R"({"shares": [{"name":"a","path":"/volume1/a","kind":1024,"recycle_bin":false}]})",
        R"({"shares": [{"name":"a","path":"/volume1/a","kind":"1","recycle_bin":false}]})",
        R"({"shares": [{"name":"a","path":"/volume1/a","kind":1,"recycle_bin":"no"}]})",
        R"({"shares": [)" + share + "," + share + "]}",
    };
    for (const std::string& content : damaged) {
        Write(kFile, content);
        EXPECT_FALSE(registry.List().has_value()) << content;
        EXPECT_EQ(QLIBCErrGet(), 0x0800);
        EXPECT_FALSE(registry.Find("a").has_value());
        EXPECT_LT(registry.Add({"b", "/volume1/b", 1, false}), 0) << content;
        EXPECT_EQ(QLIBCErrGet(), 0x0800);
        EXPECT_LT(registry.SetRecycle("a", true), 0) << content;
        EXPECT_EQ(QLIBCErrGet(), 0x0800);
        EXPECT_EQ(Read(kFile), content);
        EXPECT_FALSE(TakeLog().empty());
    }
}

TEST_F(ShareRegistryTest, SaysWhatIsDamaged) {
    Write(kFile, R"({"shares": [{"name":"a","path":"/a","kind":1,"recycle_bin":false}, {}]})");
    EXPECT_FALSE(registry.List().has_value());
    EXPECT_THAT(TakeLog(),
                ElementsAre(RootPath() + kFile + ": element 1 of \"shares\" is no share"));
}

TEST_F(ShareRegistryTest, FailsWhereItsDirectoryIsMissing) {
    std::filesystem::remove_all(RootPath() + "/usr");
    EXPECT_LT(registry.Add({"photo", "/volume1/photo", 1, false}), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0500);
    EXPECT_THAT(TakeLog(),
                ElementsAre(RootPath() + kFile + ": cannot be locked: No such file or directory"));
}

TEST_F(ShareRegistryTest, FailsWhereItsFileCannotBeRead) {
    MakeDirectory(kFile);
    EXPECT_FALSE(registry.List().has_value());
    EXPECT_EQ(QLIBCErrGet(), 0x0500);
    EXPECT_LT(registry.Add({"photo", "/volume1/photo", 1, false}), 0);
    const std::string line = RootPath() + kFile + ": cannot be read: Invalid argument";
    EXPECT_THAT(TakeLog(), ElementsAre(line, line));
}

TEST_F(ShareRegistryTest, SaysWhyItCannotBeWritten) {
    MakeDirectory(std::string(kFile) + ".new");
    EXPECT_LT(registry.Add({"photo", "/volume1/photo", 1, false}), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0500);
    EXPECT_THAT(TakeLog(), ElementsAre(RootPath() + kFile + ": cannot be written: File exists"));
}

TEST_F(ShareRegistryTest, IsChangedByTheServersAccountAfterRootWasThereFirst) {
    ASSERT_EQ(registry.Add({"photo", "/volume1/photo", 1, false}), 0);
    GiveToServer();
    ASSERT_EQ(registry.SetRecycle("photo", false), 0);
    EXPECT_EQ(EnableAsServer(), "on");
    EXPECT_TRUE(registry.Find("photo")->recycleBin);
    ASSERT_EQ(registry.SetRecycle("photo", false), 0);
    EXPECT_EQ(EnableAsServer(), "on");
}

TEST_F(ShareRegistryTest, TakesNoNoticeOfALockFileThatAnotherAccountOwns) {
    ASSERT_EQ(registry.Add({"photo", "/volume1/photo", 1, false}), 0);
    const std::string left = std::string(kFile) + ".lock";
    Write(left, "");
    ASSERT_EQ(::chmod((RootPath() + left).c_str(), 0), 0);
    GiveToServer();
    EXPECT_EQ(EnableAsServer(), "on");
    EXPECT_TRUE(std::filesystem::exists(RootPath() + left));
}

TEST_F(ShareRegistryTest, LeavesNoFileBesideTheRegistry) {
    ASSERT_EQ(registry.Add({"photo", "/volume1/photo", 1, false}), 0);
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(RootPath() + "/usr/orva/etc")) {
        names.push_back(entry.path().filename());
    }
    EXPECT_THAT(names, ElementsAre("shares.json"));
}

TEST_F(ShareRegistryTest, WaitsForTheChangeOfAnotherProcess) {
    orva::FileDescriptor other = OpenFolder();
    ASSERT_EQ(::flock(other.Get(), LOCK_EX), 0);
    std::atomic<bool> done = false;
    std::thread writer([&] {
        EXPECT_EQ(registry.Add({"photo", "/volume1/photo", 1, false}), 0);
        done = true;
    });
    EXPECT_THAT(Names(), IsEmpty());  // a reader does not wait
    EXPECT_FALSE(done);
    other = orva::FileDescriptor();
    writer.join();
    EXPECT_THAT(Names(), ElementsAre("photo"));
}

TEST_F(ShareRegistryTest, GivesUpWhenAnotherProcessKeepsTheLock) {
    const orva::FileDescriptor other = OpenFolder();
    ASSERT_EQ(::flock(other.Get(), LOCK_EX), 0);
    EXPECT_LT(ShareRegistry(std::chrono::milliseconds(0)).Add({"a", "/volume1/a", 1, false}), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0500);
    EXPECT_THAT(TakeLog(), ElementsAre(RootPath() + kFile +
                                       ": cannot be locked: another change of it takes too long"));
    EXPECT_FALSE(std::filesystem::exists(RootPath() + kFile));
}

TEST_F(ShareRegistryTest, LosesNoChangeOfManyThreadsAndShowsReadersWholeVersions) {
    constexpr int kThreads = 4;
    constexpr int kSharesEach = 10;
    std::atomic<int> failed = 0;
    std::atomic<bool> stop = false;
    std::thread reader([&] {
        std::size_t last = 0;
        while (!stop) {
            const auto shares = registry.List();
            failed += !shares || shares->size() < last ? 1 : 0;
            last = shares ? shares->size() : last;
        }
    });
    std::vector<std::thread> writers;
    for (int i = 0; i < kThreads; ++i) {
        writers.emplace_back([&, i] {
            for (int k = 0; k < kSharesEach; ++k) {
                const std::string name = "s" + std::to_string(i) + "-" + std::to_string(k);
                failed += registry.Add({name, "/volume1/" + name, 1, false}) != 0 ? 1 : 0;
            }
        });
    }
    for (std::thread& writer : writers) {
        writer.join();
    }
    stop = true;
    reader.join();
    EXPECT_EQ(failed, 0);
    EXPECT_EQ(Names().size(), 40U);
}

}  // namespace
