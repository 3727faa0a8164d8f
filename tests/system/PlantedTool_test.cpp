// The scheduler where somebody has put things of their own under the name in /tmp that tasks call.
#include <gmock/gmock.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <optional>
#include <string>

#include "appliance/supervisor/RunFolder.h"
#include "tests/system/RunningScheduler.h"

namespace {

using orva::RunState;
using orva::TaskStore;
using orva::test::RunningScheduler;
using orva::test::ServerProcess;
using orva::test::WaitFor;
using testing::HasSubstr;
using testing::Not;

// The appliances of these tests must not lie in the /tmp that is covered.
const bool kElsewhere = ::setenv("TMPDIR", "/var/tmp", 1) == 0;

class PlantedToolTest : public testing::Test {
  protected:
    ~PlantedToolTest() override {
        if (process) {
            process->Stop();
        }
    }

    std::string Path(const std::string& name) const {
        return (appliance.Root().Path() / name).string();
    }
    void Touch(const std::string& name) const { appliance.Root().Write(name, ""); }

    // Starts the scheduler in a machine with a /tmp of its own, in which the shell's `plant` puts
    // something; it does so once more when it is told to.
    void StartAfter(const std::string& plant) {
        std::vector<std::string> arguments = {"/usr/bin/bwrap", "--die-with-parent"};
        if (::geteuid() == 0) {
            arguments.insert(arguments.end(), {"--cap-add", "ALL"});
        }
        const std::string script =
            "root=" + appliance.Root().Path().string() + "\nplant() {\n" + plant +
            "\nif [ \"$(id -u)\" = 0 ]; then chown -R 65534 /tmp/*; fi\n}\n"
            "plant\n"
            "(while test -d $root && ! test -e $root/again; do sleep 0.02; done\n"
            " rm -rf /tmp/*; plant; echo >$root/planted) 2>/dev/null &\n"
            "exec $root/usr/orva/bin/orva-schedd --root $root";
        arguments.insert(arguments.end(), {"--dev-bind", "/", "/", "--perms", "1777", "--tmpfs",
                                           "/tmp", "--", "/bin/sh", "-c", script});
        process.emplace(arguments, "scheduling the tasks of ");
        ASSERT_TRUE(process->Ready()) << process->ErrorText();
    }

    void PlantAgain() const {
        Touch("again");
        ASSERT_TRUE(WaitFor([this] { return std::filesystem::exists(Path("planted")); }));
    }

    // What the command has printed, with its exit status.
    std::string RunByHand(const std::string& command) {
        const int task = appliance.AddTask(command);
        TaskStore::Current()->QueueRun(task);
        appliance.WaitUntilIdle();
        const orva::Run run = appliance.OnlyRunOf(task);
        EXPECT_EQ(run.state, RunState::kEnded);
        return orva::RunStore::Current()->Output(run.id)->head + "exit " +
               std::to_string(run.exitStatus.value_or(-1)) + run.why;
    }

    RunningScheduler appliance;
    std::optional<ServerProcess> process;
};

constexpr const char* kProgram =
    "printf '#!/bin/sh\\necho evil\\n' >/tmp/orvaschedtool; chmod 755 /tmp/orvaschedtool";
constexpr const char* kPlaceholder = ": >/tmp/orvaschedtool";
constexpr const char* kFolder = "mkdir -p /tmp/orvaschedtool/orvaschedtool";
constexpr const char* kLink = "ln -s /bin/true /tmp/orvaschedtool";

TEST_F(PlantedToolTest, TasksRunTheAppliancesProgramWhateverStoodThereOrComesLater) {
    for (const char* plant : {kProgram, kPlaceholder, kFolder, kLink}) {
        StartAfter(plant);
        // It shows this very task.
        EXPECT_THAT(RunByHand("/tmp/orvaschedtool --list"),
                    testing::AllOf(HasSubstr("task"), HasSubstr("exit 0"), Not(HasSubstr("evil"))))
            << plant;
        PlantAgain();
        EXPECT_THAT(RunByHand("/tmp/orvaschedtool --list"),
                    testing::AllOf(HasSubstr("task"), HasSubstr("exit 0"), Not(HasSubstr("evil"))))
            << plant;
        process->Stop();
        process.reset();
        std::filesystem::remove(Path("again"));
        std::filesystem::remove(Path("planted"));
    }
}

TEST_F(PlantedToolTest, NoTaskReplacesItForTheOthers) {
    StartAfter(kPlaceholder);
    EXPECT_THAT(RunByHand("exec 2>&1; cp /bin/true /tmp/orvaschedtool; rm -f /tmp/orvaschedtool; "
                          "mv /tmp/orvaschedtool /tmp/x; ln -sf /bin/true /tmp/orvaschedtool; "
                          "cmp /tmp/orvaschedtool " +
                          appliance.Program("orvaschedtool")),
                HasSubstr("exit 0"));
}

TEST_F(PlantedToolTest, NoLibraryBesideItIsLoaded) {
    StartAfter(kPlaceholder);
    EXPECT_THAT(RunByHand("for l in orva jsoncpp sqlite3 stdc++ c; do echo evil >/tmp/lib$l.so; "
                          "cp /tmp/lib$l.so /tmp/lib$l.so.6; cp /tmp/lib$l.so /tmp/lib$l.so.25; "
                          "cp /tmp/lib$l.so /tmp/lib$l.so.0; done; "
                          "/tmp/orvaschedtool --list"),
                HasSubstr("exit 0"));
}

TEST_F(PlantedToolTest, TheToolsWorkOnThisAppliance) {
    StartAfter(kPlaceholder);
    EXPECT_EQ(RunByHand("echo $ORVA_ROOT; test -x /usr/orva/bin/orva-run"),
              appliance.Root().Path().string() + "\nexit 0");
}

// The scheduler as ./dev serve starts it, without the machine's own view of things in between.
TEST_F(PlantedToolTest, ARunKeepsItsViewAndItsFilesWhenTheSchedulerIsStopped) {
    const std::vector<std::string> arguments = {appliance.Program("orva-schedd"), "--root",
                                                appliance.Root().Path().string()};
    process.emplace(arguments, "scheduling the tasks of ");
    ASSERT_TRUE(process->Ready()) << process->ErrorText();
    const int task = appliance.AddTask(
        "echo kept >/tmp/mine; echo >" + Path("up") + "; while ! test -e " + Path("go") +
        "; do sleep 0.02; done; cat /tmp/mine; /tmp/orvaschedtool --list; exit 7");
    TaskStore::Current()->QueueRun(task);
    ASSERT_TRUE(WaitFor([this] { return std::filesystem::exists(Path("up")); }));
    EXPECT_EQ(process->Stop(), 0);
    Touch("go");
    ASSERT_TRUE(WaitFor([] { return orva::RunFolder(1).Ending().has_value(); }));
    process.emplace(arguments, "scheduling the tasks of ");
    ASSERT_TRUE(process->Ready()) << process->ErrorText();
    appliance.WaitUntilIdle();
    const orva::Run run = appliance.OnlyRunOf(task);
    EXPECT_EQ(run.state, RunState::kEnded);
    EXPECT_EQ(run.exitStatus, 7);
    EXPECT_THAT(orva::RunStore::Current()->Output(run.id)->head,
                testing::AllOf(testing::StartsWith("kept\n"), HasSubstr("task")));
    EXPECT_FALSE(std::filesystem::exists("/tmp/mine"));
}

TEST_F(PlantedToolTest, WithoutAViewItStartsOnlyWhenItIsToldTo) {
    const std::string covered = "mount --bind /dev/null /usr/bin/bwrap && exec " +
                                appliance.Program("orva-schedd") + " --root " +
                                appliance.Root().Path().string();
    std::vector<std::string> arguments = {"/usr/bin/unshare", "--mount"};
    if (::geteuid() != 0) {
        arguments.insert(arguments.end(), {"--user", "--map-root-user"});
    }
    arguments.insert(arguments.end(), {"/bin/sh", "-c", covered});
    const orva::test::ProcessResult refused = orva::test::RunProcess(arguments);
    EXPECT_EQ(refused.status, 3);
    EXPECT_THAT(refused.err,
                HasSubstr("cannot make a private view of the file system: /usr/bin/bwrap: "
                          "Permission denied"));
    arguments.back() += " --no-view";
    process.emplace(arguments, "scheduling the tasks of ");
    EXPECT_TRUE(process->Ready());
    EXPECT_THAT(process->ErrorText(), HasSubstr("no private view of files"));
}

}  // namespace
