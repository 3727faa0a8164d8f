#include <gtest/gtest.h>
#include <pwd.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <set>
#include <sstream>

#include "tests/system/SupervisedRun.h"

namespace {

using orva::RunEnding;
using orva::test::OwnName;
using orva::test::SupervisedRun;
using orva::test::WaitUntil;

class RunTest : public testing::Test {
  protected:
    SupervisedRun run;
};

std::set<std::string> Lines(const std::string& text) {
    std::set<std::string> lines;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line);) {
        lines.insert(line);
    }
    return lines;
}

// The letter that /proc gives for the process's state; 0 when there is none.
char StateOf(pid_t process) {
    const std::string status =
        orva::test::ReadWholeFile("/proc/" + std::to_string(process) + "/stat");
    const std::size_t nameEnd = status.rfind(')');
    return nameEnd == std::string::npos ? '\0' : status[nameEnd + 2];
}

std::string OwnHome() { return ::getpwuid(::geteuid())->pw_dir; }

// Where a command of this account starts.
std::string StartsIn() {
    std::error_code error;
    const std::string home = std::filesystem::canonical(OwnHome(), error).string();
    return home.empty() ? "/" : home;
}

TEST_F(RunTest, KeepsWhatTheCommandPrintsAndHowItEnded) {
    const orva::RunTime before = orva::RunTimeNow();
    const RunEnding ending = run.Run("echo out; echo err >&2; exit 3");
    EXPECT_EQ(run.Printed(), "out\nerr\n");
    EXPECT_EQ(ending.exitStatus, 3);
    EXPECT_FALSE(ending.signal);
    EXPECT_EQ(ending.why, "");
    ASSERT_TRUE(ending.started);
    EXPECT_LE(before, *ending.started);
    EXPECT_LE(*ending.started, ending.ended);
    EXPECT_LE(ending.ended, orva::RunTimeNow());
}

TEST_F(RunTest, ACommandThatASignalEndsIsRecordedAsThat) {
    const RunEnding ending = run.Run("echo before; kill -9 $$");
    EXPECT_EQ(ending.signal, 9);
    EXPECT_FALSE(ending.exitStatus);
    EXPECT_TRUE(ending.started);
    EXPECT_EQ(ending.why, "");
    EXPECT_EQ(run.Printed(), "before\n");
}

TEST_F(RunTest, WhatACommandItselfCannotFindIsItsOwnExitStatus) {
    const RunEnding ending = run.Run("/none/such/tool");
    EXPECT_EQ(ending.exitStatus, 127);
    EXPECT_NE(run.Printed().find("/none/such/tool"), std::string::npos);
}

TEST_F(RunTest, FindsTheSameEnvironmentWhateverTheSchedulerHas) {
    ::setenv("ORVA_TEST_SECRET", "secret", 1);
    ::setenv("TZ", "Europe/Berlin", 1);
    run.Run("env", OwnName(), {{"ORVA_ROOT", "/srv/appliance"}, {"LANG", "de_DE.UTF-8"}});
    ::unsetenv("ORVA_TEST_SECRET");
    ::unsetenv("TZ");
    std::set<std::string> lines = Lines(run.Printed());
    // The shell's own.
    lines.erase("PWD=" + StartsIn());
    const std::string name = OwnName();
    EXPECT_EQ(lines, (std::set<std::string>{
                         "HOME=" + OwnHome(), "LANG=de_DE.UTF-8", "LOGNAME=" + name,
                         "ORVA_ROOT=/srv/appliance",
                         "PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin",
                         "SHELL=/bin/sh", "TZ=Europe/Berlin", "USER=" + name}));
}

TEST_F(RunTest, StandsInTheOwnersHomeWithAnEmptyInputAndNothingElseOpen) {
    run.Run("pwd -P; wc -c; umask; ls /proc/self/fd");
    EXPECT_EQ(run.Printed(), StartsIn() +
                                 // The listing's own descriptor is 3.
                                 "\n0\n0022\n0\n1\n2\n3\n");
}

TEST_F(RunTest, IsASessionAndAProcessGroupOfItsOwn) {
    run.Run("cut -d' ' -f1,5,6 /proc/$$/stat");
    std::istringstream fields(run.Printed());
    pid_t process = 0;
    pid_t group = 0;
    pid_t session = 0;
    fields >> process >> group >> session;
    EXPECT_GT(process, 0);
    EXPECT_EQ(group, process);
    EXPECT_EQ(session, process);
}

TEST_F(RunTest, BlocksAndIgnoresNoSignalInTheCommand) {
    run.Run("sed -nE 's/^Sig(Blk|Ign):.//p' /proc/self/status");
    // The C library ignores its own two for every process that it spawns.
    constexpr unsigned long long kLibrarysOwn = 0x180000000;
    unsigned long long blocked = 1;
    unsigned long long ignored = 1;
    std::istringstream(run.Printed()) >> std::hex >> blocked >> ignored;
    EXPECT_EQ(blocked, 0U);
    EXPECT_EQ(ignored & ~kLibrarysOwn, 0U);
}

TEST_F(RunTest, CanBeReadAndStoppedWhileItRuns) {
    run.Start("echo started; sleep 1000");
    ASSERT_TRUE(WaitUntil([this] { return run.Printed() == "started\n"; }));
    EXPECT_TRUE(run.Folder().IsSupervised());
    EXPECT_FALSE(run.Folder().Ending());
    EXPECT_TRUE(run.Folder().WatchSupervisor().IsOpen());
    const std::optional<orva::RunProcess> process = run.Folder().Process();
    ASSERT_TRUE(process);
    EXPECT_EQ(process->supervisor, run.Supervisor());
    EXPECT_EQ(process->bootId, orva::BootId());
    EXPECT_GT(process->command, 0);

    EXPECT_TRUE(run.Folder().SignalCommand(SIGTERM));
    const RunEnding ending = run.End();
    EXPECT_EQ(ending.signal, 15);
    EXPECT_EQ(run.Printed(), "started\n");
    EXPECT_FALSE(run.Folder().SignalCommand(SIGTERM));
}

TEST_F(RunTest, OutlivesTheSignalsThatAskItToEnd) {
    run.Start(
        "echo started; read -r nothing; while ! test -e \"$ORVA_ROOT/go\"; do :; done; exit 5",
        OwnName(), {{"ORVA_ROOT", run.Root().Path().string()}});
    ASSERT_TRUE(WaitUntil([this] { return run.Printed() == "started\n"; }));
    for (const int signal : {SIGTERM, SIGHUP, SIGINT, SIGQUIT, SIGPIPE}) {
        ASSERT_EQ(::kill(run.Supervisor(), signal), 0);
    }
    run.Root().Write("go", "");
    EXPECT_EQ(run.End().exitStatus, 5);
}

TEST_F(RunTest, OutputSurvivesASupervisorThatIsKilled) {
    run.Start("echo precious; sleep 1000");
    ASSERT_TRUE(WaitUntil([this] { return run.Printed() == "precious\n"; }));
    const pid_t command = run.Folder().Process()->command;
    ::kill(run.Supervisor(), SIGKILL);
    EXPECT_EQ(run.Wait(), 128 + SIGKILL);
    EXPECT_FALSE(run.Folder().IsSupervised());
    EXPECT_FALSE(run.Folder().Ending());
    EXPECT_EQ(run.Printed(), "precious\n");
    ::kill(-command, SIGKILL);
}

TEST_F(RunTest, AGigabyteOfOutputFillsNothing) {
    const RunEnding ending =
        run.Run("echo first; head -c 1073741824 /dev/zero; echo; echo last; exit 0");
    EXPECT_EQ(ending.exitStatus, 0);
    const std::optional<orva::StoredOutput> output = run.Folder().Output();
    ASSERT_TRUE(output);
    EXPECT_EQ(output->bytes, 1073741824U + 12);
    EXPECT_EQ(output->head.size(), 65536U);
    EXPECT_EQ(output->tail.size(), 65536U);
    EXPECT_EQ(output->head.substr(0, 7), std::string("first\n\0", 7));
    EXPECT_EQ(output->tail.substr(65536 - 7), std::string("\0\nlast\n", 7));
    EXPECT_EQ(output->dropped, 1073741824U + 12 - 131072);
    std::uintmax_t space = 0;
    for (const auto& file : std::filesystem::directory_iterator(run.Folder().Path())) {
        space += file.file_size();
    }
    EXPECT_LT(space, 200U * 1024);
}

TEST_F(RunTest, EndsWithItsShellWhateverIsLeftInTheBackground) {
    // A process that goes on printing after its shell has ended, and ends when told so.
    const RunEnding ending = run.Run(
        "echo own; (trap '' HUP; echo >\"$ORVA_ROOT/up\"; "
        "while ! test -e \"$ORVA_ROOT/go\"; do echo noise; done; echo >\"$ORVA_ROOT/done\") & "
        "while ! test -e \"$ORVA_ROOT/up\"; do :; done; exit 4",
        OwnName(), {{"ORVA_ROOT", run.Root().Path().string()}});
    EXPECT_EQ(ending.exitStatus, 4);
    EXPECT_FALSE(std::filesystem::exists(run.Root().Path() / "done"));
    const std::optional<orva::StoredOutput> output = run.Folder().Output();
    ASSERT_TRUE(output);
    EXPECT_EQ(output->head.substr(0, 4), "own\n");
    run.Root().Write("go", "");
    // It has neither been blocked by a full pipe nor ended by a broken one.
    EXPECT_TRUE(WaitUntil([this] { return std::filesystem::exists(run.Root().Path() / "done"); }));
}

TEST_F(RunTest, AStoppedRunEndsWithTheWholeGroupOfItsCommand) {
    run.Start(
        "echo first; sh -c 'trap \"\" TERM; echo ready; "
        "while ! test -e \"$ORVA_ROOT/go\"; do :; done; "
        "echo last; echo >\"$ORVA_ROOT/done\"' & wait",
        OwnName(), {{"ORVA_ROOT", run.Root().Path().string()}});
    ASSERT_TRUE(WaitUntil([this] { return run.Printed() == "first\nready\n"; }));
    // It ends by itself long before that.
    ASSERT_TRUE(run.Folder().RecordStop(orva::MonotonicNow() + 1'000'000'000));
    ASSERT_TRUE(run.Folder().SignalCommand(SIGTERM));
    const pid_t shell = run.Folder().Process()->command;
    ASSERT_TRUE(WaitUntil([shell] { return StateOf(shell) == 'Z'; }));
    EXPECT_FALSE(run.Folder().Ending());
    run.Root().Write("go", "");
    const RunEnding ending = run.End();
    EXPECT_EQ(ending.signal, SIGTERM);
    EXPECT_EQ(ending.why, "stopped");
    EXPECT_EQ(run.Printed(), "first\nready\nlast\n");
}

TEST_F(RunTest, AStopKillsWhatOutlivesTheShellWhenItsTimeHasCome) {
    run.Start("sh -c 'trap \"\" TERM; echo $$; exec sleep 1000' & wait");
    ASSERT_TRUE(WaitUntil([this] { return run.Printed().ends_with('\n'); }));
    const pid_t left = std::atoi(run.Printed().c_str());
    ASSERT_GT(left, 1);
    ASSERT_TRUE(run.Folder().RecordStop(orva::MonotonicNow()));
    ASSERT_TRUE(run.Folder().SignalCommand(SIGTERM));
    EXPECT_EQ(run.End().signal, SIGTERM);
    EXPECT_TRUE(StateOf(left) == 'Z' || StateOf(left) == 0);
}

TEST_F(RunTest, ACommandThatEndsInItsOwnWayWhenItIsStoppedKeepsItsExitStatus) {
    run.Start("trap 'echo tidied; exit 7' TERM; echo ready; while :; do sleep 0.01; done");
    ASSERT_TRUE(WaitUntil([this] { return run.Printed() == "ready\n"; }));
    ASSERT_TRUE(run.Folder().RecordStop(orva::MonotonicNow() + 1'000'000'000));
    ASSERT_TRUE(run.Folder().SignalCommand(SIGTERM));
    const RunEnding ending = run.End();
    EXPECT_EQ(ending.exitStatus, 7);
    EXPECT_FALSE(ending.signal);
    EXPECT_EQ(ending.why, "stopped");
    // The shell has its own to say in between.
    EXPECT_TRUE(run.Printed().ends_with("tidied\n")) << run.Printed();
}

TEST_F(RunTest, KeepsAllThatWasPrintedBeforeTheShellEnded) {
    const RunEnding ending = run.Run("head -c 100000 /dev/zero; sleep 1000 & printf last");
    EXPECT_EQ(ending.exitStatus, 0);
    const std::optional<orva::StoredOutput> output = run.Folder().Output();
    ASSERT_TRUE(output);
    EXPECT_EQ(output->bytes, 100'004U);
    EXPECT_EQ(output->tail.substr(output->tail.size() - 4), "last");
    ::kill(-run.Folder().Process()->command, SIGKILL);
}

TEST_F(RunTest, WhatTheBackgroundPrintsLaterIsNoOutputOfTheRun) {
    run.Run(
        "(while ! test -e \"$ORVA_ROOT/go\"; do :; done; echo late; echo >\"$ORVA_ROOT/done\") & "
        "echo own",
        OwnName(), {{"ORVA_ROOT", run.Root().Path().string()}});
    run.Root().Write("go", "");
    ASSERT_TRUE(WaitUntil([this] { return std::filesystem::exists(run.Root().Path() / "done"); }));
    EXPECT_EQ(run.Printed(), "own\n");
}

TEST_F(RunTest, AnOwnerThatIsGoneEndsTheRunWithThatReason) {
    for (const char* owner : {"no-such-account-here", ""}) {
        const RunEnding ending = run.Run("echo never", owner);
        EXPECT_EQ(ending.why, "the owner is gone");
        EXPECT_FALSE(ending.started);
        EXPECT_FALSE(ending.exitStatus);
        EXPECT_FALSE(ending.signal);
        EXPECT_FALSE(run.Folder().Output());
    }
}

TEST_F(RunTest, AnOrderThatCannotBeReadEndsTheRunWithThatReason) {
    orva::FileDescriptor lock = run.Prepare("echo never");
    std::filesystem::resize_file(run.Folder().Path() + "/order", 10);
    run.Launch(std::move(lock));
    EXPECT_EQ(run.End().why, "its order cannot be read");
}

TEST_F(RunTest, ADiskWithoutSpaceForOutputEndsTheRunWithThatReason) {
    run.LaunchScript(run.Prepare("echo x >\"$ORVA_ROOT/ran\"", "root",
                                 {{"ORVA_ROOT", run.Root().Path().string()}}),
                     "cd \"$1\"\n"
                     "mount -t tmpfs -o size=64k none /mnt\n"
                     "cp -a . /mnt/full\n"
                     "mount --bind /mnt/full \"$1\"\n"
                     "$RUN \"$1\"\n"
                     // The folder below the mount.
                     "cp \"$1\"/ending .\n");
    const RunEnding ending = run.End();
    EXPECT_EQ(ending.why, "no space for output");
    EXPECT_FALSE(ending.started);
    EXPECT_FALSE(std::filesystem::exists(run.Root().Path() / "ran"));
}

TEST_F(RunTest, StartsNothingWhenItCannotSayWhoItIs) {
    run.LaunchScript(run.Prepare("echo x >\"$ORVA_ROOT/ran\"", "root",
                                 {{"ORVA_ROOT", run.Root().Path().string()}}),
                     "exec $RUN \"$1\" 3>/dev/full\n");
    EXPECT_EQ(run.End().why, "no space for output");
    EXPECT_FALSE(std::filesystem::exists(run.Root().Path() / "ran"));
}

TEST_F(RunTest, TheEndingHasItsSpaceOnADiskThatIsFullMeanwhile) {
    run.LaunchScript(run.Prepare("cat /dev/zero >/mnt/filler 2>/dev/null; exit 6", "root"),
                     "cd \"$1\"\n"
                     "mount -t tmpfs -o size=400k none /mnt\n"
                     "cp -a . /mnt/full\n"
                     "fallocate -l 4096 /mnt/full/ending.new\n"
                     "mount --bind /mnt/full \"$1\"\n"
                     "$RUN \"$1\"\n"
                     "rm /mnt/filler\n"
                     "cp \"$1\"/ending .\n");
    EXPECT_EQ(run.End().exitStatus, 6);
}

TEST_F(RunTest, AShellThatCannotStartEndsTheRunWithThatReason) {
    run.LaunchScript(run.Prepare("echo never", "root"),
                     "mount --bind /dev/null \"$(readlink -f /bin/sh)\"\n"
                     "exec $RUN \"$1\"\n");
    const RunEnding ending = run.End();
    EXPECT_EQ(ending.why, "cannot start a shell: Permission denied");
    EXPECT_FALSE(ending.started);
    EXPECT_FALSE(ending.exitStatus);
}

// What only root can do is done by root's tests; an ordinary user's say that it is refused.
bool AsRoot() { return ::geteuid() == 0; }

TEST_F(RunTest, RootRunsACommandAsItsOwnerWithTheOwnersGroups) {
    if (!AsRoot()) {
        EXPECT_EQ(run.Run("id -un", "root").why, "not permitted");
        return;
    }
    const RunEnding ending = run.Run(
        "id -un; id -gn; id -Gn; id -ru; pwd; grep -E '^Cap(Eff|Prm)' /proc/self/status", "nobody");
    EXPECT_EQ(ending.exitStatus, 0) << ending.why;
    EXPECT_EQ(run.Printed(),
              "nobody\nnogroup\nnogroup\n65534\n/\n"
              "CapPrm:\t0000000000000000\nCapEff:\t0000000000000000\n");
}

TEST_F(RunTest, AnOrdinaryUserRunsOnlyWhatIsTheirOwn) {
    if (!AsRoot()) {
        EXPECT_EQ(run.Run("true", "root").why, "not permitted");
        EXPECT_EQ(run.Run("true").exitStatus, 0);
        return;
    }
    // From here on the folders are somebody's who is not root.
    const auto runAsNobody = [this](const std::string& owner) {
        orva::FileDescriptor lock = run.Prepare("id -un", owner);
        for (const auto& file : std::filesystem::directory_iterator(run.Folder().Path())) {
            EXPECT_EQ(::chown(file.path().c_str(), 65534, 65534), 0);
        }
        for (const char* path : {"/usr/orva/var/runs/1", "/usr/orva/var/runs"}) {
            EXPECT_EQ(::chown((run.Root().Path().string() + path).c_str(), 65534, 65534), 0);
        }
        const std::string wrapper = run.Root().Write(
            "wrapper",
            "#!/bin/sh\nexec setpriv --reuid=65534 --regid=65534 --clear-groups " ORVA_BIN_DIR
            "/orva-run \"$1\"\n");
        std::filesystem::permissions(wrapper, std::filesystem::perms(0755));
        std::filesystem::permissions(run.Root().Path() / "usr/orva/var",
                                     std::filesystem::perms(0755));
        run.Launch(std::move(lock), wrapper);
        return run.End();
    };
    EXPECT_EQ(runAsNobody("root").why, "not permitted");
    EXPECT_EQ(runAsNobody("nobody").exitStatus, 0);
    EXPECT_EQ(run.Printed(), "nobody\n");
}

TEST_F(RunTest, SaysWhyItCannotBecomeTheOwner) {
    if (!AsRoot()) {
        EXPECT_EQ(run.Run("true", "root").why, "not permitted");
        return;
    }
    // Root without the right to change users, as in some containers.
    const std::string wrapper =
        run.Root().Write("wrapper", "#!/bin/sh\nexec setpriv --bounding-set=-setuid " ORVA_BIN_DIR
                                    "/orva-run \"$1\"\n");
    std::filesystem::permissions(wrapper, std::filesystem::perms(0755));
    run.Launch(run.Prepare("echo never", "nobody"), wrapper);
    const RunEnding ending = run.End();
    EXPECT_EQ(ending.why,
              "cannot become the owner: setpriv: setresuid failed: Operation not permitted");
    EXPECT_FALSE(ending.started);
    EXPECT_FALSE(ending.exitStatus);
}

TEST_F(RunTest, StartsNothingUnlessTheSchedulerStartsIt) {
    const orva::test::ProcessResult result = orva::test::RunProcess(
        {"/bin/sh", "-c", "exec \"$0\" /tmp 3>&-", ORVA_BIN_DIR "/orva-run"});
    EXPECT_EQ(result.status, 2);
    EXPECT_EQ(result.err, "orva-run: started by the scheduler only, with the folder of a run\n");
}

}  // namespace
