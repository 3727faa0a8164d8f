#include "appliance/share/RecycleBin.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <grp.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <functional>
#include <string>
#include <vector>

#include "platform/qlibc.h"
#include "tests/appliance/util/Sandbox.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

// An account and a group that own nothing else here.
constexpr uid_t kStranger = 54321;
constexpr gid_t kTheirGroup = 54322;
constexpr gid_t kSharesGroup = 54323;

// Called in place of the C library's fsync, if set; its result is that of the call.
std::function<int(int)> onSync;

}  // namespace

extern "C" int fsync(int fd) {
    return onSync ? onSync(fd) : static_cast<int>(::syscall(SYS_fsync, fd));
}

namespace {

struct Outcome {
    int result = 0;
    int code = 0;
    std::string log;
};

// Has an account without privileges make the bin: a stranger where the tests run as root, the
// tests' own account otherwise.
Outcome MakeAsOrdinaryUser(const std::string& share, std::vector<gid_t> groups = {}) {
    int ends[2] = {};
    EXPECT_EQ(::pipe(ends), 0);
    const pid_t child = ::fork();
    if (child == 0) {
        if (::geteuid() == 0 && (::setgroups(groups.size(), groups.data()) != 0 ||
                                 ::setresgid(kTheirGroup, kTheirGroup, kTheirGroup) != 0 ||
                                 ::setresuid(kStranger, kStranger, kStranger) != 0)) {
            ::_exit(1);
        }
        const int numbers[2] = {orva::MakeRecycleBin(share), QLIBCErrGet()};
        std::string log;
        for (const std::string& line : TakeLog()) {
            log += line + "\n";
        }
        const bool written = ::write(ends[1], numbers, sizeof numbers) == sizeof numbers &&
                             ::write(ends[1], log.data(), log.size()) >= 0;
        ::_exit(written ? 0 : 1);
    }
    ::close(ends[1]);
    Outcome outcome;
    int numbers[2] = {};
    EXPECT_EQ(::read(ends[0], numbers, sizeof numbers), ssize_t{sizeof numbers});
    outcome.result = numbers[0];
    outcome.code = numbers[1];
    char block[4096];
    for (ssize_t got = 0; (got = ::read(ends[0], block, sizeof block)) > 0;) {
        outcome.log.append(block, static_cast<std::size_t>(got));
    }
    ::close(ends[0]);
    int status = -1;
    EXPECT_EQ(::waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    return outcome;
}

struct stat StatusOf(const std::string& path) {
    struct stat status {};
    EXPECT_EQ(::lstat(path.c_str(), &status), 0) << path;
    return status;
}

mode_t ModeOf(const std::string& path) { return StatusOf(path).st_mode & 07777; }

class RecycleBinTest : public Sandbox {
  protected:
    RecycleBinTest() {
        MakeDirectory("/share");
        // A stranger is to reach the share.
        EXPECT_EQ(::chmod(RootPath().c_str(), 0711), 0);
    }
    ~RecycleBinTest() override { onSync = nullptr; }

    std::string SharePath() const { return RootPath() + "/share"; }

    // Gives the share away where the tests may, that is, as root.
    void GiveShareTo(uid_t user, gid_t group, mode_t mode) const {
        if (::geteuid() == 0) {
            EXPECT_EQ(::chown(SharePath().c_str(), user, group), 0);
        }
        EXPECT_EQ(::chmod(SharePath().c_str(), mode), 0);
    }

    std::vector<std::string> NamesInShare() const {
        std::vector<std::string> names;
        for (const auto& entry : std::filesystem::directory_iterator(SharePath())) {
            names.push_back(entry.path().filename());
        }
        return names;
    }
};

TEST_F(RecycleBinTest, MakesTheFolderWithTheSharesRightsAndNoneForOthers) {
    ASSERT_EQ(::chmod(SharePath().c_str(), 0777), 0);
    EXPECT_EQ(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_EQ(ModeOf(SharePath() + "/.recycle"), 0770U);
}

TEST_F(RecycleBinTest, GivesTheGroupNoMoreThanTheShareDoes) {
    ASSERT_EQ(::chmod(SharePath().c_str(), 0750), 0);
    EXPECT_EQ(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_EQ(ModeOf(SharePath() + "/.recycle"), 0750U);
}

TEST_F(RecycleBinTest, IsNotNarrowedByTheProgramsUmask) {
    ASSERT_EQ(::chmod(SharePath().c_str(), 0770), 0);
    const mode_t former = ::umask(0077);
    EXPECT_EQ(orva::MakeRecycleBin(SharePath()), 0);
    ::umask(former);
    EXPECT_EQ(ModeOf(SharePath() + "/.recycle"), 0770U);
}

TEST_F(RecycleBinTest, LeavesAnExistingFolderAsItIs) {
    Write("/share/.recycle/deleted", "content");
    ASSERT_EQ(::chmod((SharePath() + "/.recycle").c_str(), 0700), 0);
    EXPECT_EQ(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_EQ(ModeOf(SharePath() + "/.recycle"), 0700U);
    EXPECT_EQ(Read("/share/.recycle/deleted"), "content");
}

TEST_F(RecycleBinTest, RefusesALinkInTheFoldersPlace) {
    MakeDirectory("/elsewhere");
    ASSERT_EQ(::chmod((RootPath() + "/elsewhere").c_str(), 0700), 0);
    std::filesystem::create_symlink(RootPath() + "/elsewhere", SharePath() + "/.recycle");
    EXPECT_LT(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0400);
    EXPECT_EQ(ModeOf(RootPath() + "/elsewhere"), 0700U);
}

TEST_F(RecycleBinTest, RefusesALinkThatLeadsNowhere) {
    std::filesystem::create_symlink(RootPath() + "/nowhere", SharePath() + "/.recycle");
    EXPECT_LT(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0400);
    EXPECT_FALSE(std::filesystem::exists(RootPath() + "/nowhere"));
}

TEST_F(RecycleBinTest, RefusesAFileInTheFoldersPlace) {
    Write("/share/.recycle", "a file");
    EXPECT_LT(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0400);
    EXPECT_EQ(Read("/share/.recycle"), "a file");
}

TEST_F(RecycleBinTest, RefusesAShareThatIsALink) {
    std::filesystem::create_symlink("share", RootPath() + "/link");
    EXPECT_LT(orva::MakeRecycleBin(RootPath() + "/link"), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0400);
    EXPECT_FALSE(std::filesystem::exists(SharePath() + "/.recycle"));
}

TEST_F(RecycleBinTest, FailsWithoutTheShare) {
    EXPECT_LT(orva::MakeRecycleBin(RootPath() + "/none"), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0300);
}

TEST_F(RecycleBinTest, BelongsToTheSharesOwnerAndGroup) {
    GiveShareTo(kStranger, kSharesGroup, 02770);
    EXPECT_EQ(orva::MakeRecycleBin(SharePath()), 0);
    const struct stat share = StatusOf(SharePath());
    const struct stat bin = StatusOf(SharePath() + "/.recycle");
    EXPECT_EQ(bin.st_uid, share.st_uid);
    EXPECT_EQ(bin.st_gid, share.st_gid);
    EXPECT_EQ(ModeOf(SharePath() + "/.recycle"), 02770U);
}

TEST_F(RecycleBinTest, IsMadeByAnOrdinaryUserForAGroupOfTheirs) {
    GiveShareTo(0, kSharesGroup, 0770);
    const Outcome outcome = MakeAsOrdinaryUser(SharePath(), {kSharesGroup});
    EXPECT_EQ(outcome.result, 0) << outcome.log;
    EXPECT_EQ(outcome.log, "");
    EXPECT_EQ(StatusOf(SharePath() + "/.recycle").st_gid, StatusOf(SharePath()).st_gid);
    EXPECT_EQ(ModeOf(SharePath() + "/.recycle"), 0770U);
}

TEST_F(RecycleBinTest, IsMadeByAnOrdinaryUserWhereTheShareHandsItsGroupDown) {
    GiveShareTo(0, kSharesGroup, 02777);
    const Outcome outcome = MakeAsOrdinaryUser(SharePath());
    EXPECT_EQ(outcome.result, 0) << outcome.log;
    EXPECT_EQ(outcome.log, "");
    EXPECT_EQ(StatusOf(SharePath() + "/.recycle").st_gid, StatusOf(SharePath()).st_gid);
}

TEST_F(RecycleBinTest, NeedsNoGroupWhereTheShareLetsNoneIn) {
    GiveShareTo(kStranger, kSharesGroup, 0700);
    const Outcome outcome = MakeAsOrdinaryUser(SharePath());
    EXPECT_EQ(outcome.result, 0) << outcome.log;
    EXPECT_EQ(outcome.log, "");
    EXPECT_EQ(ModeOf(SharePath() + "/.recycle"), 0700U);
}

TEST_F(RecycleBinTest, IsNotMadeWhereTheSharesGroupCouldNotUseIt) {
    GiveShareTo(0, kSharesGroup, 0777);
    // An ordinary user can make no folder of a foreign group, but finds one: the system's own.
    const std::string share = ::geteuid() == 0 ? SharePath() : "/tmp";
    const gid_t group = StatusOf(share).st_gid;
    const Outcome outcome = MakeAsOrdinaryUser(share);
    EXPECT_LT(outcome.result, 0);
    EXPECT_EQ(outcome.code, 0x0400);
    EXPECT_EQ(outcome.log, share +
                               ": no recycle bin: this account may not give a folder to the "
                               "share's group " +
                               std::to_string(group) + "\n");
    EXPECT_FALSE(std::filesystem::exists(share + "/.recycle"));
    EXPECT_THAT(NamesInShare(), IsEmpty());
}

TEST_F(RecycleBinTest, IsSeenOnlyOnceItIsCompleteAndOnDisk) {
    ASSERT_EQ(::chmod(SharePath().c_str(), 0770), 0);
    std::vector<std::string> synced;
    onSync = [&](int fd) {
        struct stat status {};
        EXPECT_EQ(::fstat(fd, &status), 0);
        const bool seen = std::filesystem::exists(SharePath() + "/.recycle");
        const bool isShare = status.st_ino == StatusOf(SharePath()).st_ino;
        EXPECT_EQ(status.st_mode & 07777U, 0770U);
        synced.push_back(std::string(isShare ? "the share" : "the folder") +
                         (seen ? ", seen" : ", not seen yet"));
        return 0;
    };
    EXPECT_EQ(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_THAT(synced, ElementsAre("the folder, not seen yet", "the share, seen"));
    EXPECT_THAT(NamesInShare(), ElementsAre(".recycle"));
}

TEST_F(RecycleBinTest, LeavesNothingWhenItFailsOnTheWay) {
    onSync = [](int) {
        errno = EIO;
        return -1;
    };
    EXPECT_LT(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0500);
    EXPECT_THAT(NamesInShare(), IsEmpty());
}

TEST_F(RecycleBinTest, LeavesTheFolderOfAFasterMakerAsItIs) {
    onSync = [&](int) {
        onSync = nullptr;
        std::filesystem::create_directory(SharePath() + "/.recycle");
        return ::chmod((SharePath() + "/.recycle").c_str(), 0711);
    };
    EXPECT_EQ(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_EQ(ModeOf(SharePath() + "/.recycle"), 0711U);
    EXPECT_THAT(NamesInShare(), ElementsAre(".recycle"));
}

TEST_F(RecycleBinTest, ClearsAwayWhatACrashLeftBehindAndNothingElse) {
    MakeDirectory("/share/.recycle.new-0123456789abcdef");
    Write("/share/.recycle.new-00000000000000ff/file", "a user's");
    MakeDirectory("/share/.recycle.new-0123456789abcdeg");
    MakeDirectory("/share/.recycle.new-0123456789abcde");
    EXPECT_EQ(orva::MakeRecycleBin(SharePath()), 0);
    EXPECT_THAT(NamesInShare(),
                testing::UnorderedElementsAre(".recycle", ".recycle.new-00000000000000ff",
                                              ".recycle.new-0123456789abcdeg",
                                              ".recycle.new-0123456789abcde"));
}

}  // namespace
