#include "appliance/store/TaskTransfer.h"

#include <gmock/gmock.h>

#include <string>

#include "appliance/root/Root.h"
#include "tests/appliance/store/StoreTest.h"

namespace {

using orva::TaskData;
using orva::TaskStore;

class TaskTransferTest : public StoreTest {
  protected:
    static std::string Problem(const std::string& json) {
        const std::size_t before = TaskStore::Current()->CurrentSnapshot()->Count();
        const orva::ImportResult result = orva::ImportTasks(*TaskStore::Current(), json);
        EXPECT_EQ(result.count, 0U);
        EXPECT_EQ(TaskStore::Current()->CurrentSnapshot()->Count(), before);
        return result.problem;
    }

    // Two tasks are well, the third has these members.
    static std::string ThirdTask(const std::string& basic, const std::string& beside = "") {
        const std::string good = R"({"basic":{"task_name":"a","app":"x"}},)";
        return "[" + good + good + "{\"basic\":{" + basic + "}" + beside + "}]";
    }
};

TEST_F(TaskTransferTest, ATaskThatNamesOnlyWhatItMustGetsTheDefaults) {
    const orva::ImportResult result = orva::ImportTasks(
        *TaskStore::Current(), R"([{"basic":{"task_name":"a","app":"x","owner":"daemon"}}])");
    EXPECT_EQ(result.problem, "");
    EXPECT_EQ(result.count, 1U);
    TaskData expected;
    expected.id = 1;
    expected.name = "a";
    expected.app = "x";
    expected.owner = "daemon";
    EXPECT_EQ(*TaskStore::Current()->Find(1), expected);
}

TEST_F(TaskTransferTest, AnExportHoldsEverythingInAFixedForm) {
    TaskData task = SampleTask("N\xc3\xa4he");
    task.appName = "#a:b#";
    task.appArgs = "{\"script\":\"x\"}\n";
    task.action = "act";
    task.editForm = "form";
    task.Set(orva::kListable, false);
    TaskStore::Current()->Save(task);
    EXPECT_EQ(orva::ExportTasks(*TaskStore::Current()->CurrentSnapshot()), R"([
  {
    "app_args" : "{\"script\":\"x\"}\n",
    "app_name" : "#a:b#",
    "basic" : 
    {
      "action" : "act",
      "app" : "ORVA.ZUM.TaskScheduler.Script",
      "can_edit_name" : true,
      "enabled" : "on",
      "id" : 1,
      "owner" : "root",
      "task_name" : "N)"
                                                                           "\xc3\xa4"
                                                                           R"(he"
    },
    "can_delete_from_ui" : true,
    "can_edit_from_ui" : true,
    "can_edit_name" : true,
    "can_edit_owner" : false,
    "can_run_app_same_time" : false,
    "can_run_from_ui" : true,
    "can_run_task_same_time" : false,
    "command" : "true",
    "edit_form" : "form",
    "listable" : false,
    "schedule" : 
    {
      "date" : "",
      "hour" : 6,
      "interval_min" : 0,
      "last_hour" : 23,
      "last_min" : 59,
      "min" : 30,
      "mode" : "weekly",
      "repeat" : "never",
      "run_missed" : false,
      "week_name" : "0,1,2,3,4,5,6"
    },
    "simple_edit_form" : false
  }
]
)");
}

TEST_F(TaskTransferTest, AnEmptyStoreIsAnEmptyArray) {
    EXPECT_EQ(orva::ExportTasks(*TaskStore::Current()->CurrentSnapshot()), "[]\n");
    EXPECT_EQ(orva::ImportTasks(*TaskStore::Current(), "[]").problem, "");
}

TEST_F(TaskTransferTest, AnExportImportedIntoAnEmptyApplianceExportsTheSameBytes) {
    std::vector<TaskData> tasks;
    for (int number = 0; number < 20; ++number) {
        TaskData task = SampleTask("task " + std::to_string(number));
        task.flags = static_cast<std::uint16_t>(number * 37 % 1024);
        task.command = "echo '" + std::to_string(number) + "' \"\\\n\t\"";
        task.schedule.mode = static_cast<orva::Schedule::Mode>(number % 2);
        task.schedule.repeat = static_cast<orva::Schedule::Repeat>(number % 7);
        task.schedule.date = absl::CivilDay(2020 + number, 1 + number % 12, 28);
        task.schedule.weekDays = static_cast<std::uint8_t>(number + 1);
        task.schedule.firstMinute = number * 61;
        task.schedule.intervalMinutes = number;
        task.schedule.runMissed = number % 3 == 0;
        tasks.push_back(task);
    }
    TaskStore::Current()->SaveAll(tasks);
    TaskStore::Current()->Remove(3);
    TaskStore::Current()->Remove(20);
    const std::string exported = orva::ExportTasks(*TaskStore::Current()->CurrentSnapshot());

    MakeDirectory("/second");
    orva::SetRoot(RootPath() + "/second");
    const orva::ImportResult result = orva::ImportTasks(*TaskStore::Current(), exported);
    EXPECT_EQ(result.problem, "");
    EXPECT_EQ(result.count, 18U);
    EXPECT_EQ(orva::ExportTasks(*TaskStore::Current()->CurrentSnapshot()), exported);
}

TEST_F(TaskTransferTest, TheIdOfAStoredTaskReplacesIt) {
    TaskData stored = SampleTask("a");
    stored.appArgs = "kept";
    TaskStore::Current()->Save(stored);
    EXPECT_EQ(orva::ImportTasks(*TaskStore::Current(),
                                R"([{"basic":{"id":"1","task_name":"b"},"command":"false"},
                                    {"basic":{"id":"-1","task_name":"c","app":"x"}}])")
                  .problem,
              "");
    EXPECT_EQ(TaskStore::Current()->Find(1)->name, "b");
    EXPECT_EQ(TaskStore::Current()->Find(1)->command, "false");
    EXPECT_EQ(TaskStore::Current()->Find(1)->appArgs, "kept");
    EXPECT_EQ(TaskStore::Current()->Find(2)->name, "c");
}

TEST_F(TaskTransferTest, ADocumentThatIsNoArrayOfTasksIsRefused) {
    EXPECT_EQ(Problem("{}"), "is no array of tasks");
    EXPECT_EQ(Problem("7"), "is no array of tasks");
    EXPECT_NE(Problem("[{]"), "");
    EXPECT_NE(Problem(""), "");
    EXPECT_NE(Problem("[] x"), "");
    EXPECT_EQ(Problem("[7]"), "task 1: is no object");
    EXPECT_EQ(Problem("[{}]"), "task 1: basic: is missing");
    EXPECT_EQ(Problem(R"([{"basic":7}])"), "task 1: basic: is no object");
}

TEST_F(TaskTransferTest, TheFirstBadMemberIsNamedAndNothingIsStored) {
    EXPECT_EQ(Problem(ThirdTask(R"("task_name":"a","app":"x","owner":"x")")),
              "task 3: basic.owner: no account named \"x\"");
    EXPECT_EQ(Problem(ThirdTask(R"("app":"x")")), "task 3: basic.task_name: is missing");
    EXPECT_EQ(Problem(ThirdTask(R"("task_name":"a")")), "task 3: basic.app: is missing");
    EXPECT_EQ(Problem(ThirdTask(R"("task_name":"a","app":7)")), "task 3: basic.app: is no text");
    EXPECT_EQ(Problem(ThirdTask(R"("task_name":"a","app":"x","id":"first")")),
              "task 3: basic.id: is no decimal id");
    EXPECT_EQ(Problem(ThirdTask(R"("task_name":"a","app":"x","enabled":true)")),
              "task 3: basic.enabled: is neither \"on\" nor \"off\"");
    EXPECT_EQ(Problem(ThirdTask(R"("task_name":"a","app":"x","can_edit_name":1)")),
              "task 3: basic.can_edit_name: is neither true nor false");
    const std::string good = R"("task_name":"a","app":"x")";
    EXPECT_EQ(Problem(ThirdTask(good, R"(,"schedule":{"hour":24})")),
              "task 3: schedule.hour: is no integer from 0 to 23");
    EXPECT_EQ(Problem(ThirdTask(good, R"(,"schedule":7)")), "task 3: schedule: is no object");
    EXPECT_EQ(Problem(ThirdTask(good, R"(,"command":["a"])")), "task 3: command: is no text");
    EXPECT_EQ(Problem(ThirdTask(good, ",\"command\":\"" + std::string(131'072, 'x') + "\"")),
              "task 3: command: is longer than 131071 bytes");
    EXPECT_EQ(Problem(ThirdTask(good, R"(,"listable":"yes")")),
              "task 3: listable: is neither true nor false");
}

TEST_F(TaskTransferTest, AMistypedMemberIsNotPassedOver) {
    const std::string good = R"("task_name":"a","app":"x")";
    EXPECT_EQ(Problem(ThirdTask(good, R"(,"comand":"a")")), "task 3: comand: unknown member");
    EXPECT_EQ(Problem(ThirdTask(good + R"(,"name":"a")")), "task 3: basic.name: unknown member");
    EXPECT_EQ(Problem(ThirdTask(good, R"(,"schedule":{"minute":1})")),
              "task 3: schedule.minute: unknown member");
}

TEST_F(TaskTransferTest, AnIdThatComesTwiceIsRefused) {
    EXPECT_EQ(Problem(R"([{"basic":{"id":5,"task_name":"a","app":"x"}},
                          {"basic":{"id":"5","task_name":"b","app":"x"}}])"),
              "task 2: basic.id: task 1 has it already");
}

TEST_F(TaskTransferTest, AnIdThatWouldUseUpTheIdsIsRefused) {
    EXPECT_EQ(Problem(R"([{"basic":{"id":2147483647,"task_name":"a","app":"x"}}])"),
              "task 1: basic.id: is higher than 1000000000");
    EXPECT_EQ(Problem(R"([{"basic":{"id":"1000000001","task_name":"a","app":"x"}}])"),
              "task 1: basic.id: is higher than 1000000000");
    EXPECT_EQ(orva::ImportTasks(*TaskStore::Current(),
                                R"([{"basic":{"id":1000000000,"task_name":"a","app":"x"}}])")
                  .problem,
              "");
    // One that is stored already uses up nothing.
    EXPECT_EQ(TaskStore::Current()->Save(SampleTask("b")), 1000000001);
    const std::string exported = orva::ExportTasks(*TaskStore::Current()->CurrentSnapshot());
    EXPECT_EQ(orva::ImportTasks(*TaskStore::Current(), exported).problem, "");
    EXPECT_EQ(orva::ExportTasks(*TaskStore::Current()->CurrentSnapshot()), exported);
}

TEST_F(TaskTransferTest, TheOverviewIsATable) {
    TaskStore::Current()->Save(SampleTask("Backup"));
    TaskData off = SampleTask("Off");
    off.owner = "www-data";
    off.Set(orva::kEnabled, false);
    TaskStore::Current()->Save(off);
    EXPECT_EQ(orva::TaskOverview(*TaskStore::Current()->CurrentSnapshot()),
              "ID  ENABLED  NEXT START        OWNER     NAME\n"
              "1   on       2026-05-02 06:30  root      Backup\n"
              "2   off      N/A               www-data  Off\n");
}

}  // namespace
