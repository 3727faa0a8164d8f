// The command lines of beep and service tasks, as the editor's module writes them, run by a shell
// with the real tools.
#include <gmock/gmock.h>
#include <json/json.h>
#include <signal.h>

#include <filesystem>
#include <memory>
#include <string>

#include "tests/system/Process.h"
#include "tests/system/TypedTasks.h"

namespace {

using orva::test::ProcessResult;
using orva::test::ReadWholeFile;

class MachineTasksTest : public orva::test::TypedTasksTest {
  protected:
    MachineTasksTest() {
        const orva::test::Sandbox& root = server.Root();
        root.Write("usr/orva/etc/orva.conf", "supportNFS=\"yes\"\nsupportweb=\"yes\"\n");
        root.Write("usr/orva/share/services.json",
                   ReadWholeFile(ORVA_SOURCE_DIR "/appliance/tools/data/services.json"));
        // This machine's own services are not for tests.
        const std::string systemctl =
            root.Write("bin/systemctl", "#!/bin/sh\necho \"$2 $4\" >>\"$ORVA_ROOT/calls\"\n");
        std::filesystem::permissions(systemctl, std::filesystem::perms::owner_all);
    }

    // The command of the task that `create` stores.
    std::string CommandOf(const std::string& type, const std::string& extra) const {
        const std::string answer =
            Body("create", R"({"type": ")" + type + R"(", "name": "a", "extra": )" + extra + "}");
        EXPECT_NE(answer.find(R"("success":true)"), std::string::npos) << answer;
        const std::string records = Records();
        const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
        Json::Value tasks;
        EXPECT_TRUE(
            reader->parse(records.data(), records.data() + records.size(), &tasks, nullptr));
        return tasks[tasks.size() - 1]["command"].asString();
    }

    // Runs it with the tools of this build in the places of the installed ones.
    ProcessResult RunCommand(std::string command) const {
        Replace(command, "/tmp/orvaschedtool", ORVA_BIN_DIR "/orvaschedtool");
        Replace(command, "/usr/orva/bin/", ORVA_BIN_DIR "/");
        return orva::test::RunProcess(
            {"/bin/sh", "-c", command}, {},
            {{"ORVA_ROOT", Root()}, {"PATH", Root() + "/bin:/usr/bin:/bin"}});
    }

    std::string Root() const { return server.Root().Path().string(); }
    std::string Calls() const { return ReadWholeFile(server.Root().Path() / "calls"); }

  private:
    static void Replace(std::string& text, const std::string& from, const std::string& to) {
        for (std::size_t at = text.find(from); at != std::string::npos;
             at = text.find(from, at + to.size())) {
            text.replace(at, from.size(), to);
        }
    }
};

TEST_F(MachineTasksTest, AServiceTaskStopsItsServicesAndPackages) {
    Install("Notes", R"({"display_name": "Notes", "startable": true,
        "start": "echo 'start Notes' >>\"$ORVA_ROOT/calls\"",
        "stop": "echo 'stop Notes' >>\"$ORVA_ROOT/calls\""})");
    const std::string extra = R"({"action": "stop", "services": [
        {"id": "Samba", "enable": true}, {"id": "NFS", "enable": true},
        {"id": "Notes", "enable": true}]})";
    const std::string command = CommandOf("service", extra);
    EXPECT_EQ(command,
              "/tmp/orvaschedtool --stop-service 'Samba' 'NFS';\n"
              "/usr/orva/bin/orvapkg stop 'Notes';\n");
    const ProcessResult result = RunCommand(command);
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.err, "");
    EXPECT_EQ(result.out, "Samba: stopped\nNFS: stopped\nNotes: stopped\n");
    EXPECT_EQ(Calls(),
              "stop smbd.service\nstop nmbd.service\nstop nfs-server.service\nstop Notes\n");
}

TEST_F(MachineTasksTest, EveryServiceThatCanBeChosenIsKnown) {
    const ProcessResult result = RunCommand(CommandOf("service", R"({"action": "start",
        "services": [{"id": "Samba", "enable": true}, {"id": "AFP", "enable": true},
            {"id": "BonjourPrinter", "enable": true}, {"id": "NFS", "enable": true},
            {"id": "AutoBlock", "enable": true}, {"id": "FTP", "enable": true},
            {"id": "FTPES", "enable": true}, {"id": "SFTP", "enable": true},
            {"id": "WebDeck", "enable": true}, {"id": "WebDAV", "enable": true},
            {"id": "SecureWebDAV", "enable": true}, {"id": "NTP", "enable": true}]})"));
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.err, "");
    EXPECT_EQ(result.out,
              "Samba: started\nAFP: started\nBonjourPrinter: started\nNFS: started\n"
              "AutoBlock: started\nFTP: started\nFTPES: started\nSFTP: started\n"
              "WebDeck: started\nWebDAV: started\nSecureWebDAV: started\nNTP: started\n");
}

TEST_F(MachineTasksTest, AServiceThatIsNoLongerKnownDoesNotKeepTheOthersFromBeingDone) {
    server.Root().Write("usr/orva/share/services.json",
                        R"({"services": {"NFS": {"start": "echo on", "stop": "echo off"}}})");
    const ProcessResult result =
        RunCommand("/tmp/orvaschedtool --start-service 'Samba' 'NFS' 'it'\\''s'");
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "on\nNFS: started\n");
    EXPECT_EQ(result.err,
              "orvaschedtool: Samba: there is no such service\n"
              "orvaschedtool: $'it\\'s': there is no such service\n");
}

TEST_F(MachineTasksTest, TheServicesOfTheExampleApplianceAreRealProcesses) {
    std::filesystem::copy(ORVA_SOURCE_DIR "/example/root/usr/orva",
                          server.Root().Path() / "usr/orva",
                          std::filesystem::copy_options::recursive |
                              std::filesystem::copy_options::overwrite_existing);
    const auto pidOf = [this](const char* name) {
        return std::stoi(ReadWholeFile(server.Root().Path() / "run/orva/example" /
                                       (name + std::string(".pid"))));
    };
    ProcessResult result = RunCommand(
        "/tmp/orvaschedtool --start-service 'Samba' 'NFS';\n"
        "/usr/orva/bin/orvapkg start 'note-server';\n");
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.err, "");
    EXPECT_EQ(result.out, "Samba: started\nNFS: started\nnote-server: started\n");
    for (const char* name : {"Samba", "NFS", "note-server"}) {
        EXPECT_EQ(::kill(pidOf(name), 0), 0) << name;
    }
    result = RunCommand(
        "/tmp/orvaschedtool --stop-service 'Samba' 'NFS';\n"
        "/usr/orva/bin/orvapkg stop 'note-server';\n");
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.err, "");
    EXPECT_EQ(result.out, "Samba: stopped\nNFS: stopped\nnote-server: stopped\n");
    for (const char* name : {"Samba", "NFS", "note-server"}) {
        EXPECT_EQ(RunCommand("sh " + Root() + "/usr/orva/example/control status " + name).status, 1)
            << name;
    }
    EXPECT_EQ(Calls(), "");
}

TEST_F(MachineTasksTest, ABeepTaskSoundsTheBuzzerOrSaysThatThereIsNone) {
    const std::string command = CommandOf("beep", R"({"beep_duration": 1})");
    EXPECT_EQ(command, "/tmp/orvaschedtool --beep 1");
    const ProcessResult result = RunCommand(command);
    EXPECT_EQ(result.out, "");
    if (result.status == 3) {
        EXPECT_EQ(result.err, "orvaschedtool: this machine has no buzzer\n");
    } else if (result.status == 1) {
        EXPECT_THAT(result.err,
                    testing::StartsWith("orvaschedtool: the buzzer cannot be used: /dev/"));
    } else {
        EXPECT_EQ(result.status, 0);
        EXPECT_EQ(result.err, "");
    }
}

TEST_F(MachineTasksTest, ABeepOfAnotherLengthIsWrongUsage) {
    for (const char* seconds : {"0", "601", "1.5", "''", "-1"}) {
        EXPECT_EQ(RunCommand(std::string("/tmp/orvaschedtool --beep ") + seconds).status, 2)
            << seconds;
    }
}

}  // namespace
