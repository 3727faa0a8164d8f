// What an installed appliance gets besides its programs: how systemd starts them, and as whom.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <regex>
#include <set>
#include <sstream>
#include <string>
#include <string_view>

#include "tests/system/Process.h"

namespace {

namespace fs = std::filesystem;
using orva::test::ProcessResult;
using orva::test::ReadWholeFile;
using orva::test::RunProcess;
using orva::test::Sandbox;
using testing::HasSubstr;
using testing::Not;

class PackagingTest : public testing::Test {
  protected:
    PackagingTest() {
        const ProcessResult installed =
            RunProcess({ORVA_CMAKE, "--install", ORVA_BUILD_DIR, "--component", "packaging",
                        "--prefix", root.Path() / "usr/orva"});
        EXPECT_EQ(installed.status, 0) << installed.err;
    }

    std::string Unit(const std::string& name) const {
        return ReadWholeFile(root.Path() / "usr/lib/systemd/system" / name);
    }

    void MakeAccounts() const {
        fs::create_directories(root.Path() / "etc");
        const ProcessResult accounts =
            RunProcess({"/usr/bin/systemd-sysusers", "--root=" + root.Path().string()});
        EXPECT_EQ(accounts.status, 0) << accounts.err;
    }

    // The system calls that a unit's filter allows: its lines count in order, each adding to what
    // is allowed or, with a tilde, taking away from it.
    static std::set<std::string> AllowedCalls(const std::string& unit) {
        std::set<std::string> allowed;
        std::istringstream lines(unit);
        for (std::string line; std::getline(lines, line);) {
            constexpr std::string_view kFilter = "SystemCallFilter=";
            if (!line.starts_with(kFilter)) {
                continue;
            }
            line.erase(0, kFilter.size());
            const bool without = line.starts_with("~");
            std::istringstream words(line.substr(without ? 1 : 0));
            for (std::string word; words >> word;) {
                for (const std::string& call : CallsOf(word)) {
                    if (without) {
                        allowed.erase(call);
                    } else {
                        allowed.insert(call);
                    }
                }
            }
        }
        return allowed;
    }

    Sandbox root;

  private:
    // The calls of a group of systemd's ("@chown"), or the call itself.
    static std::set<std::string> CallsOf(const std::string& word) {
        if (!word.starts_with("@")) {
            return {word};
        }
        const ProcessResult listed =
            RunProcess({"/usr/bin/systemd-analyze", "--no-pager", "syscall-filter", word});
        EXPECT_EQ(listed.status, 0) << listed.err;
        std::set<std::string> calls;
        std::istringstream members(listed.out);
        for (std::string member; members >> member;) {
            if (member == "#") {
                std::getline(members, member);  // what the group is about
            } else if (member != word) {
                calls.merge(CallsOf(member));
            }
        }
        return calls;
    }
};

TEST_F(PackagingTest, LiesWhereSystemdLooks) {
    std::set<std::string> files;
    for (const auto& entry : fs::recursive_directory_iterator(root.Path())) {
        if (entry.is_regular_file()) {
            files.insert(fs::relative(entry.path(), root.Path()).string());
        }
    }
    EXPECT_EQ(files, (std::set<std::string>{"usr/lib/systemd/system/orva-schedd.service",
                                            "usr/lib/systemd/system/orva-tmp.service",
                                            "usr/lib/systemd/system/orva-webapid.service",
                                            "usr/lib/sysusers.d/orva.conf",
                                            "usr/lib/tmpfiles.d/orva.conf"}));
}

TEST_F(PackagingTest, SystemdFindsNothingWrongWithTheUnits) {
    std::vector<std::string> arguments = {"/usr/bin/systemd-analyze", "verify", "--man=no"};
    for (const char* name : {"orva-tmp.service", "orva-schedd.service", "orva-webapid.service"}) {
        // It looks whether the programs are there.
        arguments.push_back(root.Write(
            name, std::regex_replace(Unit(name), std::regex("/usr/orva/bin"), ORVA_BIN_DIR)));
    }
    const ProcessResult verified = RunProcess(arguments);
    EXPECT_EQ(verified.status, 0);
    EXPECT_EQ(verified.err, "");
    EXPECT_EQ(verified.out, "");
}

TEST_F(PackagingTest, SystemdWouldFindAFaultInAUnit) {
    const ProcessResult verified = RunProcess(
        {"/usr/bin/systemd-analyze", "verify", "--man=no",
         root.Write("orva-schedd.service",
                    std::regex_replace(Unit("orva-schedd.service"), std::regex("KillMode=process"),
                                       "KillMode=some"))});
    EXPECT_THAT(verified.err, HasSubstr("Failed to parse kill mode"));
}

TEST_F(PackagingTest, TheSchedulerHasAPrivateTmpWithItsOwnToolAndLeavesTasksRunning) {
    const std::string unit = Unit("orva-schedd.service");
    for (const char* line :
         {"\nPrivateTmp=yes\n",
          "\nBindReadOnlyPaths=/usr/orva/bin/orvaschedtool:/tmp/orvaschedtool\n",
          "\nKillMode=process\n", "\nOOMPolicy=continue\n", "\nType=notify\n",
          // Files of running tasks stay when the scheduler is stopped.
          "\nJoinsNamespaceOf=orva-tmp.service\n", "\nRequires=orva-tmp.service\n"}) {
        EXPECT_THAT(unit, HasSubstr(line));
    }
    EXPECT_THAT(Unit("orva-tmp.service"), HasSubstr("\nPrivateTmp=yes\n"));
    EXPECT_THAT(Unit("orva-tmp.service"), HasSubstr("\nRemainAfterExit=yes\n"));
}

TEST_F(PackagingTest, CleaningOldFilesLeavesTheNameThatTheSchedulersToolIsMountedOn) {
    MakeAccounts();
    std::string boot = ReadWholeFile("/proc/sys/kernel/random/boot_id");
    std::erase_if(boot, [](char each) { return each == '-' || each == '\n'; });
    const std::string privateTmp = "tmp/systemd-private-" + boot + "-orva-tmp.service-Xy12ab/tmp";
    const std::string tool = root.Write(privateTmp + "/orvaschedtool", "");
    const std::string old = root.Write(privateTmp + "/old", "");
    const ProcessResult cleaned =
        RunProcess({"/usr/bin/systemd-tmpfiles", "--root=" + root.Path().string(), "--clean",
                    root.Path() / "usr/lib/tmpfiles.d/orva.conf",
                    // What systemd says of private folders, and no file of whatever age is kept.
                    root.Write("clean.conf",
                               "d /tmp - - - 0\n"
                               "x /tmp/systemd-private-%b-*\n"
                               "X /tmp/systemd-private-%b-*/tmp\n")});
    EXPECT_EQ(cleaned.status, 0) << cleaned.err;
    EXPECT_TRUE(fs::exists(tool));
    EXPECT_FALSE(fs::exists(old));
}

TEST_F(PackagingTest, TheServerCanMakeRecycleBinsInSharedFoldersBelowHome) {
    const std::string unit = Unit("orva-webapid.service");
    EXPECT_THAT(unit, HasSubstr("\nProtectSystem=full\n"));
    EXPECT_THAT(unit, Not(HasSubstr("\nProtectHome=")));
}

TEST_F(PackagingTest, TheServerRunsAsAnAccountOfItsOwnWithoutAnyRightOfRoots) {
    const std::string unit = Unit("orva-webapid.service");
    for (const char* line :
         {"\nUser=orva\n", "\nCapabilityBoundingSet=\n", "\nNoNewPrivileges=yes\n"}) {
        EXPECT_THAT(unit, HasSubstr(line));
    }
    const ProcessResult rated =
        RunProcess({"/usr/bin/systemd-analyze", "security", "--offline=true", "--no-pager",
                    // In tenths: what is exposed, of 100.
                    "--threshold=30", root.Path() / "usr/lib/systemd/system/orva-webapid.service"});
    EXPECT_EQ(rated.status, 0) << rated.out;
}

TEST_F(PackagingTest, TheServerMayGiveARecycleBinToTheSharesGroupAndStaysWithoutOtherPrivileges) {
    const std::set<std::string> allowed = AllowedCalls(Unit("orva-webapid.service"));
    for (const char* call : {"fchown", "fchmod", "openat", "renameat2", "flock", "accept4"}) {
        EXPECT_TRUE(allowed.contains(call)) << call;
    }
    for (const char* call : {"setuid", "setresuid", "setgroups", "chroot", "mount", "ptrace", "bpf",
                             "init_module", "clock_settime", "sched_setattr"}) {
        EXPECT_FALSE(allowed.contains(call)) << call;
    }
}

TEST_F(PackagingTest, TheAccountAndTheFoldersCanBeMade) {
    MakeAccounts();
    EXPECT_THAT(ReadWholeFile(root.Path() / "etc/passwd"), HasSubstr("orva:x:"));
    EXPECT_THAT(ReadWholeFile(root.Path() / "etc/group"), HasSubstr("orva:x:"));
    const ProcessResult folders =
        RunProcess({"/usr/bin/systemd-tmpfiles", "--root=" + root.Path().string(), "--create",
                    root.Path() / "usr/lib/tmpfiles.d/orva.conf"});
    if (::geteuid() != 0) {
        // Only root may give them away.
        return;
    }
    EXPECT_EQ(folders.status, 0) << folders.err;
    struct stat store {};
    struct stat configuration {};
    ASSERT_EQ(::stat((root.Path() / "usr/orva/var").c_str(), &store), 0);
    ASSERT_EQ(::stat((root.Path() / "usr/orva/etc").c_str(), &configuration), 0);
    EXPECT_EQ(store.st_mode & 07777, 02770U);
    EXPECT_EQ(store.st_uid, 0U);
    // The server's group.
    EXPECT_EQ(store.st_gid, configuration.st_gid);
    EXPECT_NE(configuration.st_uid, 0U);
    EXPECT_EQ(configuration.st_mode & 07777, 0750U);
}

}  // namespace
