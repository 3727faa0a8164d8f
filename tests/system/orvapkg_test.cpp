// The package tool as a program: on packages of the test's own, and on those of the example
// appliance, whose servers are real processes.
#include <gmock/gmock.h>
#include <signal.h>

#include <filesystem>
#include <string>
#include <vector>

#include "tests/system/Process.h"

namespace {

using orva::test::ProcessResult;
using testing::HasSubstr;

class OrvapkgTest : public testing::Test {
  protected:
    ProcessResult Run(std::vector<std::string> arguments) const {
        arguments.insert(arguments.begin(), {ORVA_BIN_DIR "/orvapkg", "--root", Root()});
        return orva::test::RunProcess(arguments);
    }
    std::string Root() const { return sandbox.Path().string(); }
    void Install(const std::string& id, const std::string& description) const {
        sandbox.Write("usr/orva/packages/" + id + "/package.json", description);
    }

    orva::test::Sandbox sandbox;
};

TEST_F(OrvapkgTest, StartsStopsAndTells) {
    Install("it's one", R"({"display_name": "One", "startable": true,
        "start": "echo \"$ORVA_ROOT\"; : >flag", "stop": "rm flag", "status": "test -e flag"})");
    ProcessResult result = Run({"status", "it's one"});
    EXPECT_EQ(result.status, 3);
    EXPECT_EQ(result.out, "$'it\\'s one': stopped\n");
    result = Run({"start", "it's one"});
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(result.out, Root() + "\n$'it\\'s one': started\n");
    EXPECT_EQ(Run({"start", "it's one"}).out, "$'it\\'s one': is running already\n");
    result = Run({"status", "it's one"});
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.out, "$'it\\'s one': running\n");
    result = Run({"stop", "it's one"});
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(result.out, "$'it\\'s one': stopped\n");
}

TEST_F(OrvapkgTest, ListsEveryPackageWithItsState) {
    Install("a", R"({"display_name": "A running one", "startable": true, "status": "true"})");
    Install("long-id", R"({"display_name": "Stopped", "startable": true, "status": "exit 3"})");
    Install("m", R"({"display_name": "Mute", "startable": true})");
    Install("never", R"({"display_name": "Never", "status": "true"})");
    ProcessResult result = Run({"list"});
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(result.out,
              "a        running  A running one\n"
              "long-id  stopped  Stopped\n"
              "m        unknown  Mute\n"
              "never    -        Never\n");
    Install("broken", "{");
    result = Run({"list"});
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.out, HasSubstr("never"));
    EXPECT_EQ(result.err, "orvapkg: broken: its description is damaged\n");
}

TEST_F(OrvapkgTest, NamesWhatFails) {
    Install("never", R"({"display_name": "Never"})");
    Install("bad", R"({"display_name": "Bad", "startable": true, "start": "echo why >&2; exit 9",
                       "stop": "true"})");
    ProcessResult result = Run({"start", "never"});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err,
              "orvapkg: never: cannot be started: it is not made to be started and stopped\n");
    EXPECT_EQ(result.out, "");
    result = Run({"start", "bad"});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err, "why\norvapkg: bad: its start command: exit status 9\n");
    EXPECT_EQ(Run({"stop", "nope"}).err, "orvapkg: nope: is not installed\n");
    EXPECT_EQ(Run({"stop", "nope"}).status, 1);
    EXPECT_EQ(Run({"status", "bad"}).err, "orvapkg: bad: it gives no status command\n");
    EXPECT_EQ(Run({"status", "bad"}).status, 1);
}

TEST_F(OrvapkgTest, ARootThatIsNotThereIsNoApplianceWithoutPackages) {
    const std::string root = (sandbox.Path() / "typo").string();
    const ProcessResult result =
        orva::test::RunProcess({ORVA_BIN_DIR "/orvapkg", "--root", root, "list"});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err, "orvapkg: the root " + root + ": No such file or directory\n");
    EXPECT_FALSE(std::filesystem::exists(root));
}

TEST_F(OrvapkgTest, WrongUsageIsTold) {
    struct Wrong {
        std::vector<std::string> arguments;
        const char* problem;
    };
    const std::vector<Wrong> wrong = {{{}, "A subcommand is required"},
                                      {{"start"}, "ID is required"},
                                      {{"start", "a", "b"}, "unknown argument 'b'"},
                                      {{"start", "--x"}, "unknown argument '--x'"},
                                      {{"restart", "a"}, "unknown argument 'restart'"},
                                      {{"--x"}, "unknown argument '--x'"},
                                      {{"list", "--root"}, "unknown argument '--root'"}};
    for (const auto& [arguments, problem] : wrong) {
        const ProcessResult result = Run(arguments);
        EXPECT_EQ(result.status, 2);
        EXPECT_EQ(result.out, "");
        EXPECT_EQ(result.err, "orvapkg: " + std::string(problem) + " (see orvapkg --help)\n");
    }
    EXPECT_EQ(Run({"--help"}).status, 0);
    EXPECT_EQ(Run({"start", "--help"}).status, 0);
}

TEST_F(OrvapkgTest, AnExamplePackageIsARealProcess) {
    std::filesystem::copy(ORVA_SOURCE_DIR "/example/root", sandbox.Path(),
                          std::filesystem::copy_options::recursive);
    EXPECT_EQ(Run({"list"}).out,
              "legacy-sync    -        Legacy Sync\n"
              "media-indexer  stopped  Media Indexer\n"
              "note-server    stopped  Note Server\n"
              "photo-gallery  stopped  Photo Gallery\n");
    ASSERT_EQ(Run({"start", "note-server"}).status, 0);
    EXPECT_EQ(Run({"status", "note-server"}).status, 0);
    EXPECT_EQ(Run({"status", "media-indexer"}).status, 3);
    const std::filesystem::path file = sandbox.Path() / "run/orva/example/note-server.pid";
    const int pid = std::stoi(orva::test::ReadWholeFile(file));
    EXPECT_EQ(::getsid(pid), pid);

    EXPECT_EQ(Run({"stop", "note-server"}).out, "note-server: stopped\n");
    EXPECT_EQ(Run({"status", "note-server"}).status, 3);
    const std::string log =
        orva::test::ReadWholeFile(sandbox.Path() / "usr/orva/var/log/note-server.log");
    EXPECT_THAT(log, HasSubstr(" note-server started\n"));
    EXPECT_THAT(log, HasSubstr(" note-server stopped\n"));

    // Its status is true even when it had no time to put anything in order.
    ASSERT_EQ(Run({"start", "note-server"}).status, 0);
    const int again = std::stoi(orva::test::ReadWholeFile(file));
    EXPECT_EQ(::kill(again, SIGKILL), 0);
    EXPECT_EQ(Run({"stop", "note-server"}).status, 0);
    EXPECT_EQ(Run({"status", "note-server"}).status, 3);
}

}  // namespace
