#include "appliance/scheduler/PrivateView.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <exception>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <stdexcept>
#include <vector>

#include "appliance/root/Root.h"
#include "tests/appliance/util/Sandbox.h"

namespace {

namespace fs = std::filesystem;

constexpr uid_t kStranger = 65534;

void Require(bool good, const std::string& what) {
    if (!good) {
        throw std::runtime_error(what + ": " + std::strerror(errno));
    }
}

void Enter() {
    std::string error;
    if (!orva::EnterPrivateView(error)) {
        throw std::runtime_error(error);
    }
}

// Runs `work` in a process of its own. What it complains about; empty when all was well.
std::string InChild(const std::function<void()>& work) {
    int channel[2];
    if (::pipe(channel) != 0) {
        return "no pipe";
    }
    const pid_t child = ::fork();
    if (child == 0) {
        std::string outcome;
        try {
            work();
        } catch (const std::exception& problem) {
            outcome = problem.what();
        }
        const bool told = ::write(channel[1], outcome.data(), outcome.size()) ==
                          static_cast<ssize_t>(outcome.size());
        ::_exit(told ? 0 : 1);
    }
    ::close(channel[1]);
    std::string outcome;
    char buffer[512];
    for (ssize_t length = 0; (length = ::read(channel[0], buffer, sizeof buffer)) > 0;) {
        outcome.append(buffer, static_cast<std::size_t>(length));
    }
    ::close(channel[0]);
    int status = 0;
    ::waitpid(child, &status, 0);
    return status == 0 ? outcome : "the child ended with status " + std::to_string(status);
}

std::string ReadFile(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

std::vector<std::string> Names(const std::string& folder) {
    std::vector<std::string> names;
    for (const auto& entry : fs::directory_iterator(folder)) {
        names.push_back(entry.path().filename().string());
    }
    std::sort(names.begin(), names.end());
    return names;
}

// As another user would, who may not write to what is not theirs.
bool RefusesEverybody(const std::string& path) {
    return ::open(path.c_str(), O_WRONLY) < 0 && errno == EROFS && ::unlink(path.c_str()) != 0 &&
           errno == EBUSY && ::rename(path.c_str(), (path + ".old").c_str()) != 0 &&
           errno == EBUSY && ::chmod(path.c_str(), 0777) != 0 && errno == EROFS;
}

// A root with a tool of its own.
class PrivateViewTest : public Sandbox {
  protected:
    PrivateViewTest() {
        Write("/usr/orva/bin/orvaschedtool", kTool);
        fs::permissions(RootPath() + "/usr/orva/bin/orvaschedtool", fs::perms(0755));
        // For the tests in which others look for it.
        fs::permissions(RootPath(), fs::perms(0755));
    }

    static constexpr const char* kTool = "#!/bin/sh\necho the appliance\n";
};

TEST_F(PrivateViewTest, HasTheAppliancesProgramInATmpWithNothingElse) {
    EXPECT_EQ(InChild([] {
                  Enter();
                  Require(ReadFile("/tmp/orvaschedtool") == kTool, "the tool");
                  Require(::access("/tmp/orvaschedtool", X_OK) == 0, "the tool cannot be run");
                  // The other one leads to the root.
                  Require(Names("/tmp").size() <= 2, "entries");
                  struct stat tmp {};
                  Require(::stat("/tmp", &tmp) == 0 && (tmp.st_mode & 07777) == 01777, "mode");
                  Require(tmp.st_uid == ::geteuid(), "owner");
              }),
              "");
}

TEST_F(PrivateViewTest, NobodyChangesOrRemovesTheProgramInIt) {
    EXPECT_EQ(InChild([] {
                  Enter();
                  Require(RefusesEverybody("/tmp/orvaschedtool"), "the tool");
              }),
              "");
}

TEST_F(PrivateViewTest, OtherAccountsFindTheirWayInItToo) {
    EXPECT_EQ(
        InChild([this] {
            Enter();
            // An ordinary user is the only one in it.
            Require(::geteuid() != 0 || ::setresuid(kStranger, kStranger, kStranger) == 0,
                    "setresuid");
            for (const std::string path :
                 {std::string("/tmp/orvaschedtool"), RootPath() + "/usr/orva/bin/orvaschedtool",
                  std::string("/usr/orva/bin/orvaschedtool"), std::string("/bin/sh"),
                  std::string("/usr/bin/env"), std::string("/etc/passwd")}) {
                Require(::access(path.c_str(), R_OK) == 0, path);
            }
            Require(::mkdir("/tmp/orva-test-own", 0755) == 0, "/tmp");
            Require(::unlink("/tmp/orvaschedtool") != 0, "the tool can be removed");
            Require(::rename("/tmp/orvaschedtool", "/tmp/orva-test-own/x") != 0,
                    "the tool can be moved");
        }),
        "");
}

TEST_F(PrivateViewTest, TmpCanBeUsedAndIsNotTheMachines) {
    const std::string mark = "/tmp/" + fs::path(RootPath()).filename().string() + ".mark";
    EXPECT_EQ(InChild([&] {
                  Enter();
                  std::ofstream(mark) << "inside";
                  Require(ReadFile(mark) == "inside", "cannot be written");
              }),
              "");
    EXPECT_FALSE(fs::exists(mark));
}

TEST_F(PrivateViewTest, TheRootIsAtItsPlaceAndWritable) {
    EXPECT_EQ(InChild([this] {
                  Enter();
                  Require(orva::ResolvePath("/made") == RootPath() + "/made", "another root");
                  std::ofstream(RootPath() + "/made") << "from within";
                  Require(ReadFile("/usr/orva/bin/orvaschedtool") == kTool, "/usr/orva");
              }),
              "");
    EXPECT_EQ(Read("/made"), "from within");
}

TEST_F(PrivateViewTest, TheMachinesOtherFoldersAreThere) {
    EXPECT_EQ(InChild([] {
                  const std::vector<std::string> top = Names("/");
                  std::vector<std::string> below = Names("/usr");
                  if (std::find(below.begin(), below.end(), "orva") == below.end()) {
                      below.push_back("orva");
                      std::sort(below.begin(), below.end());
                  }
                  const std::string accounts = ReadFile("/etc/passwd");
                  Enter();
                  Require(Names("/") == top, "/");
                  Require(Names("/usr") == below, "/usr");
                  Require(ReadFile("/etc/passwd") == accounts, "/etc/passwd");
                  Require(::access("/dev/null", W_OK) == 0, "/dev/null");
                  Require(fs::exists("/proc/self/stat"), "/proc");
              }),
              "");
}

TEST_F(PrivateViewTest, NothingIsWrittenWhereItWouldVanish) {
    EXPECT_EQ(InChild([] {
                  Enter();
                  for (const char* path : {"/orva-test-mark", "/usr/orva-test-mark"}) {
                      Require(::mkdir(path, 0755) != 0 && errno == EROFS, path);
                  }
              }),
              "");
}

TEST_F(PrivateViewTest, TheProcessStaysTheSame) {
    EXPECT_EQ(InChild([this] {
                  const pid_t process = ::getpid();
                  const uid_t user = ::geteuid();
                  fs::current_path(RootPath());
                  const int open = ::open("/proc/self/comm", O_RDONLY | O_CLOEXEC);
                  Enter();
                  char byte = 0;
                  Require(::read(open, &byte, 1) == 1, "an open file");
                  Require(::getpid() == process && ::geteuid() == user, "another process");
                  Require(fs::current_path() == RootPath(), "another folder");
                  Require(::waitpid(-1, nullptr, WNOHANG) < 0 && errno == ECHILD,
                          "a child is left");
                  Require(fs::exists("/proc/self/exe"), "its own program");
              }),
              "");
}

std::string Capabilities() {
    const std::string status = ReadFile("/proc/self/status");
    const std::size_t at = status.find("CapPrm:");
    return status.substr(at, status.find("CapBnd:") - at);
}

TEST_F(PrivateViewTest, AnOrdinaryUserHasNoMoreRightsInIt) {
    EXPECT_EQ(InChild([] {
                  Require(::geteuid() != 0 || (::setresgid(kStranger, kStranger, kStranger) == 0 &&
                                               ::setresuid(kStranger, kStranger, kStranger) == 0),
                          "setresuid");
                  const std::string before = Capabilities();
                  Enter();
                  Require(Capabilities() == before, Capabilities());
                  Require(::access("/proc/self/environ", R_OK) == 0, "/proc/self");
              }),
              "");
}

TEST_F(PrivateViewTest, RootKeepsItsRightsInIt) {
    EXPECT_EQ(InChild([] {
                  const std::string before = Capabilities();
                  Enter();
                  Require(Capabilities() == before, Capabilities());
              }),
              "");
}

TEST_F(PrivateViewTest, IsNotMadeTwice) {
    EXPECT_EQ(InChild([] {
                  Enter();
                  struct stat first {};
                  struct stat second {};
                  Require(::stat("/proc/self/ns/mnt", &first) == 0, "namespace");
                  Enter();
                  Require(::stat("/proc/self/ns/mnt", &second) == 0, "namespace");
                  Require(first.st_ino == second.st_ino, "another view");
              }),
              "");
}

TEST_F(PrivateViewTest, ARootMayBeALinkIntoTmpOrLieBelowOne) {
    fs::create_directory_symlink(RootPath(), RootPath() + "-link");
    EXPECT_EQ(InChild([this] {
                  orva::SetRoot(RootPath() + "-link");
                  Enter();
                  Require(ReadFile("/tmp/orvaschedtool") == kTool, "the tool");
                  Require(ReadFile(orva::ResolvePath("/usr/orva/bin/orvaschedtool")) == kTool,
                          "the root");
              }),
              "");
    fs::remove(RootPath() + "-link");
}

TEST_F(PrivateViewTest, RefusesARootThatIsTmpItself) {
    EXPECT_EQ(InChild([] {
                  orva::SetRoot("/tmp");
                  Enter();
              }),
              "cannot make a private view of the file system: the root must not be /tmp itself");
}

// Gives the process mounts of its own, so that it may cover the machine's /tmp.
// With `alone`, root gets a user namespace too, as others do anyway.
void EnterOwnMounts(bool alone = false) {
    const uid_t user = ::getuid();
    const gid_t group = ::getgid();
    if (user != 0 || alone) {
        Require(::unshare(CLONE_NEWUSER) == 0, "unshare");
        std::ofstream("/proc/self/uid_map") << "0 " << user << " 1";
        std::ofstream("/proc/self/setgroups") << "deny";
        std::ofstream("/proc/self/gid_map") << "0 " << group << " 1";
    }
    Require(::unshare(CLONE_NEWNS) == 0, "unshare");
    Require(::mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0, "private");
}

void CoverTmp() { Require(::mount("none", "/tmp", "tmpfs", 0, "mode=1777") == 0, "tmpfs"); }

// A root outside of /tmp, which is covered in these tests.
class PlantedTest : public PrivateViewTest {
  protected:
    PlantedTest() : elsewhere("/var" + RootPath()) {
        fs::copy(RootPath(), elsewhere, fs::copy_options::recursive);
        orva::SetRoot(elsewhere);
    }
    ~PlantedTest() override { fs::remove_all(elsewhere); }

    const std::string elsewhere;
};

void GiveAway(const std::string& path) {
    // In a user namespace there is nobody to give it to.
    Require(::chown(path.c_str(), kStranger, kStranger) == 0 || errno == EINVAL, "chown");
}

TEST_F(PlantedTest, AProgramThatAStrangerHasPutThereBeforeIsNotTheOneInside) {
    EXPECT_EQ(InChild([] {
                  EnterOwnMounts();
                  CoverTmp();
                  std::ofstream("/tmp/orvaschedtool") << "#!/bin/sh\necho evil\n";
                  GiveAway("/tmp/orvaschedtool");
                  Enter();
                  Require(ReadFile("/tmp/orvaschedtool") == kTool, "the tool");
                  Require(RefusesEverybody("/tmp/orvaschedtool"), "the tool");
              }),
              "");
}

TEST_F(PlantedTest, AFolderOrALinkInItsPlaceIsNoObstacle) {
    for (const bool folder : {true, false}) {
        EXPECT_EQ(InChild([folder] {
                      EnterOwnMounts();
                      CoverTmp();
                      if (folder) {
                          fs::create_directories("/tmp/orvaschedtool/more");
                          GiveAway("/tmp/orvaschedtool");
                      } else {
                          fs::create_symlink("/etc/passwd", "/tmp/orvaschedtool");
                      }
                      Enter();
                      Require(ReadFile("/tmp/orvaschedtool") == kTool, "the tool");
                  }),
                  "");
    }
}

TEST_F(PlantedTest, WhatAStrangerPutsThereLaterIsNeverSeen) {
    EXPECT_EQ(InChild([] {
                  EnterOwnMounts();
                  CoverTmp();
                  const int outside = ::open("/tmp", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
                  Enter();
                  const int planted =
                      ::openat(outside, "orvaschedtool", O_CREAT | O_EXCL | O_RDWR, 0755);
                  Require(planted >= 0 && ::write(planted, "evil", 4) == 4, "cannot be planted");
                  Require(ReadFile("/tmp/orvaschedtool") == kTool, "the tool");
                  Require(::unlinkat(outside, "orvaschedtool", 0) == 0, "cannot be removed");
                  Require(ReadFile("/tmp/orvaschedtool") == kTool, "the tool");
              }),
              "");
}

TEST_F(PlantedTest, ATmpOfItsOwnWithAStrangersProgramIsNoPrivateView) {
    EXPECT_EQ(InChild([] {
                  EnterOwnMounts();
                  CoverTmp();
                  std::ofstream("/tmp/orvaschedtool") << kTool;
                  struct stat before {};
                  struct stat after {};
                  Require(::stat("/proc/self/ns/mnt", &before) == 0, "namespace");
                  Enter();
                  Require(::stat("/proc/self/ns/mnt", &after) == 0, "namespace");
                  Require(before.st_ino != after.st_ino, "taken for a private view");
              }),
              "");
}

TEST_F(PlantedTest, AViewThatAServiceUnitHasMadeIsUsed) {
    EXPECT_EQ(InChild([this] {
                  EnterOwnMounts();
                  CoverTmp();
                  std::ofstream("/tmp/orvaschedtool").flush();
                  const std::string tool = elsewhere + "/usr/orva/bin/orvaschedtool";
                  Require(
                      ::mount(tool.c_str(), "/tmp/orvaschedtool", nullptr, MS_BIND, nullptr) == 0 &&
                          ::mount("none", "/tmp/orvaschedtool", nullptr,
                                  MS_BIND | MS_REMOUNT | MS_RDONLY, nullptr) == 0,
                      "mount");
                  struct stat before {};
                  struct stat after {};
                  Require(::stat("/proc/self/ns/mnt", &before) == 0, "namespace");
                  Enter();
                  Require(::stat("/proc/self/ns/mnt", &after) == 0, "namespace");
                  Require(before.st_ino == after.st_ino, "another view");
              }),
              "");
}

TEST_F(PlantedTest, SaysThatBubblewrapIsMissing) {
    EXPECT_EQ(InChild([] {
                  EnterOwnMounts();
                  CoverTmp();
                  fs::create_directory("/tmp/empty");
                  Require(::mount("/tmp/empty", "/usr/bin", nullptr, MS_BIND, nullptr) == 0,
                          "mount");
                  Enter();
              }),
              "cannot make a private view of the file system: /usr/bin/bwrap: No such file or "
              "directory (the package bubblewrap is not installed)");
}

TEST_F(PlantedTest, SaysThatTheKernelForbidsIt) {
    EXPECT_EQ(
        InChild([] {
            EnterOwnMounts(true);
            CoverTmp();
            std::ofstream limit("/proc/sys/user/max_mnt_namespaces");
            limit << "0" << std::flush;
            Require(limit.good(), "limit");
            Enter();
        }),
        "cannot make a private view of the file system: bwrap: Creating new namespace failed: "
        "nesting depth or /proc/sys/user/max_*_namespaces exceeded (ENOSPC)");
}

}  // namespace
