// The task tool as a program: files, streams and exit statuses.
#include <gmock/gmock.h>

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
    const ProcessResult exported = Run({"--export", "/no/such/directory/file"});
    EXPECT_EQ(exported.status, 1);
    EXPECT_THAT(exported.err, HasSubstr("/no/such/directory/file: cannot be written"));
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

TEST_F(OrvaschedtoolTest, WrongUsageIsTold) {
    EXPECT_EQ(Run({}).status, 2);
    EXPECT_EQ(Run({"--list", "--export"}).status, 2);
    EXPECT_EQ(Run({"--import"}).status, 2);
    EXPECT_EQ(Run({"--no-such-switch"}).status, 2);
    EXPECT_EQ(Run({"--next", "1"}).status, 2);
    EXPECT_EQ(Run({"--next", "1", "x"}).status, 2);
    EXPECT_EQ(Run({"--next", "0", "1"}).status, 2);
    EXPECT_EQ(Run({"--list", "--from", "2026-05-01T12:00:00Z"}).status, 2);
    EXPECT_EQ(Run({"--history", "x"}).status, 2);
    EXPECT_EQ(Run({"--history", "--list"}).status, 2);
    EXPECT_EQ(Run({"--output"}).status, 2);
    EXPECT_EQ(Run({"--output", "-1"}).status, 2);
    const ProcessResult noRun = Run({"--output", "0"});
    EXPECT_EQ(noRun.status, 2);
    EXPECT_THAT(noRun.err, testing::StartsWith("--output: Value 0 not in range 1 to "
                                               "9223372036854775807\n"));
    const ProcessResult noJson = Run({"--list", "--json"});
    EXPECT_EQ(noJson.status, 2);
    EXPECT_EQ(noJson.out, "");
    EXPECT_EQ(noJson.err, "orvaschedtool: --json goes with --next and --history only\n");
    EXPECT_EQ(Run({"--json", "--output", "1"}).status, 2);
    EXPECT_EQ(Run({"--beep", "1", "--json"}).status, 2);
    EXPECT_EQ(Run({"--help"}).status, 0);
}

}  // namespace
