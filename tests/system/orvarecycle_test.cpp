// The recycle-bin cleaner as a program, on real trees in a root of its own.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <spawn.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <random>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "appliance/util/StrictJson.h"
#include "tests/system/Process.h"

extern char** environ;

namespace orva::test {
namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;
using testing::IsEmpty;

class OrvaRecycleTest : public testing::Test {
  protected:
    OrvaRecycleTest() {
        sandbox.Write("usr/orva/etc/shares.json", R"({"shares": [
            {"name": "photo", "path": "/volume1/photo", "kind": 1, "recycle_bin": true},
            {"name": "my music", "path": "/volume1/music", "kind": 1, "recycle_bin": true}]})");
        fs::create_directories(Bin());
        fs::create_directories(sandbox.Path() / "volume1/music");
    }

    fs::path Bin() const { return sandbox.Path() / "volume1/photo/.recycle"; }

    std::vector<std::string> Command(const std::vector<std::string>& arguments) const {
        std::vector<std::string> command = {ORVA_BIN_DIR "/orvarecycle"};
        command.insert(command.end(), arguments.begin(), arguments.end());
        return command;
    }

    ProcessResult Run(const std::vector<std::string>& arguments) const {
        return RunProcess(Command(arguments), {}, {{"ORVA_ROOT", sandbox.Path().string()}});
    }

    // Runs a line of shell in which $BIN is the bin and `orvarecycle` the program.
    ProcessResult Shell(const std::vector<std::string>& wrapper, const std::string& line) const {
        std::vector<std::string> command = wrapper;
        command.insert(command.end(), {"/bin/sh", "-c", line});
        return RunProcess(command, {},
                          {{"ORVA_ROOT", sandbox.Path().string()},
                           {"BIN", Bin().string()},
                           {"PATH", ORVA_BIN_DIR ":/usr/bin:/bin:/usr/sbin:/sbin"}});
    }

    void File(const std::string& name, std::size_t bytes = 0) const {
        fs::create_directories((Bin() / name).parent_path());
        std::ofstream(Bin() / name, std::ios::binary) << std::string(bytes, 'x');
    }

    std::set<std::string> Contents() const {
        std::set<std::string> contents;
        for (const fs::directory_entry& entry : fs::recursive_directory_iterator(Bin())) {
            const bool directory = entry.symlink_status().type() == fs::file_type::directory;
            contents.insert(entry.path().string().substr(Bin().string().size() + 1) +
                            (directory ? "/" : ""));
        }
        return contents;
    }

    Sandbox sandbox;
};

TEST_F(OrvaRecycleTest, CleansByTheCommandLineOfATask) {
    File("a/report.DOC", 10);
    File("a/b/old.txt", 3);
    const ProcessResult result =
        Shell({}, "orvarecycle --clean 'photo' 'my music' -file_ext=\"doc.pdf\" -m 104857600 -l 0");
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.out, "photo: removed 1 file (3 bytes) and 1 folder, kept 1 file (10 bytes)\n");
    EXPECT_EQ(result.err, "'my music': there is no recycle bin\n");
    EXPECT_THAT(Contents(), testing::UnorderedElementsAre("a/", "a/report.DOC"));
}

TEST_F(OrvaRecycleTest, TouchesNothingWhenTheDaysAreMissing) {
    File("file");
    for (const char* line : {"orvarecycle --clean 'photo' -t ", "orvarecycle --clean -t",
                             "orvarecycle --clean -t  -file_ext=\"doc\"",
                             "orvarecycle --clean -t x", "orvarecycle --clean -t 1.5"}) {
        const ProcessResult result = Shell({}, line);
        EXPECT_EQ(result.status, 2) << line;
        EXPECT_THAT(result.err, HasSubstr("-t needs a number of days")) << line;
    }
    EXPECT_THAT(Contents(), testing::ElementsAre("file"));
}

TEST_F(OrvaRecycleTest, SwitchesBinsOnAndOff) {
    EXPECT_EQ(Run({"--enable"}).out,
              "'my music': recycle bin enabled\nphoto: recycle bin enabled\n");
    EXPECT_TRUE(fs::is_directory(sandbox.Path() / "volume1/music/.recycle"));
    EXPECT_EQ(Run({"--disable", "my music"}).status, 0);
    EXPECT_TRUE(fs::is_directory(sandbox.Path() / "volume1/music/.recycle"));
    EXPECT_EQ(Run({"--enable", "nope"}).status, 1);
}

TEST_F(OrvaRecycleTest, TellsNamesOfAnyBytesExactly) {
    File("bad\xff\nname");
    const ProcessResult text = Run({"--clean", "--dry-run"});
    EXPECT_THAT(text.out, HasSubstr("remove $'bad\\xff\\x0aname' (0 bytes, "));
    const ProcessResult json = Run({"--clean", "--dry-run", "--json"});
    std::string error;
    const auto document = ParseStrictJson(json.out, error);
    ASSERT_TRUE(document.has_value()) << error;
    const Json::Value& entry = (*document)["bins"][0]["remove"][0];
    EXPECT_EQ(entry["path"].asString(), "bad\xEF\xBF\xBD\nname");
    EXPECT_EQ(entry["path_base64"].asString(), "YmFk/wpuYW1l");
    Run({"--clean"});
    EXPECT_THAT(Contents(), IsEmpty());
}

TEST_F(OrvaRecycleTest, NamesWhatAReadOnlyMountKeepsAndRemovesTheRest) {
    std::vector<std::string> ownMounts = {"/usr/bin/unshare", "--mount"};
    if (::geteuid() != 0) {
        ownMounts.emplace_back("--map-root-user");
    }
    File("fixed/file");
    File("free/file");
    // The same file system, mounted into the bin at another place and read-only.
    fs::create_directories(sandbox.Path() / "store/deep");
    const std::ofstream precious(sandbox.Path() / "store/deep/precious");
    const ProcessResult mounted =
        Shell(ownMounts,
              "mkdir $BIN/mounted && mount --bind $ORVA_ROOT/store $BIN/mounted && "
              "orvarecycle --clean photo");
    EXPECT_EQ(mounted.status, 0) << mounted.err;
    EXPECT_THAT(mounted.out, HasSubstr("photo: keep   'mounted/': mount point\n"));
    EXPECT_TRUE(fs::exists(sandbox.Path() / "store/deep/precious"));
    EXPECT_THAT(Contents(), testing::ElementsAre("mounted/"));

    fs::remove(Bin() / "mounted");
    File("file");
    File("folder/file");
    const ProcessResult readOnly =
        Shell(ownMounts,
              "mount --bind $BIN/.. $BIN/.. && mount -o remount,bind,ro $BIN/.. && "
              "orvarecycle --clean photo");
    EXPECT_EQ(readOnly.status, 1);
    EXPECT_THAT(readOnly.err,
                HasSubstr("orvarecycle: photo: cannot remove 'file': Read-only file system\n"));
    EXPECT_THAT(readOnly.err, HasSubstr("cannot remove 'folder/file': Read-only file system\n"));
    EXPECT_THAT(readOnly.out, HasSubstr("removed 0 files (0 bytes)"));
    EXPECT_THAT(readOnly.out, HasSubstr("failed 2"));
    const ProcessResult bySize =
        Shell(ownMounts,
              "truncate -s 5 $BIN/folder/file; mount --bind $BIN/.. $BIN/.. && "
              "mount -o remount,bind,ro $BIN/.. && orvarecycle --clean photo -s 0 -o 2");
    EXPECT_EQ(bySize.status, 1);
    EXPECT_THAT(bySize.out, HasSubstr("; still 5 bytes over the limit"));
    EXPECT_EQ(Run({"--clean"}).status, 0);
    EXPECT_THAT(Contents(), IsEmpty());
}

TEST_F(OrvaRecycleTest, WorksForAnOrdinaryUserAndNamesWhatIsNotTheirs) {
    File("own/file");
    File("other/file");
    ASSERT_EQ(::chmod((Bin() / "other").c_str(), 0555), 0);
    std::vector<std::string> asUser;
    if (::geteuid() == 0) {
        constexpr uid_t kUser = 65534;
        asUser = {"/usr/bin/setpriv", "--reuid=65534", "--regid=65534", "--clear-groups"};
        ASSERT_EQ(::chmod(sandbox.Path().c_str(), 0755), 0);
        for (const char* name : {"", "own", "own/file"}) {
            ASSERT_EQ(::lchown((Bin() / name).c_str(), kUser, kUser), 0);
        }
    }
    const ProcessResult result = Shell(asUser, "orvarecycle --clean photo");
    ASSERT_EQ(::chmod((Bin() / "other").c_str(), 0755), 0);
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.err, HasSubstr("cannot remove 'other/file': Permission denied"));
    EXPECT_THAT(Contents(), testing::UnorderedElementsAre("other/", "other/file"));
}

TEST_F(OrvaRecycleTest, WaitsForTheOtherCleanOfTheBin) {
    File("file");
    const int lock = ::open(Bin().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    ASSERT_EQ(::flock(lock, LOCK_EX), 0);
    ProcessResult result;
    std::thread waiting(
        [&] { result = Shell({}, "exec orvarecycle --clean 2>$ORVA_ROOT/errors"); });
    const auto deadline = std::chrono::steady_clock::now() + kPatience;
    while (ReadWholeFile(sandbox.Path() / "errors").empty() &&
           std::chrono::steady_clock::now() < deadline) {
        std::this_thread::yield();
    }
    EXPECT_EQ(ReadWholeFile(sandbox.Path() / "errors"),
              "photo: waiting for another clean of this recycle bin\n");
    EXPECT_TRUE(fs::exists(Bin() / "file"));
    ::close(lock);
    waiting.join();
    EXPECT_EQ(result.status, 0);
    EXPECT_THAT(Contents(), IsEmpty());
}

TEST_F(OrvaRecycleTest, TwoCleansAtOnceDoTheWorkOnce) {
    for (int at = 0; at < 2000; ++at) {
        File("folder" + std::to_string(at % 20) + "/file" + std::to_string(at));
    }
    ProcessResult first;
    std::thread other([&] { first = Run({"--clean"}); });
    const ProcessResult second = Run({"--clean", "-s", "0"});
    other.join();
    EXPECT_EQ(first.status, 0) << first.err;
    EXPECT_EQ(second.status, 0) << second.err;
    EXPECT_THAT(Contents(), IsEmpty());
}

TEST_F(OrvaRecycleTest, FinishesAfterItWasKilled) {
    std::mt19937 random(7);
    int killedHalfWay = 0;
    const std::string source = sandbox.Write("source", "x");
    for (int round = 0; round < 30; ++round) {
        constexpr std::size_t kFiles = 3000;
        constexpr std::size_t kFolders = 30;
        std::vector<fs::path> files;
        for (std::size_t at = 0; at < kFiles; ++at) {
            const std::size_t folder = at % kFolders;
            files.push_back(Bin() / ("a" + std::to_string(folder % 3)) /
                            ("b" + std::to_string(folder)) / ("file" + std::to_string(at)));
            if (at < kFolders) {
                fs::create_directories(files.back().parent_path());
            }
            // Links of one file are made much faster than files.
            fs::create_hard_link(source, files.back());
        }
        const bool bySize = round % 2 == 1;
        const std::vector<std::string> arguments =
            bySize ? std::vector<std::string>{"--clean", "-s", "0"}
                   : std::vector<std::string>{"--clean"};
        const std::vector<std::string> command = Command(arguments);
        std::vector<char*> argv;
        for (const std::string& word : command) {
            argv.push_back(const_cast<char*>(word.c_str()));
        }
        argv.push_back(nullptr);
        ::setenv("ORVA_ROOT", sandbox.Path().c_str(), 1);
        posix_spawn_file_actions_t actions;
        ::posix_spawn_file_actions_init(&actions);
        ::posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
        pid_t pid = -1;
        ASSERT_EQ(::posix_spawn(&pid, argv[0], &actions, nullptr, argv.data(), environ), 0);
        ::posix_spawn_file_actions_destroy(&actions);
        // Strike as soon as a certain file is gone.
        const fs::path watched = files[random() % files.size()];
        const auto deadline = std::chrono::steady_clock::now() + kPatience;
        while (::access(watched.c_str(), F_OK) == 0 &&
               std::chrono::steady_clock::now() < deadline) {
        }
        ::kill(pid, SIGKILL);
        int status = 0;
        ASSERT_EQ(::waitpid(pid, &status, 0), pid);
        killedHalfWay += WIFSIGNALED(status) && !Contents().empty() ? 1 : 0;
        EXPECT_EQ(Run(arguments).status, 0);
        EXPECT_THAT(Contents(), IsEmpty()) << "round " << round;
    }
    std::cout << "killed half-way: " << killedHalfWay << " of 30 rounds\n";
    EXPECT_GT(killedHalfWay, 10);
}

// A random tree, and switches that are no usage error.
class RandomClean {
  public:
    RandomClean(std::mt19937& generator, fs::path binPath)
        : random(generator), bin(std::move(binPath)) {}

    void MakeTree() {
        std::vector<std::string> folders = {""};
        for (std::size_t at = 0, count = random() % 12; at < count; ++at) {
            folders.push_back(folders[random() % folders.size()] + Name() + "/");
            std::error_code ignored;
            fs::create_directories(bin / folders.back(), ignored);
            if (!fs::is_directory(bin / folders.back())) {
                folders.pop_back();
            }
        }
        for (std::size_t at = 0, count = random() % 40; at < count; ++at) {
            const fs::path path = bin / (folders[random() % folders.size()] + Name());
            if (fs::exists(fs::symlink_status(path))) {
                continue;
            }
            switch (random() % 8) {
                case 0:
                    fs::create_symlink("/etc/passwd", path);
                    break;
                case 1:
                    if (!last.empty()) {
                        fs::create_hard_link(last, path);
                        break;
                    }
                    [[fallthrough]];
                default:
                    std::ofstream(path) << std::string(random() % 50, 'x');
                    last = path;
                    break;
            }
        }
    }

    std::vector<std::string> Switches() {
        std::vector<std::string> switches;
        switch (random() % 4) {
            case 0:
                switches = {"-t", std::to_string(random() % 2)};
                break;
            case 1:
                switches = {"-s", std::to_string(random() % 600)};
                break;
            case 2:
                switches = {"-s", std::to_string(random() % 600), "-o",
                            std::to_string(1 + random() % 2)};
                break;
            default:
                break;
        }
        if (random() % 2 == 0) {
            switches.emplace_back(random() % 2 == 0 ? "-file_ext=doc" : "-file_ext=DOC.txt");
        }
        if (random() % 3 == 0) {
            switches.insert(switches.end(), {"-m", std::to_string(random() % 50)});
        }
        if (random() % 3 == 0) {
            switches.insert(switches.end(), {"-l", std::to_string(random() % 50)});
        }
        return switches;
    }

  private:
    std::string Name() {
        static const std::vector<std::string> kEnds = {".doc", ".txt", "",    "\xff",
                                                       "\n",   " ",    ".TXT"};
        return std::string(1, static_cast<char>('a' + random() % 20)) +
               std::to_string(random() % 30) + kEnds[random() % kEnds.size()];
    }

    std::mt19937& random;
    fs::path bin;
    fs::path last;
};

std::string FromBase64(const std::string& text) {
    static const std::string kDigits =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string bytes;
    unsigned bits = 0;
    unsigned value = 0;
    for (const char digit : text) {
        if (digit == '=') {
            break;
        }
        value = value << 6 | static_cast<unsigned>(kDigits.find(digit));
        bits += 6;
        if (bits >= 8) {
            bits -= 8;
            bytes += static_cast<char>(value >> bits & 0xFF);
        }
    }
    return bytes;
}

TEST_F(OrvaRecycleTest, ACleanRemovesExactlyWhatItsPreviewTold) {
    constexpr unsigned kSeed = 20261121;
    std::cout << "seed " << kSeed << '\n';
    std::mt19937 random(kSeed);
    std::size_t removed = 0;
    std::size_t kept = 0;
    for (int round = 0; round < 300; ++round) {
        fs::remove_all(Bin());
        fs::create_directories(Bin());
        RandomClean clean(random, Bin());
        clean.MakeTree();
        std::vector<std::string> arguments = clean.Switches();
        arguments.insert(arguments.begin(), "--clean");
        const std::set<std::string> before = Contents();

        std::vector<std::string> preview = arguments;
        preview.insert(preview.end(), {"--dry-run", "--json"});
        const ProcessResult told = Run(preview);
        ASSERT_EQ(told.status, 0) << told.err;
        ASSERT_EQ(Contents(), before);
        std::string error;
        const auto document = ParseStrictJson(told.out, error);
        ASSERT_TRUE(document.has_value()) << error;
        std::set<std::string> expected = before;
        const Json::Value& bin = (*document)["bins"][0];
        for (const Json::Value& entry : bin["remove"]) {
            const std::string path = entry.isMember("path_base64")
                                         ? FromBase64(entry["path_base64"].asString())
                                         : entry["path"].asString();
            ASSERT_EQ(expected.erase(path), 1U) << path;
            ++removed;
        }
        kept += bin["keep"].size();

        ASSERT_EQ(Run(arguments).status, 0);
        ASSERT_EQ(Contents(), expected)
            << "round " << round << ": " << testing::PrintToString(arguments);
    }
    EXPECT_GT(removed, 500U);
    EXPECT_GT(kept, 500U);
}

}  // namespace
}  // namespace orva::test
