// The kinds of tasks whose form is stored as it is, and those of other applications.
#include "tests/system/TypedTasks.h"

namespace {

using orva::test::Compact;
using orva::test::Failure;
using orva::test::Success;
using orva::test::TypedTasksTest;

constexpr const char* kDeleted = R"({"success":true,"data":null})";
constexpr const char* kEmptyList = R"({"success":true,"data":{"tasks":[],"total":0}})";

TEST_F(TypedTasksTest, ABeepTaskIsCreatedReadChangedAndDeleted) {
    EXPECT_EQ(Body("create", R"({
        "type": "beep", "name": "Wake", "owner": "daemon", "enable": false,
        "schedule": {"hour": 6, "minute": 30, "week_day": "1,3"},
        "extra": {"beep_duration": 700}})"),
              R"({"success":true,"data":{"id":1}})");
    EXPECT_EQ(Records(), Compact(R"([{
        "basic": {"id": 1, "task_name": "Wake", "owner": "daemon", "enabled": "off",
                  "app": "ORVA.ZUM.TaskScheduler.Beep", "can_edit_name": true,
                  "action": "#volume:beep_on# 600 #common:time_seconds#"},
        "schedule": {"mode": "weekly", "week_name": "1,3", "date": "", "repeat": "never",
                     "hour": 6, "min": 30, "interval_min": 0, "last_hour": 23, "last_min": 59,
                     "run_missed": false},
        "app_name": "#beep:beep_title#", "app_args": "{\"beep_duration\":700}\n",
        "command": "/tmp/orvaschedtool --beep 600",
        "edit_form": "ORVA.ZUM.TaskScheduler.Beep.FormPanel",
        "listable": true, "simple_edit_form": true, "can_edit_name": true,
        "can_edit_owner": false, "can_run_task_same_time": false, "can_run_app_same_time": true,
        "can_run_from_ui": true, "can_edit_from_ui": true, "can_delete_from_ui": true}])"));
    EXPECT_EQ(Body("list", "{}"), Success(R"({"total": 1, "tasks": [{
        "id": 1, "name": "Wake", "type": "beep", "enable": false, "next_trigger_time": "-",
        "action": "Beep for 600 seconds", "can_run": true, "can_edit": true,
        "can_delete": true}]})"));
    EXPECT_EQ(Body("get", R"({"id":1})"), Success(R"({
        "id": 1, "name": "Wake", "type": "beep", "enable": false, "owner": "daemon",
        "action": "Beep for 600 seconds", "can_edit_name": true, "can_edit_owner": false,
        "schedule": {"mode": "weekly", "week_day": "1,3", "date": "", "repeat_date": "never",
                     "hour": 6, "minute": 30, "interval_min": 0, "last_hour": 23, "last_min": 59,
                     "run_missed": false},
        "extra": {"beep_duration": 700}})"));

    const std::string change = R"({
        "id": 1, "name": "Wäken", "owner": "daemon", "enable": false,
        "schedule": {"mode": "date", "date": "2019-05-31", "repeat_date": "never",
                     "hour": 7, "minute": 5},
        "extra": {"beep_duration": 5, "volume": "low"}})";
    EXPECT_EQ(Body("set", change), R"({"success":true,"data":{"id":1}})");
    EXPECT_EQ(Body("get", R"({"id":1})"), Success(R"({
        "id": 1, "name": "Wäken", "type": "beep", "enable": false, "owner": "daemon",
        "action": "Beep for 5 seconds", "can_edit_name": true, "can_edit_owner": false,
        "schedule": {"mode": "date", "week_day": "1,3", "date": "2019-05-31",
                     "repeat_date": "never", "hour": 7, "minute": 5, "interval_min": 0,
                     "last_hour": 23, "last_min": 59, "run_missed": false},
        "extra": {"beep_duration": 5, "volume": "low"}})"));
    const std::string changed = Records();
    EXPECT_EQ(changed, Compact(R"([{
        "basic": {"id": 1, "task_name": "Wäken", "owner": "daemon", "enabled": "off",
                  "app": "ORVA.ZUM.TaskScheduler.Beep", "can_edit_name": true,
                  "action": "#volume:beep_on# 5 #common:time_seconds#"},
        "schedule": {"mode": "date", "week_name": "1,3", "date": "2019-05-31", "repeat": "never",
                     "hour": 7, "min": 5, "interval_min": 0, "last_hour": 23, "last_min": 59,
                     "run_missed": false},
        "app_name": "#beep:beep_title#",
        "app_args": "{\"beep_duration\":5,\"volume\":\"low\"}\n",
        "command": "/tmp/orvaschedtool --beep 5",
        "edit_form": "ORVA.ZUM.TaskScheduler.Beep.FormPanel",
        "listable": true, "simple_edit_form": true, "can_edit_name": true,
        "can_edit_owner": false, "can_run_task_same_time": false, "can_run_app_same_time": true,
        "can_run_from_ui": true, "can_edit_from_ui": true, "can_delete_from_ui": true}])"));
    EXPECT_EQ(Body("set", change), R"({"success":true,"data":{"id":1}})");
    EXPECT_EQ(Records(), changed);

    EXPECT_EQ(Body("delete", R"({"task":1})"), kDeleted);
    EXPECT_EQ(Body("list", "{}"), kEmptyList);
    EXPECT_EQ(Body("get", R"({"id":1})"), Failure(4801, "null"));
    EXPECT_EQ(Records(), "[]");
}

TEST_F(TypedTasksTest, AScriptTaskIsCreatedReadChangedAndDeleted) {
    EXPECT_EQ(Body("create", R"({
        "type": "script", "name": "Tidy", "owner": "daemon", "enable": false,
        "schedule": {"hour": 2, "minute": 15, "interval_min": 45, "last_hour": 20,
                     "last_min": 0, "run_missed": true},
        "extra": {"script": "echo \"a #b:c# 'd'\"\nexit 3"}})"),
              R"({"success":true,"data":{"id":1}})");
    EXPECT_EQ(Records(), Compact(R"([{
        "basic": {"id": 1, "task_name": "Tidy", "owner": "daemon", "enabled": "off",
                  "app": "ORVA.ZUM.TaskScheduler.Script", "can_edit_name": true,
                  "action": "#common:run#: echo \"a #b:c# 'd'\"\nexit 3"},
        "schedule": {"mode": "weekly", "week_name": "0,1,2,3,4,5,6", "date": "",
                     "repeat": "never", "hour": 2, "min": 15, "interval_min": 45,
                     "last_hour": 20, "last_min": 0, "run_missed": true},
        "app_name": "#common:command_line#",
        "app_args": "{\"script\":\"echo \\\"a #b:c# 'd'\\\"\\nexit 3\"}\n",
        "command": "echo \"a #b:c# 'd'\"\nexit 3",
        "edit_form": "ORVA.ZUM.TaskScheduler.Script.FormPanel",
        "listable": true, "simple_edit_form": true, "can_edit_name": true,
        "can_edit_owner": true, "can_run_task_same_time": false, "can_run_app_same_time": true,
        "can_run_from_ui": true, "can_edit_from_ui": true, "can_delete_from_ui": true}])"));
    EXPECT_EQ(Body("list", "{}"), Success(R"({"total": 1, "tasks": [{
        "id": 1, "name": "Tidy", "type": "script", "enable": false, "next_trigger_time": "-",
        "action": "Run: echo \"a #b:c# 'd'\"\nexit 3", "can_run": true, "can_edit": true,
        "can_delete": true}]})"));
    EXPECT_EQ(Body("get", R"({"id":1})"), Success(R"({
        "id": 1, "name": "Tidy", "type": "script", "enable": false, "owner": "daemon",
        "action": "Run: echo \"a #b:c# 'd'\"\nexit 3", "can_edit_name": true,
        "can_edit_owner": true,
        "schedule": {"mode": "weekly", "week_day": "0,1,2,3,4,5,6", "date": "",
                     "repeat_date": "never", "hour": 2, "minute": 15, "interval_min": 45,
                     "last_hour": 20, "last_min": 0, "run_missed": true},
        "extra": {"script": "echo \"a #b:c# 'd'\"\nexit 3"}})"));

    // Another owner, enabled, and a single start far ahead.
    const std::string change = R"({
        "id": 1, "name": "Tidy", "owner": "bin", "enable": true,
        "schedule": {"mode": "date", "date": "2199-12-31", "repeat_date": "yearly",
                     "hour": 23, "minute": 59, "interval_min": 0, "last_hour": 23,
                     "last_min": 59, "run_missed": false},
        "extra": {"script": "true"}})";
    EXPECT_EQ(Body("set", change), R"({"success":true,"data":{"id":1}})");
    EXPECT_EQ(Body("get", R"({"id":1})"), Success(R"({
        "id": 1, "name": "Tidy", "type": "script", "enable": true, "owner": "bin",
        "action": "Run: true", "can_edit_name": true, "can_edit_owner": true,
        "schedule": {"mode": "date", "week_day": "0,1,2,3,4,5,6", "date": "2199-12-31",
                     "repeat_date": "yearly", "hour": 23, "minute": 59, "interval_min": 0,
                     "last_hour": 23, "last_min": 59, "run_missed": false},
        "extra": {"script": "true"}})"));
    EXPECT_EQ(Body("list", "{}"), Success(R"({"total": 1, "tasks": [{
        "id": 1, "name": "Tidy", "type": "script", "enable": true,
        "next_trigger_time": "2199-12-31 23:59", "action": "Run: true", "can_run": true,
        "can_edit": true, "can_delete": true}]})"));
    const std::string changed = Records();
    EXPECT_EQ(changed, Compact(R"([{
        "basic": {"id": 1, "task_name": "Tidy", "owner": "bin", "enabled": "on",
                  "app": "ORVA.ZUM.TaskScheduler.Script", "can_edit_name": true,
                  "action": "#common:run#: true"},
        "schedule": {"mode": "date", "week_name": "0,1,2,3,4,5,6", "date": "2199-12-31",
                     "repeat": "yearly", "hour": 23, "min": 59, "interval_min": 0,
                     "last_hour": 23, "last_min": 59, "run_missed": false},
        "app_name": "#common:command_line#", "app_args": "{\"script\":\"true\"}\n",
        "command": "true", "edit_form": "ORVA.ZUM.TaskScheduler.Script.FormPanel",
        "listable": true, "simple_edit_form": true, "can_edit_name": true,
        "can_edit_owner": true, "can_run_task_same_time": false, "can_run_app_same_time": true,
        "can_run_from_ui": true, "can_edit_from_ui": true, "can_delete_from_ui": true}])"));
    EXPECT_EQ(Body("set", change), R"({"success":true,"data":{"id":1}})");
    EXPECT_EQ(Records(), changed);

    EXPECT_EQ(Body("delete", R"({"task":[1]})"), kDeleted);
    EXPECT_EQ(Body("list", "{}"), kEmptyList);
    EXPECT_EQ(Body("set", change), Failure(4801, "null"));
    EXPECT_EQ(Records(), "[]");
}

// The record of a task of another application, with what a change through the editor may replace.
std::string OtherTask(const std::string& app, const std::string& basic,
                      const std::string& schedule) {
    return R"([{"basic": {"id": 1, "app": ")" + app + R"(", "can_edit_name": true,
        "action": "#common:run#: job 7", )" +
           basic + R"(},
        "schedule": {)" +
           schedule + R"(},
        "app_name": "#backup:title#", "app_args": "{\"job\" : [7, 1.50],  \"x\":null} // kept",
        "command": "/usr/orva/bin/job --id=7 'a b'\n", "edit_form": "Some.Other.Form",
        "listable": true, "simple_edit_form": false, "can_edit_name": true,
        "can_edit_owner": true, "can_run_task_same_time": true, "can_run_app_same_time": false,
        "can_run_from_ui": false, "can_edit_from_ui": true, "can_delete_from_ui": false}])";
}

TEST_F(TypedTasksTest, ATaskOfAnotherApplicationKeepsWhatTheEditorDoesNotShow) {
    struct Kind {
        const char* app;
        const char* type;
    };
    const Kind kinds[] = {
        {"ORVA.ZUM.BackupApp.NetBackup", "backup"},
        {"ORVA.ZUM.BackupApp.LocalBackup", "backup"},
        {"ORVA.ZUM.BackupApp.LUNBackup", "backup"},
        {"ORVA.ZUM.BackupApp.S3Backup", "backup"},
        {"ORVA.ZUM.DataAnalysis", "report"},
        {"ORVA.ZUM.TaskScheduler.AutoPower", "power"},
        {"ORVA.ZUM.TaskScheduler.KELAutoUpdate", "kelupdate"},
        {"Some.Other.App", "custom"},
    };
    int id = 0;
    for (const Kind& kind : kinds) {
        const char* const app = kind.app;
        const char* const type = kind.type;
        SCOPED_TRACE(app);
        const std::string number = std::to_string(++id);
        const auto record = [&](const std::string& basic, const std::string& schedule) {
            std::string task = OtherTask(app, basic, schedule);
            task.replace(task.find("\"id\": 1"), 7, "\"id\": " + number);
            return task;
        };
        Import(record(R"("task_name": "Nightly", "owner": "daemon", "enabled": "off")",
                      R"("mode": "weekly", "week_name": "2", "date": "", "repeat": "never",
                         "hour": 1, "min": 2, "interval_min": 30, "last_hour": 5,
                         "last_min": 6, "run_missed": true)"));
        // A kind that people know by its word has no name of an application beside it.
        const std::string appName = type == std::string("custom") ? R"("app_name": "Job", )" : "";
        EXPECT_EQ(Body("list", "{}"), Success(R"({"total": 1, "tasks": [{
            "id": )" + number + R"(, "name": "Nightly", "type": ")" +
                                              type + R"(", )" + appName + R"(
            "enable": false, "next_trigger_time": "-", "action": "Run: job 7",
            "can_run": false, "can_edit": true, "can_delete": false}]})"));
        EXPECT_EQ(Body("get", R"({"id":)" + number + "}"), Success(R"({
            "id": )" + number + R"(, "name": "Nightly", "type": ")" +
                                                                   type + R"(",
            "enable": false, "owner": "daemon", "action": "Run: job 7", "can_edit_name": true,
            "can_edit_owner": false,
            "schedule": {"mode": "weekly", "week_day": "2", "date": "", "repeat_date": "never",
                         "hour": 1, "minute": 2, "interval_min": 30, "last_hour": 5,
                         "last_min": 6, "run_missed": true},
            "extra": null})"));

        // What the request holds beyond the form, an application's section too, is not stored.
        const std::string change = R"({"id": )" + number + R"(, "name": "Weekly",
            "owner": "bin", "enable": false, "schedule": {"minute": 40, "week_day": "5,6"},
            "extra": {"job": 8}, "app": {"job": 9}, "basic": {"app": "Mine"},
            "command": "false", "app_args": "x"})";
        const std::string expected =
            Compact(record(R"("task_name": "Weekly", "owner": "bin", "enabled": "off")",
                           R"("mode": "weekly", "week_name": "5,6", "date": "", "repeat": "never",
                      "hour": 1, "min": 40, "interval_min": 30, "last_hour": 5,
                      "last_min": 6, "run_missed": true)"));
        EXPECT_EQ(Body("set", change), Success(R"({"id": )" + number + "}"));
        EXPECT_EQ(Records(), expected);
        EXPECT_EQ(Body("set", change), Success(R"({"id": )" + number + "}"));
        EXPECT_EQ(Records(), expected);
        EXPECT_EQ(Body("get", R"({"id":)" + number + "}"), Success(R"({
            "id": )" + number + R"(, "name": "Weekly", "type": ")" +
                                                                   type + R"(",
            "enable": false, "owner": "bin", "action": "Run: job 7", "can_edit_name": true,
            "can_edit_owner": false,
            "schedule": {"mode": "weekly", "week_day": "5,6", "date": "",
                         "repeat_date": "never", "hour": 1, "minute": 40, "interval_min": 30,
                         "last_hour": 5, "last_min": 6, "run_missed": true},
            "extra": null})"));

        EXPECT_EQ(Body("delete", R"({"task":)" + number + "}"), kDeleted);
        EXPECT_EQ(Body("list", "{}"), kEmptyList);
    }
}

TEST_F(TypedTasksTest, OnlyTheEditorsOwnKindsCanBeCreated) {
    for (const char* type : {"custom", "report", "backup", "power", "kelupdate", "Beep", "x", ""}) {
        EXPECT_EQ(Body("create", R"({"type": ")" + std::string(type) + R"(", "name": "x"})"),
                  Failure(4800, "null"));
    }
    EXPECT_EQ(Records(), "[]");
}

TEST_F(TypedTasksTest, TheFormOfANewTaskComesBlank) {
    const std::string before = R"({"id": -1, "name": "", "type": "custom", "enable": true,
        "action": "", "can_edit_name": true, "schedule": {"mode": "weekly",
        "week_day": "0,1,2,3,4,5,6", "date": "", "repeat_date": "never", "hour": 0, "minute": 0,
        "interval_min": 0, "last_hour": 23, "last_min": 59, "run_missed": false}, "owner": ")";
    const std::string owner =
        orva::test::AnswerDocument(Call("get", R"({"id":-1,"type":"beep"})"))["data"]["owner"]
            .asString();
    const struct {
        const char* type;
        const char* rest;
    } forms[] = {
        {"beep", R"("can_edit_owner": false, "extra": {"beep_duration": "60"})"},
        {"script", R"("can_edit_owner": true, "extra": {"script": ""})"},
        {"recycle", R"("can_edit_owner": false, "extra": {
            "clean_share_policy": {"clean_all": true, "shares": null},
            "clean_file_policy": {"policy": "clean_all", "reserve_policy": {
                "size_greater_check": false, "size_smaller_check": false,
                "extension_check": false}}})"},
        {"power", R"("can_edit_owner": false, "extra": null)"},
    };
    for (const auto& [type, rest] : forms) {
        EXPECT_EQ(Body("get", R"({"id":-1,"type":")" + std::string(type) + "\"}"),
                  Success(before + owner + "\", " + rest + "}"));
    }
    EXPECT_EQ(Body("get", R"({"id":-1})"), Success(before + owner + R"(",
        "can_edit_owner": false, "extra": null})"));
    EXPECT_EQ(Records(), "[]");
}

}  // namespace
