// What a set of the editor leaves alone: everything of other applications' tasks that is not in its
// form, and what another process changes at the same time.
#include <gtest/gtest.h>
#include <json/json.h>

#include <atomic>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "tests/system/Process.h"
#include "tests/system/TypedTasks.h"

namespace {

using orva::test::ProcessResult;
using orva::test::RunProcess;
using orva::test::Success;

class OtherApplicationsTest : public orva::test::TypedTasksTest {
  protected:
    // One document a stored task, as the task tool writes it.
    Json::Value Documents() const {
        const std::string records = Records();
        const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
        Json::Value documents;
        EXPECT_TRUE(
            reader->parse(records.data(), records.data() + records.size(), &documents, nullptr));
        return documents;
    }

    // Runs a program in the appliance as a user that this machine has no account for.
    ProcessResult RunWithoutAccount(const std::string& program,
                                    const std::vector<std::string>& arguments,
                                    const std::string& input = {}) const {
        std::vector<std::string> argv = {"/usr/bin/unshare", "--user",
                                         "--map-user=54321", ORVA_BIN_DIR "/" + program,
                                         "--root",           server.Root().Path().string()};
        argv.insert(argv.end(), arguments.begin(), arguments.end());
        return RunProcess(argv, input);
    }
};

// A task of every kind whose application is not the editor, with all that the editor does not know.
constexpr const char* kOtherTasks[] = {
    "Some.Other.App",
    "ORVA.ZUM.DataAnalysis",
    "ORVA.ZUM.BackupApp.NetBackup",
    "ORVA.ZUM.TaskScheduler.AutoPower",
    "ORVA.ZUM.TaskScheduler.KELAutoUpdate",
};

std::string OtherTasks() {
    std::string tasks;
    for (const char* app : kOtherTasks) {
        tasks += std::string(tasks.empty() ? "[" : ",") + R"({
            "basic": {"task_name": "Before", "owner": "daemon", "enabled": "on",
                      "app": ")" +
                 app + R"(", "action": "#a:b# \t \u00e4 )" + app + R"("},
            "schedule": {"mode": "date", "week_name": "", "date": "2096-02-29",
                         "repeat": "half_yearly", "hour": 1, "min": 2, "interval_min": 30,
                         "last_hour": 5, "last_min": 6, "run_missed": true},
            "app_name": "#x:y#", "app_args": "{ \"b\" : 2.50,\"a\":null } // )" +
                 app + R"(\n\n",
            "command": "do 'it'\n\t&& wait \\", "edit_form": "A.Form",
            "listable": false, "simple_edit_form": true, "can_edit_name": true,
            "can_edit_owner": true, "can_run_task_same_time": true,
            "can_run_app_same_time": true, "can_run_from_ui": false, "can_edit_from_ui": false,
            "can_delete_from_ui": false})";
    }
    return tasks + "]";
}

TEST_F(OtherApplicationsTest, ASetOfAnyKindChangesNameOwnerStateAndScheduleOfThatTaskOnly) {
    Import(OtherTasks());
    Json::Value expected = Documents();
    ASSERT_EQ(expected.size(), 5U);
    for (Json::Value& task : expected) {
        const std::string id = task["basic"]["id"].asString();
        SCOPED_TRACE(task["basic"]["app"].asString());
        const std::string change = R"({"id": )" + id + R"(, "name": "After )" + id + R"(",
            "owner": "bin", "enable": false,
            "schedule": {"minute": 40, "interval_min": 0, "repeat_date": "never"},
            "extra": {"a": "x"}, "app_args": "x", "command": "x", "listable": true})";
        EXPECT_EQ(Body("set", change), Success(R"({"id": )" + id + "}"));
        task["basic"]["task_name"] = "After " + id;
        task["basic"]["owner"] = "bin";
        task["basic"]["enabled"] = "off";
        task["schedule"]["min"] = 40;
        task["schedule"]["interval_min"] = 0;
        task["schedule"]["repeat"] = "never";
        EXPECT_EQ(Documents(), expected);
        // Once more, and nothing changes.
        EXPECT_EQ(Body("set", change), Success(R"({"id": )" + id + "}"));
        EXPECT_EQ(Documents(), expected);
    }
}

TEST_F(OtherApplicationsTest, EachFieldOfASetChangesAloneWhateverTheKind) {
    Import(OtherTasks());
    Json::Value expected = Documents();
    ASSERT_EQ(expected.size(), 5U);
    for (Json::Value& task : expected) {
        const std::string id = task["basic"]["id"].asString();
        SCOPED_TRACE(task["basic"]["app"].asString());
        const auto set = [&](const std::string& name, const std::string& owner, bool enable,
                             const std::string& schedule) {
            EXPECT_EQ(Body("set", R"({"id": )" + id + R"(, "name": ")" + name + R"(", "owner": ")" +
                                      owner + R"(", "enable": )" + (enable ? "true" : "false") +
                                      R"(, "schedule": )" + schedule + "}"),
                      Success(R"({"id": )" + id + "}"));
            EXPECT_EQ(Documents(), expected);
        };
        // Off, off again, on, on again: nothing else moves.
        for (const bool enable : {false, false, true, true}) {
            task["basic"]["enabled"] = enable ? "on" : "off";
            set("Before", "daemon", enable, "{}");
            const Json::Value form = AnswerDocument(Call("get", R"({"id": )" + id + "}"))["data"];
            EXPECT_EQ(form["enable"], enable);
        }
        task["basic"]["task_name"] = "N\u00e4me 'x' \u65e5";
        set("N\\u00e4me 'x' \\u65e5", "daemon", true, "{}");
        task["basic"]["owner"] = "bin";
        set("N\\u00e4me 'x' \\u65e5", "bin", true, "{}");
        task["schedule"]["mode"] = "weekly";
        task["schedule"]["week_name"] = "1,6";
        task["schedule"]["hour"] = 23;
        task["schedule"]["min"] = 59;
        task["schedule"]["interval_min"] = 0;
        set("N\\u00e4me 'x' \\u65e5", "bin", true,
            R"({"mode": "weekly", "week_day": "1,6", "hour": 23, "minute": 59,
                "interval_min": 0})");
    }
}

TEST_F(OtherApplicationsTest, ATaskWhoseNameAndOwnerAreFixedIsStillSwitchedAndScheduled) {
    std::string tasks = OtherTasks();
    for (const char* flag : {R"("can_edit_name": true)", R"("can_edit_owner": true)"}) {
        const std::string allowed = flag;
        const std::string forbidden = allowed.substr(0, allowed.find("true")) + "false";
        for (std::size_t at = tasks.find(allowed); at != std::string::npos;
             at = tasks.find(allowed, at)) {
            tasks.replace(at, allowed.size(), forbidden);
        }
    }
    Import(tasks);
    Json::Value expected = Documents();
    ASSERT_EQ(expected.size(), 5U);
    for (Json::Value& task : expected) {
        const std::string id = task["basic"]["id"].asString();
        SCOPED_TRACE(task["basic"]["app"].asString());
        const auto set = [&](const std::string& name, const std::string& owner) {
            return Body("set", R"({"id": )" + id + R"(, "name": ")" + name + R"(", "owner": ")" +
                                   owner + R"(", "enable": false, "schedule": {"minute": 3}})");
        };
        const std::string refused =
            orva::test::Failure(117, R"({"msg": "Invalid (basic) object"})");
        EXPECT_EQ(set("After", "daemon"), refused);
        EXPECT_EQ(set("Before", "bin"), refused);
        EXPECT_EQ(Documents(), expected);
        EXPECT_EQ(set("Before", "daemon"), Success(R"({"id": )" + id + "}"));
        task["basic"]["enabled"] = "off";
        task["schedule"]["min"] = 3;
        EXPECT_EQ(Documents(), expected);
    }
}

TEST_F(OtherApplicationsTest, ASecondIdenticalSetLeavesAnIdenticalRecord) {
    const struct {
        const char* type;
        const char* created;
        const char* changed;
    } kinds[] = {
        {"beep", R"({"beep_duration": 700})", R"({"beep_duration": 0, "x": [1.50, null]})"},
        {"script", R"({"script": "true"})", R"({"script": "a\n'b' \u00e4", "x": {}})"},
        {"service", R"({"action": "stop", "services": [{"id": "Notes", "enable": true}]})",
         R"({"action": "start", "services": [{"id": "Notes", "enable": false},
                                             {"id": "Samba", "enable": true}]})"},
        {"recycle",
         R"({"clean_share_policy": {"clean_all": false, "shares": ["photo"]},
             "clean_file_policy": {"policy": "time", "time": 3}})",
         R"({"clean_share_policy": {"clean_all": false, "shares": ["web site", "photo"]},
             "clean_file_policy": {"policy": "size", "size": 10, "sort_type": 1,
                 "reserve_policy": {"size_greater_check": true, "size_greater": 5,
                     "extension_check": true, "extension": [{"file_ext": "jpg"}]}}})"},
    };
    int id = 0;
    for (const auto& [type, created, changed] : kinds) {
        SCOPED_TRACE(type);
        const std::string number = std::to_string(++id);
        EXPECT_EQ(Body("create", R"({"type": ")" + std::string(type) +
                                     R"(", "name": "First", "owner": "daemon", "enable": true,
                                        "schedule": {"hour": 5}, "extra": )" +
                                     created + "}"),
                  Success(R"({"id": )" + number + "}"));
        const std::string before = Records();
        const std::string set = R"({"id": )" + number + R"(, "name": "Second",
            "owner": "daemon", "enable": false, "schedule": {"week_day": "1,2", "minute": 7},
            "extra": )" + changed +
                                "}";
        EXPECT_EQ(Body("set", set), Success(R"({"id": )" + number + "}"));
        const std::string once = Records();
        EXPECT_NE(once, before);
        for (int again = 0; again < 3; ++again) {
            EXPECT_EQ(Body("set", set), Success(R"({"id": )" + number + "}"));
            EXPECT_EQ(Records(), once);
        }
    }
}

TEST_F(OtherApplicationsTest, ATaskCanBeEditedWhenItsOwnersAccountIsGone) {
    // The account exists where the task is imported, and not where the server runs.
    const std::string accounts = server.Root().Write(
        "passwd", orva::test::ReadWholeFile("/etc/passwd") + "leaver:x:54321:54321::/:/bin/sh\n");
    const ProcessResult imported =
        RunProcess({"/usr/bin/unshare", "--user", "--map-root-user", "--mount", "/bin/sh", "-c",
                    "mount --bind \"$1\" /etc/passwd && exec \"$2\" --root \"$3\" --import -", "sh",
                    accounts, ORVA_BIN_DIR "/orvaschedtool", server.Root().Path().string()},
                   R"([{"basic": {"task_name": "a", "owner": "leaver", "app": "Some.Other.App"},
             "can_edit_owner": true}])");
    ASSERT_EQ(imported.status, 0) << imported.err;
    EXPECT_EQ(AnswerDocument(Call("get", R"({"id":1})"))["data"]["owner"], "leaver");
    EXPECT_EQ(Body("set", R"({"id": 1, "name": "b", "owner": "leaver", "enable": true,
                              "schedule": {}})"),
              Success(R"({"id": 1})"));
    EXPECT_EQ(Body("set", R"({"id": 1, "name": "c", "owner": "leaver too", "enable": true,
                              "schedule": {}})"),
              orva::test::Failure(117, R"({"msg": "Invalid (basic) object"})"));
    EXPECT_EQ(Documents()[0]["basic"]["task_name"], "b");
    EXPECT_EQ(Documents()[0]["basic"]["owner"], "leaver");
}

TEST_F(OtherApplicationsTest, ASetSurvivesThatOtherProcessesSwitchTheTaskOnAndOff) {
    constexpr int kProcesses = 40;
    Import(OtherTasks());
    std::atomic<int> failures = 0;
    std::atomic<bool> done = false;
    std::thread switching([&] {
        for (int number = 0; number < kProcesses; ++number) {
            const ProcessResult result =
                RunProcess({ORVA_BIN_DIR "/orva-webapi", "--root", server.Root().Path().string(),
                            "--modules", ORVA_LIB_DIR, "ORVA.Core.TaskScheduler", "1", "set_enable",
                            R"({"status":[{"id":1,"enable":false},{"id":1,"enable":true}]})"});
            failures += result.status == 0 ? 0 : 1;
        }
        done = true;
    });
    int sets = 0;
    int lost = 0;
    while (!done) {
        const std::string name = "Name " + std::to_string(++sets);
        EXPECT_EQ(Body("set", R"({"id": 1, "name": ")" + name + R"(", "enable": true,
                                  "schedule": {"minute": )" +
                                  std::to_string(sets % 60) + "}}"),
                  Success(R"({"id": 1})"));
        // Another process may still hold the task as it was, and save it in a moment.
        for (int look = 0; look < 5; ++look) {
            const Json::Value stored = AnswerDocument(Call("get", R"({"id":1})"))["data"];
            if (stored["name"] != name || stored["schedule"]["minute"] != sets % 60) {
                ++lost;
                break;
            }
        }
    }
    switching.join();
    EXPECT_EQ(failures, 0);
    EXPECT_EQ(lost, 0);
}

TEST_F(OtherApplicationsTest, AnAccountThatTheMachineDoesNotKnowOwnsNoTasks) {
    const ProcessResult created = RunWithoutAccount(
        "orva-webapi", {"--modules", ORVA_LIB_DIR, "ORVA.Core.TaskScheduler", "1", "create",
                        R"({"type": "script", "name": "a", "extra": {"script": "true"}})"});
    EXPECT_EQ(created.status, 1);
    EXPECT_NE(created.err.find("task refused: basic.owner: is missing, and user id 54321 has no "
                               "account to own the task\n"),
              std::string::npos)
        << created.err;
    const ProcessResult imported =
        RunWithoutAccount("orvaschedtool", {"--import", "-"},
                          R"([{"basic": {"task_name": "a", "app": "Some.Other.App"}}])");
    EXPECT_EQ(imported.status, 1);
    EXPECT_EQ(imported.err,
              "orvaschedtool: -: task 1: basic.owner: is missing; nothing was imported\n");
    EXPECT_EQ(Records(), "[]");
}

}  // namespace
