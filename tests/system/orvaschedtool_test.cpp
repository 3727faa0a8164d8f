// The task tool as a program: files, streams and exit statuses.
#include <SQLiteCpp/SQLiteCpp.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <string>
#include <vector>

#include "tests/system/Process.h"

namespace {

using orva::test::ProcessResult;
using testing::HasSubstr;

constexpr const char* kTwoTasks = R"([
  {"basic": {"task_name": "first", "owner": "root", "app": "x", "enabled": "off"}, "command": "true"},
  {"basic": {"task_name": "second", "owner": "daemon", "app": "y"}, "schedule": {"hour": 3}}
])";

class OrvaschedtoolTest : public testing::Test {
  protected:
    ProcessResult Run(std::vector<std::string> arguments, const std::string& input = {}) const {
        arguments.insert(arguments.begin(),
                         {ORVA_BIN_DIR "/orvaschedtool", "--root", sandbox.Path().string()});
        return orva::test::RunProcess(arguments, input);
    }

    orva::test::Sandbox sandbox;
};

TEST_F(OrvaschedtoolTest, WhatIsImportedIsListedAndExported) {
    const std::string file = sandbox.Write("tasks.json", kTwoTasks);
    const ProcessResult import = Run({"--import", file});
    EXPECT_EQ(import.status, 0) << import.err;
    EXPECT_EQ(import.out, "2 tasks imported\n");

    const ProcessResult list = Run({"--list"});
    EXPECT_EQ(list.status, 0) << list.err;
    EXPECT_THAT(list.out, HasSubstr("1   off      N/A"));
    EXPECT_THAT(list.out, HasSubstr("daemon  second\n"));

    const ProcessResult toStream = Run({"--export"});
    EXPECT_EQ(toStream.status, 0) << toStream.err;
    const std::string exportFile = (sandbox.Path() / "export.json").string();
    const ProcessResult toFile = Run({"--export", exportFile});
    EXPECT_EQ(toFile.status, 0) << toFile.err;
    EXPECT_EQ(toFile.out, "");
    EXPECT_EQ(orva::test::ReadWholeFile(exportFile), toStream.out);

    // The same tasks again, from a stream: each replaces itself.
    const ProcessResult again = Run({"--import", "-"}, toStream.out);
    EXPECT_EQ(again.status, 0) << again.err;
    EXPECT_EQ(Run({"--export"}).out, toStream.out);
}

TEST_F(OrvaschedtoolTest, AnExportGoesWhereALinkLeads) {
    ASSERT_EQ(Run({"--import", "-"}, kTwoTasks).status, 0);
    const std::string exported = Run({"--export"}).out;
    sandbox.Write("kept/export.json", "a former export");
    std::filesystem::create_symlink("kept/export.json", sandbox.Path() / "relative");
    std::filesystem::create_symlink(sandbox.Path() / "relative", sandbox.Path() / "link");
    EXPECT_EQ(Run({"--export", (sandbox.Path() / "link").string()}).err, "");
    EXPECT_TRUE(std::filesystem::is_symlink(sandbox.Path() / "link"));
    EXPECT_TRUE(std::filesystem::is_symlink(sandbox.Path() / "relative"));
    EXPECT_EQ(orva::test::ReadWholeFile(sandbox.Path() / "kept/export.json"), exported);

    std::filesystem::create_symlink("kept/new.json", sandbox.Path() / "dangling");
    EXPECT_EQ(Run({"--export", (sandbox.Path() / "dangling").string()}).err, "");
    EXPECT_TRUE(std::filesystem::is_symlink(sandbox.Path() / "dangling"));
    EXPECT_EQ(orva::test::ReadWholeFile(sandbox.Path() / "kept/new.json"), exported);

    std::filesystem::create_symlink("circle", sandbox.Path() / "circle");
    const ProcessResult circle = Run({"--export", (sandbox.Path() / "circle").string()});
    EXPECT_EQ(circle.status, 1);
    EXPECT_THAT(circle.err, HasSubstr("cannot be written: Too many levels of symbolic links\n"));
    EXPECT_TRUE(std::filesystem::is_symlink(sandbox.Path() / "circle"));
}

TEST_F(OrvaschedtoolTest, AnExportToWhatIsNoFileIsWrittenIntoIt) {
    ASSERT_EQ(Run({"--import", "-"}, kTwoTasks).status, 0);
    const std::string exported = Run({"--export"}).out;
    const std::string pipe = (sandbox.Path() / "pipe").string();
    ASSERT_EQ(::mkfifo(pipe.c_str(), 0600), 0);
    // Open for both, so that neither side waits for the other.
    const int reader = ::open(pipe.c_str(), O_RDWR | O_NONBLOCK | O_CLOEXEC);
    EXPECT_EQ(Run({"--export", pipe}).err, "");
    std::string read(exported.size() + 1, '\0');
    read.resize(
        static_cast<std::size_t>(std::max(::read(reader, read.data(), read.size()), ssize_t{0})));
    ::close(reader);
    EXPECT_EQ(read, exported);
    EXPECT_TRUE(std::filesystem::is_fifo(pipe));

    std::filesystem::create_symlink("/proc/self/fd/1", sandbox.Path() / "stdout");
    std::filesystem::create_symlink("stdout", sandbox.Path() / "outer");
    for (const std::string name : {"stdout", "outer"}) {
        const ProcessResult result = Run({"--export", (sandbox.Path() / name).string()});
        EXPECT_EQ(result.err, "") << name;
        EXPECT_EQ(result.out, exported) << name;
    }
    EXPECT_TRUE(std::filesystem::is_symlink(sandbox.Path() / "stdout"));
    EXPECT_TRUE(std::filesystem::is_symlink(sandbox.Path() / "outer"));

    // A link to a device, so that a test gone wrong replaces the link and not the device.
    std::filesystem::create_symlink("/dev/full", sandbox.Path() / "full");
    const ProcessResult full = Run({"--export", (sandbox.Path() / "full").string()});
    EXPECT_EQ(full.status, 1);
    EXPECT_EQ(full.err, "orvaschedtool: " + (sandbox.Path() / "full").string() +
                            ": cannot be written: No space left on device\n");
    EXPECT_TRUE(std::filesystem::is_symlink(sandbox.Path() / "full"));
}

TEST_F(OrvaschedtoolTest, OneTaskIsNotCalledTasks) {
    EXPECT_EQ(Run({"--import", "-"}, R"([{"basic": {"task_name": "a", "app": "x"}}])").out,
              "1 task imported\n");
    EXPECT_EQ(Run({"--import", "-"}, "[]").out, "0 tasks imported\n");
}

TEST_F(OrvaschedtoolTest, ABadDocumentChangesNothingAndIsExplained) {
    EXPECT_EQ(Run({"--import", "-"}, kTwoTasks).status, 0);
    const std::string before = Run({"--export"}).out;
    const ProcessResult bad = Run({"--import", "-"}, R"([{"basic":{"task_name":"a","app":"x"}},
                                   {"basic":{"id":"1","task_name":"b","owner":"nobody-here"}}])");
    EXPECT_EQ(bad.status, 1);
    EXPECT_EQ(bad.out, "");
    EXPECT_EQ(bad.err,
              "orvaschedtool: -: task 2: basic.owner: may not be changed; nothing was imported\n");
    EXPECT_EQ(Run({"--export"}).out, before);
    EXPECT_EQ(Run({"--import", "-"}, "[").status, 1);
}

TEST_F(OrvaschedtoolTest, AnIdThatWouldUseUpTheIdsIsRefused) {
    const ProcessResult bad =
        Run({"--import", "-"},
            R"([{"basic":{"id":2147483647,"task_name":"a","app":"x","owner":"root"}}])");
    EXPECT_EQ(bad.status, 1);
    EXPECT_EQ(bad.err,
              "orvaschedtool: -: task 1: basic.id: is higher than 1000000000; "
              "nothing was imported\n");
    EXPECT_THAT(Run({"--help"}).out, HasSubstr("1000000000"));
}

TEST_F(OrvaschedtoolTest, AFileThatCannotBeReadOrWrittenIsNamed) {
    const ProcessResult import = Run({"--import", "/no/such/file"});
    EXPECT_EQ(import.status, 1);
    EXPECT_EQ(import.err, "orvaschedtool: /no/such/file: No such file or directory\n");
    ASSERT_EQ(Run({"--import", "-"}, "[]").status, 0);
    ASSERT_EQ(Run({"--import", "-"}, kTwoTasks).status, 0);
    const ProcessResult exported = Run({"--export", "/no/such/directory/file"});
    EXPECT_EQ(exported.status, 1);
    EXPECT_EQ(exported.err,
              "orvaschedtool: /no/such/directory/file: cannot be written: No such file or "
              "directory\n");
    const std::string directory = sandbox.Path().string();
    EXPECT_EQ(Run({"--export", directory}).err,
              "orvaschedtool: " + directory + ": cannot be written: Is a directory\n");
}

TEST_F(OrvaschedtoolTest, AStoreThatCannotBeOpenedIsNamed) {
    sandbox.Write("usr/orva/var/tasks.db", std::string(5000, 'x'));
    for (const std::vector<std::string>& arguments :
         {std::vector<std::string>{"--list"}, {"--export"}}) {
        const ProcessResult result = Run(arguments);
        EXPECT_EQ(result.status, 1);
        EXPECT_EQ(result.err, "orvaschedtool: task store " + sandbox.Path().string() +
                                  "/usr/orva/var/tasks.db: file is not a database\n");
    }
}

TEST_F(OrvaschedtoolTest, ComingStartsAreShownInTheZoneThatIsAskedFor) {
    ASSERT_EQ(Run({"--import", "-"}, kTwoTasks).status, 0);
    const ProcessResult next = Run(
        {"--next", "2", "2", "--from", "2026-05-01T12:00:00Z", "--zone", "Asia/Kolkata", "--json"});
    EXPECT_EQ(next.status, 0) << next.err;
    EXPECT_EQ(next.out, R"([
 {"local":"2026-05-02T03:00:00+05:30","utc":"2026-05-01T21:30:00Z"},
 {"local":"2026-05-03T03:00:00+05:30","utc":"2026-05-02T21:30:00Z"}
]
)");
    EXPECT_EQ(Run({"--json", "--next", "1", "3"}).err, "orvaschedtool: there is no task 3\n");
}

TEST_F(OrvaschedtoolTest, AHistoryWithoutRunsIsEmpty) {
    ASSERT_EQ(Run({"--import", "-"}, kTwoTasks).status, 0);
    EXPECT_EQ(Run({"--history", "--json"}).out, "[]\n");
    EXPECT_EQ(Run({"--json", "--history", "1"}).out, "[]\n");
    EXPECT_THAT(Run({"--history"}).out, testing::StartsWith("RUN "));
    const ProcessResult output = Run({"--output", "1"});
    EXPECT_EQ(output.status, 1);
    EXPECT_EQ(output.err, "orvaschedtool: there is no run 1\n");
}

TEST_F(OrvaschedtoolTest, WhatReadsTheStoreMakesNone) {
    const std::string complaint = "orvaschedtool: there is no task store " +
                                  sandbox.Path().string() + "/usr/orva/var/tasks.db\n";
    for (const std::vector<std::string>& arguments : {std::vector<std::string>{"--list"},
                                                      {"--export"},
                                                      {"--history"},
                                                      {"--output", "1"},
                                                      {"--next", "1", "1"}}) {
        const ProcessResult result = Run(arguments);
        EXPECT_EQ(result.status, 1);
        EXPECT_EQ(result.out, "");
        EXPECT_EQ(result.err, complaint);
    }
    EXPECT_TRUE(std::filesystem::is_empty(sandbox.Path()));
    EXPECT_EQ(Run({"--import", "-"}, "[]").status, 0);
    EXPECT_EQ(Run({"--export"}).out, "[]\n");
}

TEST_F(OrvaschedtoolTest, AnApplianceWithoutADatabaseYetHasNoTasksAndNoRuns) {
    const std::filesystem::path var = sandbox.Path() / "usr/orva/var";
    std::filesystem::create_directories(var);
    EXPECT_EQ(Run({"--list"}).out, "ID  ENABLED  NEXT START  OWNER  NAME\n");
    EXPECT_EQ(Run({"--export"}).out, "[]\n");
    EXPECT_EQ(Run({"--history", "--json"}).out, "[]\n");
    for (const std::vector<std::string>& arguments :
         {std::vector<std::string>{"--list"}, {"--export"}, {"--history"}}) {
        const ProcessResult result = Run(arguments);
        EXPECT_EQ(result.status, 0);
        EXPECT_EQ(result.err, "");
    }
    EXPECT_EQ(Run({"--output", "1"}).err, "orvaschedtool: there is no run 1\n");
    EXPECT_EQ(Run({"--next", "1", "1"}).err, "orvaschedtool: there is no task 1\n");
    EXPECT_TRUE(std::filesystem::is_empty(var));
}

TEST_F(OrvaschedtoolTest, ADamagedTaskIsNamedAndTheOthersAreListedAndExported) {
    ASSERT_EQ(Run({"--import", "-"}, kTwoTasks).status, 0);
    SQLite::Database((sandbox.Path() / "usr/orva/var/tasks.db").string(), SQLite::OPEN_READWRITE)
        .exec("UPDATE task SET mode = 7 WHERE id = 1");
    for (const char* verb : {"--list", "--export"}) {
        const ProcessResult result = Run({verb});
        EXPECT_EQ(result.status, 1);
        EXPECT_THAT(result.out, AllOf(HasSubstr("second"), Not(HasSubstr("first"))));
        EXPECT_EQ(result.err, "orvaschedtool: task 1: column mode holds 7: it is left out\n");
    }
}

TEST_F(OrvaschedtoolTest, EveryWordAfterAServiceVerbIsAName) {
    sandbox.Write("usr/orva/share/services.json",
                  R"({"services": {"FTP": {"start": "true", "stop": "true"},
                                   "-x": {"start": "true", "stop": "true"}}})");
    const ProcessResult result =
        Run({"--start-service", "FTP", "nope", "", "S", "[FTP]", "a b", "-x", "%%", "FTP"});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "FTP: started\n-x: started\nFTP: started\n");
    EXPECT_EQ(result.err,
              "orvaschedtool: nope: there is no such service\n"
              "orvaschedtool: '': there is no such service\n"
              "orvaschedtool: S: there is no such service\n"
              "orvaschedtool: [FTP]: there is no such service\n"
              "orvaschedtool: 'a b': there is no such service\n"
              "orvaschedtool: %%: there is no such service\n");
    EXPECT_EQ(Run({"--stop-service", "[FTP]"}).status, 1);
    EXPECT_EQ(Run({"--stop-service", "FTP"}).out, "FTP: stopped\n");
    EXPECT_EQ(Run({"--stop-service=FTP"}).out, "FTP: stopped\n");
    EXPECT_EQ(Run({"--stop-service", "FTP", "--start-service", "FTP"}).status, 2);
    EXPECT_EQ(Run({"--stop-service", "FTP", "--no-such"}).err,
              "orvaschedtool: unknown argument '--no-such' (see orvaschedtool --help)\n");
}

TEST_F(OrvaschedtoolTest, WrongUsageIsToldInOneLineThatNamesTheArgument) {
    struct Wrong {
        std::vector<std::string> arguments;
        const char* problem;
    };
    const std::vector<Wrong> wrong = {
        {{},
         "Exactly 1 option from [--import,--export,--list,--next,--history,--output,--beep,"
         "--start-service,--stop-service] is required"},
        {{"--list", "--export"},
         "Exactly 1 option from [--import,--export,--list,--next,--history,--output,--beep,"
         "--start-service,--stop-service] is required and 2 were given"},
        {{"--no-such-switch"}, "unknown argument '--no-such-switch'"},
        {{"--no-such-switch", "--list"}, "unknown argument '--no-such-switch'"},
        {{"-x"}, "unknown argument '-x'"},
        {{"word"}, "unknown argument 'word'"},
        {{"--list", "two words\n"}, "unknown argument $'two words\\x0a'"},
        {{"--list", "--"}, nullptr},
        {{"--import"}, "--import needs FILE"},
        {{"--output"}, "--output needs RUN"},
        {{"--beep"}, "--beep needs SECONDS"},
        {{"--start-service"}, "--start-service needs NAME..."},
        {{"--list", "--root"}, "--root needs DIR"},
        {{"--list", "--root", "/tmp"}, "--root is given more than once"},
        {{"--next"}, "--next needs N ID"},
        {{"--next", "1"}, "--next needs N ID"},
        {{"--next", "1", "x"}, "--next: Value x not in range 1 to 2147483647"},
        {{"--next", "0", "1"}, "--next: Value 0 not in range 1 to 2147483647"},
        {{"--output", "0"}, "--output: Value 0 not in range 1 to 9223372036854775807"},
        {{"--output", "-1"}, "--output: Value -1 not in range 1 to 9223372036854775807"},
        {{"--list", "--from", "2026-05-01T12:00:00Z"}, "--from requires --next"},
        {{"--list", "--json"}, "--json goes with --next and --history only"},
        {{"--beep", "1", "--json"}, "--json goes with --next and --history only"},
        {{"--beep", "0"}, "--beep needs a number of seconds from 1 to 600"},
    };
    for (const auto& [arguments, problem] : wrong) {
        const ProcessResult result = Run(arguments);
        if (problem == nullptr) {
            EXPECT_EQ(result.status, 1) << result.err;
            continue;
        }
        EXPECT_EQ(result.status, 2) << problem;
        EXPECT_EQ(result.out, "");
        EXPECT_EQ(result.err,
                  "orvaschedtool: " + std::string(problem) + " (see orvaschedtool --help)\n");
    }
    ASSERT_EQ(Run({"--import", "-"}, kTwoTasks).status, 0);
    EXPECT_EQ(Run({"--history", "x"}).err,
              "orvaschedtool: --history takes the id of a task (see orvaschedtool --help)\n");
    EXPECT_EQ(Run({"--history", "x"}).status, 2);
    EXPECT_EQ(Run({"--help"}).status, 0);
    EXPECT_THAT(Run({"--help"}).out, HasSubstr("--output RUN"));
}

}  // namespace
