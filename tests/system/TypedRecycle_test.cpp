// Recycle-bin tasks: the form, the flat section that is stored for it, and the bins themselves.
#include <filesystem>
#include <string>

#include "tests/system/Process.h"
#include "tests/system/TypedTasks.h"

namespace {

using orva::test::Compact;
using orva::test::Failure;
using orva::test::Success;

class TypedRecycleTest : public orva::test::TypedTasksTest {
  protected:
    // The registry of shares as it is stored, compact.
    std::string Registry() const {
        return Compact(
            orva::test::ReadWholeFile(server.Root().Path() / "usr/orva/etc/shares.json"));
    }

    bool HasBin(const std::string& share) const {
        return std::filesystem::is_directory(server.Root().Path() / share / ".recycle");
    }
};

TEST_F(TypedRecycleTest, ARecycleTaskIsCreatedReadChangedAndDeleted) {
    EXPECT_EQ(Body("create", R"({
        "type": "recycle", "name": "Bins", "owner": "daemon", "enable": false,
        "schedule": {"hour": 4},
        "extra": {
            "clean_share_policy": {"clean_all": false, "shares": ["photo", "web site"]},
            "clean_file_policy": {"policy": "size", "size": 2048, "sort_type": 0,
                "reserve_policy": {
                    "size_greater_check": true, "size_greater": 4095,
                    "size_smaller_check": false, "size_smaller": 5,
                    "extension_check": true,
                    "extension": [{"file_ext": "jpg"}, {"file_ext": "txt"}]}}}})"),
              R"({"success":true,"data":{"id":1}})");
    EXPECT_EQ(Records(), Compact(R"([{
        "basic": {"id": 1, "task_name": "Bins", "owner": "daemon", "enabled": "off",
                  "app": "ORVA.ZUM.TaskScheduler.Recycle", "can_edit_name": true,
                  "action": "#schedule:clean_recycle_bin#: \"photo\" \"web site\""},
        "schedule": {"mode": "weekly", "week_name": "0,1,2,3,4,5,6", "date": "",
                     "repeat": "never", "hour": 4, "min": 0, "interval_min": 0, "last_hour": 23,
                     "last_min": 59, "run_missed": false},
        "app_name": "#share:recycle_bin#",
        "app_args": "{\"advconfig\":{\"reserve_policy_extension\":[{\"file_ext\":\"jpg\"},{\"file_ext\":\"txt\"}],\"reserve_policy_extension_check\":\"on\",\"reserve_policy_size_greater\":\"4095\",\"reserve_policy_size_greater_check\":\"on\",\"reserve_policy_size_smaller_check\":\"off\"},\"clean_all\":\"no\",\"clean_policy\":\"clean_policy_by_size\",\"clean_policy_by_size_MB_number\":\"2048\",\"clean_policy_by_size_sort_type\":\"Delete large files first\",\"recycle_action\":\"2\",\"selected_shares\":[\"photo\",\"web site\"]}\n",
        "command": "/usr/orva/bin/orvarecycle --clean 'photo' 'web site' -s 18446744071562067968 -o 2 -file_ext=\"jpg.txt\" -m 18446744073708503040",
        "edit_form": "ORVA.ZUM.TaskScheduler.Recycle.FormPanel",
        "listable": true, "simple_edit_form": true, "can_edit_name": true,
        "can_edit_owner": false, "can_run_task_same_time": false, "can_run_app_same_time": true,
        "can_run_from_ui": true, "can_edit_from_ui": true, "can_delete_from_ui": true}])"));
    EXPECT_EQ(Body("list", "{}"), Success(R"({"total": 1, "tasks": [{
        "id": 1, "name": "Bins", "type": "recycle", "enable": false, "next_trigger_time": "-",
        "action": "Empty recycle bins: \"photo\" \"web site\"", "can_run": true,
        "can_edit": true, "can_delete": true}]})"));
    EXPECT_EQ(Body("get", R"({"id":1})"), Success(R"({
        "id": 1, "name": "Bins", "type": "recycle", "enable": false, "owner": "daemon",
        "action": "Empty recycle bins: \"photo\" \"web site\"", "can_edit_name": true,
        "can_edit_owner": false,
        "schedule": {"mode": "weekly", "week_day": "0,1,2,3,4,5,6", "date": "",
                     "repeat_date": "never", "hour": 4, "minute": 0, "interval_min": 0,
                     "last_hour": 23, "last_min": 59, "run_missed": false},
        "extra": {
            "clean_share_policy": {"clean_all": false, "shares": ["photo", "web site"]},
            "clean_file_policy": {"policy": "size", "size": 2048, "sort_type": 0,
                "reserve_policy": {
                    "size_greater_check": true, "size_greater": 4095,
                    "size_smaller_check": false,
                    "extension_check": true,
                    "extension": [{"file_ext": "jpg"}, {"file_ext": "txt"}]}}}})"));
    EXPECT_FALSE(HasBin("volume1/photo"));

    // What the form leaves out keeps its value, though it need not be in use any more.
    const std::string change = R"({
        "id": 1, "name": "All bins", "enable": false, "schedule": {},
        "extra": {
            "clean_share_policy": {"clean_all": true},
            "clean_file_policy": {"policy": "time", "time": 30,
                "reserve_policy": {"size_smaller_check": true, "size_smaller": 100,
                                   "size_greater_check": false, "extension_check": false}}}})";
    EXPECT_EQ(Body("set", change), R"({"success":true,"data":{"id":1}})");
    EXPECT_EQ(Body("get", R"({"id":1})"), Success(R"({
        "id": 1, "name": "All bins", "type": "recycle", "enable": false, "owner": "daemon",
        "action": "Empty all recycle bins", "can_edit_name": true, "can_edit_owner": false,
        "schedule": {"mode": "weekly", "week_day": "0,1,2,3,4,5,6", "date": "",
                     "repeat_date": "never", "hour": 4, "minute": 0, "interval_min": 0,
                     "last_hour": 23, "last_min": 59, "run_missed": false},
        "extra": {
            "clean_share_policy": {"clean_all": true, "shares": ["photo", "web site"]},
            "clean_file_policy": {"policy": "time", "time": 30,
                "reserve_policy": {"size_smaller_check": true, "size_smaller": 100,
                                   "size_greater_check": false, "extension_check": false}}}})"));
    const std::string changed = Records();
    EXPECT_EQ(changed, Compact(R"([{
        "basic": {"id": 1, "task_name": "All bins", "owner": "daemon", "enabled": "off",
                  "app": "ORVA.ZUM.TaskScheduler.Recycle", "can_edit_name": true,
                  "action": "#share:share_clean_all_recycle_bin#"},
        "schedule": {"mode": "weekly", "week_name": "0,1,2,3,4,5,6", "date": "",
                     "repeat": "never", "hour": 4, "min": 0, "interval_min": 0, "last_hour": 23,
                     "last_min": 59, "run_missed": false},
        "app_name": "#share:recycle_bin#",
        "app_args": "{\"advconfig\":{\"reserve_policy_extension\":[{\"file_ext\":\"jpg\"},{\"file_ext\":\"txt\"}],\"reserve_policy_extension_check\":\"off\",\"reserve_policy_size_greater\":\"4095\",\"reserve_policy_size_greater_check\":\"off\",\"reserve_policy_size_smaller\":\"100\",\"reserve_policy_size_smaller_check\":\"on\"},\"clean_all\":\"yes\",\"clean_policy\":\"clean_policy_by_time\",\"clean_policy_by_size_MB_number\":\"2048\",\"clean_policy_by_size_sort_type\":\"Delete large files first\",\"clean_policy_by_time_day\":\"30\",\"recycle_action\":\"2\",\"selected_shares\":[\"photo\",\"web site\"]}\n",
        "command": "/usr/orva/bin/orvarecycle --clean -t 30 -l 104857600",
        "edit_form": "ORVA.ZUM.TaskScheduler.Recycle.FormPanel",
        "listable": true, "simple_edit_form": true, "can_edit_name": true,
        "can_edit_owner": false, "can_run_task_same_time": false, "can_run_app_same_time": true,
        "can_run_from_ui": true, "can_edit_from_ui": true, "can_delete_from_ui": true}])"));
    EXPECT_EQ(Body("set", change), R"({"success":true,"data":{"id":1}})");
    EXPECT_EQ(Records(), changed);

    EXPECT_EQ(Body("delete", R"({"task":1})"), R"({"success":true,"data":null})");
    EXPECT_EQ(Body("list", "{}"), R"({"success":true,"data":{"tasks":[],"total":0}})");
    EXPECT_EQ(Body("get", R"({"id":1})"), Failure(4801, "null"));
    EXPECT_EQ(Records(), "[]");
}

TEST_F(TypedRecycleTest, BinsOfAllSharesAreSwitchedOnWithTheSave) {
    EXPECT_EQ(Body("create", R"({
        "type": "recycle", "name": "Bins", "enable": false, "schedule": {},
        "extra": {"enableRecycle": "all",
                  "clean_share_policy": {"clean_all": false, "shares": ["photo"]}}})"),
              R"({"success":true,"data":{"id":1}})");
    EXPECT_EQ(Registry(), Compact(R"({"shares": [
        {"name": "photo", "path": "/volume1/photo", "kind": 1, "recycle_bin": true},
        {"name": "video", "path": "/volume1/video", "kind": 2, "recycle_bin": true},
        {"name": "web site", "path": "/volume2/web site", "kind": 256, "recycle_bin": true}]})"));
    EXPECT_TRUE(HasBin("volume1/photo"));
    EXPECT_TRUE(HasBin("volume1/video"));
    EXPECT_TRUE(HasBin("volume2/web site"));
    // The wish was for once.
    EXPECT_EQ(Records().find("enableRecycle"), std::string::npos);
    EXPECT_EQ(Body("get", R"({"id":1})").find("enableRecycle"), std::string::npos);
}

TEST_F(TypedRecycleTest, BinsOfChosenSharesOnlyAreSwitchedOnWhenAskedSo) {
    EXPECT_EQ(Body("create", R"({"type": "recycle", "name": "Bins"})"),
              R"({"success":true,"data":{"id":1}})");
    EXPECT_FALSE(HasBin("volume1/photo"));
    EXPECT_EQ(Body("set", R"({
        "id": 1, "schedule": {},
        "extra": {"enableRecycle": "select", "clean_share_policy": {
            "clean_all": false, "shares": ["web site", "no such share"]}}})"),
              R"({"success":true,"data":{"id":1}})");
    EXPECT_EQ(Registry(), Compact(R"({"shares": [
        {"name": "photo", "path": "/volume1/photo", "kind": 1, "recycle_bin": false},
        {"name": "video", "path": "/volume1/video", "kind": 2, "recycle_bin": false},
        {"name": "web site", "path": "/volume2/web site", "kind": 256, "recycle_bin": true}]})"));
    EXPECT_FALSE(HasBin("volume1/photo"));
    EXPECT_FALSE(HasBin("volume1/video"));
    EXPECT_TRUE(HasBin("volume2/web site"));
}

TEST_F(TypedRecycleTest, ARefusedTaskLeavesTheBinsAsTheyAre) {
    const std::string before = Registry();
    EXPECT_EQ(Body("create", R"({
        "type": "recycle", "name": "Bins",
        "extra": {"enableRecycle": "all",
                  "clean_share_policy": {"clean_all": false, "shares": []}}})"),
              Failure(117, R"({"msg": "Invalid (app) object"})"));
    EXPECT_EQ(Body("create", R"({
        "type": "recycle", "name": "Bins", "owner": "no such account",
        "extra": {"enableRecycle": "all"}})"),
              Failure(117, R"({"msg": "Invalid (basic) object"})"));
    EXPECT_EQ(Registry(), before);
    EXPECT_FALSE(HasBin("volume1/photo"));
    EXPECT_EQ(Records(), "[]");
}

// A task that switches bins is stored by the system itself; the form cannot make it another one.
TEST_F(TypedRecycleTest, TheFormKeepsATasksSwitch) {
    Import(R"([{"basic": {"task_name": "On", "app": "ORVA.ZUM.TaskScheduler.Recycle"},
        "app_args": "{\"recycle_action\":\"1\",\"clean_all\":\"yes\",\"more\":[1]}\n"}])");
    EXPECT_EQ(Body("set", R"({"id": 1, "schedule": {}, "extra": {
        "recycle_action": "0", "clean_share_policy": {"clean_all": false, "shares": ["video"]},
        "clean_file_policy": {"policy": "time", "time": 3}}})"),
              R"({"success":true,"data":{"id":1}})");
    const std::string records = Records();
    EXPECT_NE(records.find(R"("command":"/usr/orva/bin/orvarecycle --enable 'video'")"),
              std::string::npos)
        << records;
    EXPECT_NE(records.find(R"("app_args":"{\"clean_all\":\"no\",\"clean_policy\":)"
                           R"(\"clean_policy_by_time\",\"clean_policy_by_time_day\":\"3\",)"
                           R"(\"more\":[1],\"recycle_action\":\"1\",)"
                           R"(\"selected_shares\":[\"video\"]}\n")"),
              std::string::npos)
        << records;
    EXPECT_NE(Body("get", R"({"id":1})")
                  .find(R"("extra":{"clean_file_policy":{"policy":"time",)"
                        R"("reserve_policy":{"extension_check":false,)"
                        R"("size_greater_check":false,)"
                        R"("size_smaller_check":false},"time":3},)"
                        R"("clean_share_policy":{"clean_all":false,)"
                        R"("shares":["video"]},"more":[1]})"),
              std::string::npos);
}

}  // namespace
