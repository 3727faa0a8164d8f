// Tasks of every kind as the scheduler really runs them: in its own view, with the installed tools
// under the names that the tasks' command lines call them by, on the example appliance.
#include <gmock/gmock.h>
#include <signal.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <optional>
#include <string>

#include "tests/system/RunningScheduler.h"

namespace {

namespace fs = std::filesystem;

using orva::RunState;
using orva::TaskStore;
using orva::test::ReadWholeFile;
using orva::test::RunningScheduler;
using orva::test::RunProcess;
using orva::test::ServerProcess;

// The view has a /tmp of its own, so the appliance lies elsewhere.
const bool kElsewhere = ::setenv("TMPDIR", "/var/tmp", 1) == 0;

class ScheduledToolsTest : public testing::Test {
  protected:
    ScheduledToolsTest() {
        const fs::path root = appliance.Root().Path();
        for (const char* tool : {"orvapkg", "orvarecycle"}) {
            fs::copy_file(fs::path(ORVA_BIN_DIR) / tool, root / "usr/orva/bin" / tool);
        }
        fs::copy(ORVA_SOURCE_DIR "/example/root", root, fs::copy_options::recursive);
        StartScheduler();
    }
    ~ScheduledToolsTest() override {
        for (const char* name : kServers) {
            RunProcess({"/bin/sh", Path("usr/orva/example/control"), "stop", name}, {},
                       {{"ORVA_ROOT", Path("")}});
        }
        process->Stop();
    }

    void StartScheduler() {
        process.emplace(
            std::vector<std::string>{appliance.Program("orva-schedd"), "--root", Path("")},
            "scheduling the tasks of ");
        ASSERT_TRUE(process->Ready()) << process->ErrorText();
    }

    std::string Path(const std::string& name) const {
        return (appliance.Root().Path() / name).string();
    }

    // Runs the command once as a task, to its end.
    orva::Run RunTask(const std::string& command) {
        const int task = appliance.AddTask(command);
        TaskStore::Current()->QueueRun(task);
        appliance.WaitUntilIdle();
        const orva::Run run = appliance.OnlyRunOf(task);
        EXPECT_EQ(run.state, RunState::kEnded) << run.why;
        return run;
    }
    static std::string OutputOf(const orva::Run& run) {
        return orva::RunStore::Current()->Output(run.id)->head;
    }

    // Whether a server of the example runs; its process is `pid` then.
    bool Serves(const std::string& name, pid_t& pid) const {
        const std::string text = ReadWholeFile(Path("run/orva/example/" + name + ".pid"));
        pid = static_cast<pid_t>(std::strtol(text.c_str(), nullptr, 10));
        return RunProcess({"/bin/sh", Path("usr/orva/example/control"), "status", name}, {},
                          {{"ORVA_ROOT", Path("")}})
                   .status == 0;
    }

    static constexpr const char* kServers[] = {"Samba", "NFS", "note-server"};
    static constexpr const char* kStart =
        "/tmp/orvaschedtool --start-service 'Samba' 'NFS';\n"
        "/usr/orva/bin/orvapkg start 'note-server';\n";
    static constexpr const char* kStop =
        "/tmp/orvaschedtool --stop-service 'Samba' 'NFS';\n"
        "/usr/orva/bin/orvapkg stop 'note-server';\n";

    RunningScheduler appliance;
    std::optional<ServerProcess> process;
};

TEST_F(ScheduledToolsTest, AServiceTaskStartsAndStopsRealProcesses) {
    const orva::Run start = RunTask(kStart);
    EXPECT_EQ(start.exitStatus, 0);
    EXPECT_EQ(OutputOf(start), "Samba: started\nNFS: started\nnote-server: started\n");
    for (const char* name : kServers) {
        pid_t pid = 0;
        EXPECT_TRUE(Serves(name, pid)) << name;
        // Its own session: it has outlived the run, and no signal to that can reach it.
        EXPECT_EQ(::getsid(pid), pid) << name;
    }
    const orva::Run stop = RunTask(kStop);
    EXPECT_EQ(stop.exitStatus, 0);
    EXPECT_EQ(OutputOf(stop), "Samba: stopped\nNFS: stopped\nnote-server: stopped\n");
    for (const char* name : kServers) {
        pid_t pid = 0;
        EXPECT_FALSE(Serves(name, pid)) << name;
    }
}

TEST_F(ScheduledToolsTest, WhatATaskStartedOutlivesTheScheduler) {
    RunTask(kStart);
    pid_t before = 0;
    EXPECT_TRUE(Serves("note-server", before));
    process->Stop();
    pid_t after = 0;
    EXPECT_TRUE(Serves("note-server", after));
    EXPECT_EQ(after, before);
    StartScheduler();
    const orva::Run stop = RunTask(kStop);
    EXPECT_EQ(stop.exitStatus, 0);
    EXPECT_FALSE(Serves("note-server", after));
}

TEST_F(ScheduledToolsTest, ARecycleBinTaskCleansRealFolders) {
    const orva::Run run =
        RunTask("/usr/orva/bin/orvarecycle --clean 'documents' 'media' -file_ext=\"pdf.docx\"");
    EXPECT_EQ(run.exitStatus, 0);
    EXPECT_EQ(OutputOf(run),
              "documents: removed 2 files (37 bytes) and 0 folders, kept 2 files (1564 bytes)\n"
              "media: removed 1 file (36 bytes) and 0 folders, kept 0 files (0 bytes)\n");
    EXPECT_FALSE(fs::exists(Path("volume1/documents/.recycle/numbers.csv")));
    EXPECT_TRUE(fs::exists(Path("volume1/documents/.recycle/contracts/lease-2019.pdf")));
    EXPECT_TRUE(fs::exists(Path("volume1/media/.recycle")));
}

TEST_F(ScheduledToolsTest, ABeepTaskEndsWithWhatTheMachineHas) {
    const orva::Run run = RunTask("/tmp/orvaschedtool --beep 1");
    if (run.exitStatus == 3) {
        EXPECT_EQ(OutputOf(run), "orvaschedtool: this machine has no buzzer\n");
    } else if (run.exitStatus == 1) {
        EXPECT_THAT(OutputOf(run),
                    testing::StartsWith("orvaschedtool: the buzzer cannot be used: /dev/"));
    } else {
        EXPECT_EQ(run.exitStatus, 0);
        EXPECT_EQ(OutputOf(run), "");
    }
}

}  // namespace
