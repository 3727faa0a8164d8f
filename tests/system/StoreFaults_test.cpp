// A task store that cannot be used: what each way to it answers, and that it works again
// afterwards.
#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "tests/system/RunningServer.h"

namespace {

using orva::test::ProcessResult;
using orva::test::ReadWholeFile;
using orva::test::RunningServer;
using testing::HasSubstr;

constexpr char kApi[] = "ORVA.Core.TaskScheduler";
constexpr char kListFailed[] =
    R"({"success":false,"error":{"code":117,"details":{"msg":"get task list failed"}}})";
constexpr char kDeleteFailed[] =
    R"({"success":false,"error":{"code":4802,"details":{"msg":"Failed to delete task"}}})";
constexpr char kNothing[] = R"({"success":true,"data":null})";

class StoreFaultsTest : public testing::Test {
  protected:
    StoreFaultsTest() : server({ORVA_LIB_DIR "/ORVA.Core.TaskScheduler.so"}) {
        EXPECT_EQ(Tool({"--import", "-"}, Tasks(200)).out, "200 tasks imported\n");
    }

    static std::string Tasks(int count) {
        std::string tasks;
        for (int task = 1; task <= count; ++task) {
            tasks += task == 1 ? "[" : ",";
            tasks += R"({"basic": {"task_name": "task )" + std::to_string(task) +
                     R"(", "app": "x", "owner": "root"}, "command": ")" + std::string(2000, 'x') +
                     "\"}";
        }
        return tasks + "]";
    }

    std::string Database() const {
        return (server.Root().Path() / "usr/orva/var/tasks.db").string();
    }

    std::vector<std::string> ToolCommand(const std::vector<std::string>& arguments) const {
        std::vector<std::string> command = {ORVA_BIN_DIR "/orvaschedtool", "--root",
                                            server.Root().Path().string()};
        command.insert(command.end(), arguments.begin(), arguments.end());
        return command;
    }
    ProcessResult Tool(const std::vector<std::string>& arguments,
                       const std::string& input = {}) const {
        return orva::test::RunProcess(ToolCommand(arguments), input);
    }

    std::vector<std::string> CallCommand(const std::string& method,
                                         const std::string& parameters) const {
        return {ORVA_BIN_DIR "/orva-webapi",
                "--root",
                server.Root().Path().string(),
                kApi,
                "1",
                method,
                parameters};
    }
    ProcessResult Call(const std::string& method, const std::string& parameters) const {
        return orva::test::RunProcess(CallCommand(method, parameters));
    }

    // What the running server answers; its errors have status 200 as well.
    std::string Post(const std::string& method, const std::string& parameters) const {
        const orva::test::HttpAnswer answer =
            server.Post(std::string(kApi) + "/1/" + method, parameters);
        EXPECT_EQ(answer.status, 200) << answer.body;
        return answer.body;
    }
    int CountOverHttp() const {
        return AnswerDocument(
                   server.Post(std::string(kApi) + "/1/list", R"({"limit": 0})"))["data"]["total"]
            .asInt();
    }

    std::string Complaint(const std::string& reason) const {
        return "orvaschedtool: task store " + Database() + ": " + reason + "\n";
    }

    // The log of a failed call: what is wrong with the store, then what failed for it.
    void ExpectLog(const std::string& log, const std::string& reason, const std::string& line,
                   const std::string& code) const {
        EXPECT_THAT(log, HasSubstr(": task store " + Database() + ": " + reason + "\n"));
        EXPECT_THAT(log,
                    testing::ContainsRegex(line + " \\[" + code + " [A-Za-z]+\\.cpp:[0-9]+\\]"));
    }

    // Everybody who lists fails, with one reason, and the file keeps its bytes.
    void ExpectNobodyCanList(const std::string& reason, const std::string& code) {
        const std::string before = ReadWholeFile(Database());
        for (const char* verb : {"--list", "--export"}) {
            const ProcessResult tool = Tool({verb});
            EXPECT_EQ(tool.status, 1);
            EXPECT_EQ(tool.out, "");
            EXPECT_EQ(tool.err, Complaint(reason));
        }
        const ProcessResult imported = Tool({"--import", "-"}, Tasks(1));
        EXPECT_EQ(imported.status, 1);
        EXPECT_EQ(imported.out, "");
        EXPECT_EQ(imported.err, Complaint(reason));

        const std::string line = "ORVA.Core.TaskScheduler.cpp:160 get task list failed.";
        const ProcessResult call = Call("list", "{}");
        EXPECT_EQ(call.status, 1);
        EXPECT_EQ(call.out, std::string(kListFailed) + "\n");
        ExpectLog(call.err, reason, line, code);

        server.Start();
        EXPECT_EQ(Post("list", "{}"), kListFailed);
        EXPECT_EQ(Post("delete", R"({"task": 1})"), kDeleteFailed);
        ExpectLog(server.Process().ErrorText(), reason, line, code);
        EXPECT_EQ(ReadWholeFile(Database()), before);
    }

    RunningServer server;
};

TEST_F(StoreFaultsTest, ATruncatedDatabaseIsToldEverywhereUntilItIsPutBack) {
    const std::string whole = ReadWholeFile(Database());
    std::filesystem::resize_file(Database(), whole.size() / 2);
    ExpectNobodyCanList("database disk image is malformed", "0x0602");
    server.Root().Write("usr/orva/var/tasks.db", whole);
    EXPECT_EQ(CountOverHttp(), 200);
    EXPECT_EQ(Post("delete", R"({"task": 1})"), kNothing);
    EXPECT_EQ(CountOverHttp(), 199);
}

TEST_F(StoreFaultsTest, ADatabaseOfANewerProgramIsToldEverywhere) {
    std::string known;
    {
        SQLite::Database database(Database(), SQLite::OPEN_READWRITE);
        known = database.execAndGet("PRAGMA user_version").getString();
        database.exec("PRAGMA user_version = 99");
    }
    ExpectNobodyCanList(
        "schema version 99 was written by a newer version of this program, which knows up to " +
            known,
        "0x0603");
}

TEST_F(StoreFaultsTest, ADatabaseThatIsLockedForTooLongCanBeReadButNotChanged) {
    server.Start();
    {
        SQLite::Database other(Database(), SQLite::OPEN_READWRITE);
        other.exec("BEGIN IMMEDIATE");
        const ProcessResult imported = Tool({"--import", "-"}, Tasks(1));
        EXPECT_EQ(imported.status, 1);
        EXPECT_EQ(imported.out, "");
        EXPECT_EQ(imported.err, Complaint("database is locked"));

        const ProcessResult call = Call("delete", R"({"task": 1})");
        EXPECT_EQ(call.status, 1);
        EXPECT_EQ(call.out, std::string(kDeleteFailed) + "\n");
        EXPECT_THAT(call.err, HasSubstr(": task store " + Database() + ": database is locked\n"));
        EXPECT_THAT(call.err, testing::ContainsRegex("\\[0x0601 [A-Za-z]+\\.cpp:[0-9]+\\]"));

        EXPECT_EQ(Post("delete", R"({"task": 1})"), kDeleteFailed);
        EXPECT_EQ(CountOverHttp(), 200);
        EXPECT_EQ(Tool({"--list"}).status, 0);
    }
    EXPECT_EQ(Post("delete", R"({"task": 1})"), kNothing);
    EXPECT_EQ(CountOverHttp(), 199);
}

// What a program says when it runs with mounts of its own.
class MountedStoreTest : public StoreFaultsTest {
  protected:
    static std::vector<std::string> WithMounts(const std::string& mounting,
                                               const std::vector<std::string>& command) {
        std::vector<std::string> wrapped = {"/usr/bin/unshare", "--mount"};
        if (::geteuid() != 0) {
            wrapped.emplace_back("--map-root-user");
        }
        wrapped.insert(wrapped.end(), {"/bin/sh", "-e", "-c", mounting + "exec \"$@\"", "sh"});
        wrapped.insert(wrapped.end(), command.begin(), command.end());
        return wrapped;
    }

    std::string Folder() const { return std::filesystem::path(Database()).parent_path().string(); }

    // The server's answers to a list and to a delete, and its log.
    struct OverHttp {
        std::string list;
        std::string deletion;
        std::string log;
    };
    OverHttp AskServer(const std::string& mounting) const {
        orva::test::ServerProcess process(WithMounts(mounting, server.Arguments("127.0.0.1:0")));
        if (!process.Ready()) {
            return {"no server", "no server", process.ErrorText()};
        }
        const auto answerTo = [&](const std::string& method, const std::string& parameters) {
            orva::test::HttpConnection connection(process.ReadyDetail());
            connection.Send(orva::test::PostRequest("/webapi/" + std::string(kApi) + "/1/" + method,
                                                    server.Token(), parameters));
            return connection.Receive().value_or(orva::test::HttpAnswer()).body;
        };
        OverHttp answers;
        answers.list = answerTo("list", R"({"limit": 0})");
        answers.deletion = answerTo("delete", R"({"task": 1})");
        EXPECT_EQ(process.Stop(), 0);
        answers.log = process.ErrorText();
        return answers;
    }
};

TEST_F(MountedStoreTest, AReadOnlyFileSystemIsToldEverywhere) {
    const std::string mounting = "mount --bind '" + Folder() + "' '" + Folder() +
                                 "'; mount -o remount,bind,ro '" + Folder() + "'; ";
    const std::string reason = "cannot be written to: Read-only file system";
    const ProcessResult imported =
        orva::test::RunProcess(WithMounts(mounting, ToolCommand({"--import", "-"})), Tasks(1));
    EXPECT_EQ(imported.status, 1);
    EXPECT_EQ(imported.out, "");
    EXPECT_EQ(imported.err, Complaint(reason));

    const ProcessResult call =
        orva::test::RunProcess(WithMounts(mounting, CallCommand("delete", R"({"task": 1})")));
    EXPECT_EQ(call.status, 1);
    EXPECT_EQ(call.out, std::string(kDeleteFailed) + "\n");
    EXPECT_THAT(call.err, HasSubstr(": task store " + Database() + ": " + reason + "\n"));
    EXPECT_THAT(call.err, testing::ContainsRegex("\\[0x0604 [A-Za-z]+\\.cpp:[0-9]+\\]"));

    const OverHttp answers = AskServer(mounting);
    EXPECT_EQ(answers.deletion, kDeleteFailed);
    EXPECT_THAT(answers.log, HasSubstr(": task store " + Database() + ": " + reason + "\n"));

    EXPECT_EQ(Tool({"--export"}).status, 0);
    EXPECT_THAT(Tool({"--list"}).out, HasSubstr("task 200\n"));
}

TEST_F(MountedStoreTest, AFullDiskIsToldEverywhere) {
    // The store's own files, on a disk on which nothing is left for its log.
    const std::string mounting = "mount -t tmpfs -o size=2m none /mnt; cp -p '" + Database() +
                                 "' /mnt/; mount --bind /mnt '" + Folder() +
                                 "'; cat /dev/zero >/mnt/filler 2>/dev/null || true; ";
    const std::string reason = "no space left for its log";
    for (const std::vector<std::string>& arguments :
         {std::vector<std::string>{"--list"}, {"--export"}, {"--import", "-"}}) {
        const ProcessResult tool =
            orva::test::RunProcess(WithMounts(mounting, ToolCommand(arguments)), Tasks(1));
        EXPECT_EQ(tool.status, 1);
        EXPECT_EQ(tool.out, "");
        EXPECT_EQ(tool.err, Complaint(reason));
    }
    const ProcessResult call =
        orva::test::RunProcess(WithMounts(mounting, CallCommand("list", "{}")));
    EXPECT_EQ(call.status, 1);
    EXPECT_EQ(call.out, std::string(kListFailed) + "\n");
    ExpectLog(call.err, reason, "ORVA.Core.TaskScheduler.cpp:160 get task list failed.", "0x0604");

    const OverHttp answers = AskServer(mounting);
    EXPECT_EQ(answers.list, kListFailed);
    EXPECT_EQ(answers.deletion, kDeleteFailed);
    ExpectLog(answers.log, reason, "ORVA.Core.TaskScheduler.cpp:160 get task list failed.",
              "0x0604");
}

}  // namespace
