// The command lines of tasks, given to real shells with printing programs in place of the tools.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "include/TaskSchedulerBeepHandler.h"
#include "include/TaskSchedulerRecycleHandler.h"
#include "include/TaskSchedulerScriptHandler.h"
#include "include/TaskSchedulerServiceHandler.h"
#include "tests/src/TypedHandlers.h"

// The appliance's own encoder, compiled under this name; the linker sends the module's calls of
// QLIBCEncShParam to the function below it.
int ApplianceEncShParam(const char* text, char* buffer, int size);
extern "C" int __wrap__Z15QLIBCEncShParamPKcPci(const char* text, char* buffer, int size);
extern "C" int __wrap__Z15QLIBCEncShParamPKcPci(const char* text, char* buffer, int size) {
    return ApplianceEncShParam(text, buffer, size);
}

namespace fakes {
namespace {

using ::testing::ElementsAre;

// A program that was run, and its arguments.
using Program = std::vector<std::string>;

const std::vector<std::string> kNames = {
    "plain",
    "two words",
    " lead and trail ",
    "it's",
    "''''''''",
    "say \"hi\"",
    "$HOME",
    "${x:-y}",
    "$(echo x)",
    "`echo x`",
    "line\nbreak",
    "\n",
    "'\n'",
    "a;b",
    "a&b|c>d<e",
    "(a)",
    "*",
    "[a-z]?",
    "~",
    "-rf",
    "--help",
    "#hash",
    "!bang",
    "{a,b}",
    "a=b",
    "back\\slash\\",
    "tab\tbell\a",
    "\xC3\xA4\xE2\x82\xAC\xF0\x9D\x84\x9E",
    std::string(255, '\''),
    std::string(255, '$'),
};

class CommandLine : public PlatformTest {
  protected:
    void SetUp() override {
        std::string name = (std::filesystem::temp_directory_path() / "command-XXXXXX").string();
        ASSERT_NE(mkdtemp(name.data()), nullptr);
        directory = name;
        for (const char* tool : {"orvarecycle", "orvaschedtool", "orvapkg"}) {
            const std::filesystem::path program = directory / tool;
            std::ofstream(program) << "#!/bin/sh\n"
                                      "printf '%s\\0%s\\0' \"${0##*/}\" $#\n"
                                      "for word in \"$@\"; do printf '%s\\0' \"$word\"; done\n";
            std::filesystem::permissions(program, std::filesystem::perms::owner_all);
        }
    }

    void TearDown() override {
        std::filesystem::remove_all(directory);
        PlatformTest::TearDown();
    }

    // The programs that `shell` runs for the command, in order.
    std::vector<Program> RunIn(const std::string& shell, std::string command) const {
        Replace(command, "/usr/orva/bin/orvarecycle", (directory / "orvarecycle").string());
        Replace(command, "/usr/orva/bin/orvapkg", (directory / "orvapkg").string());
        Replace(command, "/tmp/orvaschedtool", (directory / "orvaschedtool").string());
        return Parsed(OutputOf(shell, command));
    }

    // What dash and bash run, which must be the same.
    std::vector<Program> RunIn(const std::string& command) const {
        std::vector<Program> inDash = RunIn("dash", command);
        EXPECT_EQ(inDash, RunIn("bash", command)) << command;
        return inDash;
    }

    std::filesystem::path directory;

  private:
    static void Replace(std::string& text, const std::string& from, const std::string& to) {
        for (std::size_t at = text.find(from); at != std::string::npos;
             at = text.find(from, at + to.size())) {
            text.replace(at, from.size(), to);
        }
    }

    static std::string OutputOf(std::string shell, std::string command) {
        std::array<int, 2> channel{};
        EXPECT_EQ(pipe2(channel.data(), O_CLOEXEC), 0);
        posix_spawn_file_actions_t actions;
        posix_spawn_file_actions_init(&actions);
        posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
        posix_spawn_file_actions_adddup2(&actions, channel[1], STDOUT_FILENO);
        std::string option = "-c";
        const std::array<char*, 4> arguments = {shell.data(), option.data(), command.data(),
                                                nullptr};
        pid_t child = -1;
        EXPECT_EQ(posix_spawnp(&child, shell.c_str(), &actions, nullptr, arguments.data(), environ),
                  0);
        posix_spawn_file_actions_destroy(&actions);
        close(channel[1]);
        std::string output;
        std::array<char, 4096> buffer{};
        for (ssize_t got = 0; (got = read(channel[0], buffer.data(), buffer.size())) > 0;) {
            output.append(buffer.data(), static_cast<std::size_t>(got));
        }
        close(channel[0]);
        int status = -1;
        EXPECT_EQ(waitpid(child, &status, 0), child);
        EXPECT_EQ(status, 0) << shell << ": " << command;
        return output;
    }

    static std::vector<Program> Parsed(const std::string& output) {
        std::vector<std::string> words;
        for (std::size_t at = 0; at < output.size();) {
            const std::size_t end = output.find('\0', at);
            words.push_back(output.substr(at, end - at));
            at = end == std::string::npos ? output.size() : end + 1;
        }
        std::vector<Program> runs;
        for (std::size_t at = 0; at + 1 < words.size();) {
            Program run = {words[at]};
            const std::size_t count = std::strtoul(words[at + 1].c_str(), nullptr, 10);
            at += 2;
            for (std::size_t word = 0; word < count && at < words.size(); ++word) {
                run.push_back(words[at++]);
            }
            runs.push_back(run);
        }
        return runs;
    }
};

TEST_F(CommandLine, ShareNamesReachTheRecycleToolUnchangedAndAlone) {
    Json::Value parameters;
    parameters["name"] = "Job";
    parameters["extra"]["clean_share_policy"]["clean_all"] = false;
    Program expected = {"orvarecycle", "--clean"};
    for (const std::string& name : kNames) {
        parameters["extra"]["clean_share_policy"]["shares"].append(name);
        expected.push_back(name);
    }
    ASSERT_EQ(Serve<TaskSchedulerRecycleHandler>("set", Compact(parameters)),
              R"(success {"id":100})");
    EXPECT_THAT(RunIn(platform.tasks[100].command), ElementsAre(expected));
}

TEST_F(CommandLine, EachShareNameIsReadBackOnItsOwn) {
    for (const std::string& name : kNames) {
        Json::Value parameters;
        parameters["name"] = "Job";
        parameters["extra"]["clean_share_policy"]["clean_all"] = false;
        parameters["extra"]["clean_share_policy"]["shares"].append(name);
        parameters["extra"]["clean_file_policy"]["policy"] = "time";
        parameters["extra"]["clean_file_policy"]["time"] = 7;
        Serve<TaskSchedulerRecycleHandler>("set", Compact(parameters));
        EXPECT_THAT(RunIn(platform.tasks[platform.nextId - 1].command),
                    ElementsAre(ElementsAre("orvarecycle", "--clean", name, "-t", "7")));
    }
}

TEST_F(CommandLine, ServiceAndPackageNamesReachTheirToolsUnchangedAndAlone) {
    Json::Value section;
    section["service_action"] = "1";
    Program services = {"orvaschedtool", "--start-service"};
    std::vector<Program> expected;
    for (const std::string& name : kNames) {
        ORVAPackageTool::PackageInfo info;
        info.startable = true;
        platform.packages[name] = info;
        for (const int type : {2, 1}) {
            Json::Value entry;
            entry["name"] = name;
            entry["service_type"] = type;
            entry["enabled"] = true;
            section["service_store"].append(entry);
        }
        services.push_back(name);
        expected.push_back({"orvapkg", "start", name});
    }
    expected.insert(expected.begin(), services);
    platform.AddTask(StoredTask(5, "ORVA.ZUM.TaskScheduler.Service", Compact(section)));

    ASSERT_EQ(Serve<TaskSchedulerServiceHandler>("set", R"({"id":5,"name":"Job"})"),
              R"(success {"id":5})");
    EXPECT_EQ(RunIn(platform.tasks[5].command), expected);
}

TEST_F(CommandLine, PolicySwitchesReachTheRecycleToolAsSeparateWords) {
    Serve<TaskSchedulerRecycleHandler>(
        "set",
        R"({"name":"Job","extra":{"clean_file_policy":{"policy":"size","size":2,"sort_type":0,)"
        R"("reserve_policy":{"size_greater_check":true,"size_greater":1,)"
        R"("size_smaller_check":true,"size_smaller":0,"extension_check":true,)"
        R"("extension":[{"file_ext":"tar gz"},{"file_ext":"jpg"}]}}}})");
    EXPECT_THAT(RunIn(platform.tasks[100].command),
                ElementsAre(ElementsAre("orvarecycle", "--clean", "-s", "2097152", "-o", "2",
                                        "-file_ext=tar gz.jpg", "-m", "1048576", "-l", "0")));
}

// Who may write a task may write a script: the shell's own characters in an extension keep their
// meaning.
TEST_F(CommandLine, ExtensionsAreExpandedByTheShell) {
    Serve<TaskSchedulerRecycleHandler>(
        "set", R"json({"name":"Job","extra":{"clean_file_policy":{"reserve_policy":{)json"
               R"json("extension_check":true,"extension":[{"file_ext":"$(printf x)"}]}}}})json");
    EXPECT_THAT(RunIn(platform.tasks[100].command),
                ElementsAre(ElementsAre("orvarecycle", "--clean", "-file_ext=x")));
}

TEST_F(CommandLine, TheBeepReachesTheSchedulerTool) {
    Serve<TaskSchedulerBeepHandler>("set", R"({"name":"Job","extra":{"beep_duration":9999}})");
    EXPECT_THAT(RunIn(platform.tasks[100].command),
                ElementsAre(ElementsAre("orvaschedtool", "--beep", "600")));
}

TEST_F(CommandLine, AScriptIsTheUsersOwnText) {
    Serve<TaskSchedulerScriptHandler>("set",
                                      R"({"name":"Job","extra":{"script":"for x in 1 2\ndo\n)"
                                      R"(/usr/orva/bin/orvapkg \"$x\" 'a b'\ndone"}})");
    EXPECT_THAT(
        RunIn(platform.tasks[100].command),
        ElementsAre(ElementsAre("orvapkg", "1", "a b"), ElementsAre("orvapkg", "2", "a b")));
}

}  // namespace
}  // namespace fakes
