#include "include/TaskSchedulerScriptHandler.h"

#include <stdexcept>
#include <string>

#include "tests/src/TypedHandlers.h"

namespace fakes {
namespace {

using ::testing::ElementsAre;

constexpr const char* kScript = "ORVA.ZUM.TaskScheduler.Script";

class ScriptTask : public PlatformTest {
  protected:
    void SetUp() override { platform.AddTask(StoredTask(5, kScript, "{\"script\":\"true\"}\n")); }

    static std::string SetExtra(const std::string& extra) {
        return Serve<TaskSchedulerScriptHandler>(
            "set", R"({"id":5,"name":"Job","enable":true,"extra":)" + extra + "}");
    }
};

TEST_F(ScriptTask, SetWritesEveryPropertyInItsOrder) {
    EXPECT_EQ(SetExtra(R"({"more":[1],"script":"echo \"a b\"\nexit 3"})"), R"(success {"id":5})");
    EXPECT_THAT(
        platform.Journal(),
        ElementsAre(
            "ORVASchedTaskAlloc()",
            R"(ORVASchedTaskConvertFromJson_Basic({"enabled":"on","id":"5",)"
            R"("owner":null,"task_name":"Job"}, #1))",
            R"(ORVASchedTaskConvertFromJson_Schedule({"min":null,"repeat":null,)"
            R"("week_name":null}, #1))",
            R"(ORVASchedCTaskSetEditForm(#1, "ORVA.ZUM.TaskScheduler.Script.FormPanel"))",
            "ORVASchedCTaskSetSimpleEditForm(#1, 1)", "ORVASchedCTaskSetCanEditName(#1, 1)",
            "ORVASchedCTaskSetCanEditOwner(#1, 1)", "ORVASchedCTaskSetCanRunTaskSameTime(#1, 0)",
            "ORVASchedCTaskSetCanRunAppSameTime(#1, 1)", "ORVASchedCTaskSetListable(#1, 1)",
            R"(ORVASchedCTaskSetAppName(#1, "#common:command_line#"))",
            R"(ORVASchedCTaskSetApp(#1, "ORVA.ZUM.TaskScheduler.Script"))",
            R"(ORVASchedCTaskSetAppArgs(#1, "{\"more\":[1],\"script\":\"echo \\\"a b\\\"\\nexit 3\"}\n"))",
            R"(ORVASchedCTaskSetAction(#1, "#common:run#: echo \"a b\"\nexit 3"))",
            R"(ORVASchedCTaskSetCommand(#1, "echo \"a b\"\nexit 3"))", "ORVASchedTaskSave(#1)",
            "ORVASchedTaskFree(#1)"));
}

TEST_F(ScriptTask, SavingTwiceLeavesIdenticalRecordsWhateverTheTaskHeldBefore) {
    SetExtra(R"({"script":"date"})");
    const std::string first = platform.tasks[5].ToText();
    EXPECT_EQ(first,
              R"(id=5, name="Job", owner="admin", enabled=1, )"
              R"(app="ORVA.ZUM.TaskScheduler.Script", appName="#common:command_line#", )"
              R"(appArgs="{\"script\":\"date\"}\n", action="#common:run#: date", command="date", )"
              R"(editForm="ORVA.ZUM.TaskScheduler.Script.FormPanel", nextTriggerTime="N/A", )"
              R"(simpleEditForm=1, canEditName=1, canEditOwner=1, canRunTaskSameTime=0, )"
              R"(canRunAppSameTime=1, listable=1, canRunFromUI=1, canEditFromUI=1, )"
              R"(canDeleteFromUI=1, isNew=0, schedule={"min":null,"repeat":null,)"
              R"("week_name":null})");
    Task& task = platform.tasks[5];
    task.simpleEditForm = task.canEditName = task.canEditOwner = false;
    task.canRunTaskSameTime = true;
    task.canRunAppSameTime = task.listable = false;
    task.appName = task.action = task.command = task.editForm = "other";
    SetExtra(R"({"script":"date"})");
    EXPECT_EQ(platform.tasks[5].ToText(), first);
}

TEST_F(ScriptTask, CreateStoresANewTask) {
    EXPECT_EQ(Serve<TaskSchedulerScriptHandler>(
                  "set", R"({"type":"script","name":"New","extra":{"script":"date"}})"),
              R"(success {"id":100})");
    EXPECT_EQ(platform.tasks[100].command, "date");
    EXPECT_EQ(platform.tasks[100].app, kScript);
}

TEST_F(ScriptTask, GetShowsTheStoredScriptAndLetsTheOwnerBeChanged) {
    EXPECT_EQ(Serve<TaskSchedulerScriptHandler>("get", R"({"id":5})"),
              R"(success {"action":"","can_edit_name":true,"can_edit_owner":true,"enable":true,)"
              R"("extra":{"script":"true"},"id":5,"name":"Job","owner":"admin",)"
              R"("schedule":{"minute":30,"repeat_date":"never","week_day":"1,3"},)"
              R"("type":"script"})");
}

TEST_F(ScriptTask, ANewTaskHasAnEmptyScriptWithoutALookAtItsArguments) {
    EXPECT_EQ(Serve<TaskSchedulerScriptHandler>("get", R"({"id":-1,"type":"script"})"),
              R"(success {"action":"","can_edit_name":true,"can_edit_owner":true,"enable":true,)"
              R"("extra":{"script":""},"id":-1,"name":"","owner":"admin",)"
              R"("schedule":{"minute":null,"repeat_date":null,"week_day":null},)"
              R"("type":"custom"})");
    EXPECT_EQ(platform.Calls("ORVASchedTaskGetAppArgs"), 0);
}

TEST_F(ScriptTask, StoredArgumentsThatAreNoJsonAreStillAnsweredWithSuccess) {
    platform.tasks[5].appArgs = "no json at all";
    EXPECT_EQ(Serve<TaskSchedulerScriptHandler>("get", R"({"id":5})"),
              R"(success {"action":"","can_edit_name":true,"can_edit_owner":true,"enable":true,)"
              R"("extra":null,"id":5,"name":"Job","owner":"admin",)"
              R"("schedule":{"minute":30,"repeat_date":"never","week_day":"1,3"},)"
              R"("type":"script"})");
}

TEST_F(ScriptTask, WithoutAScriptActionEndsAfterItsKeyAndTheCommandIsEmpty) {
    for (const char* extra : {"{}", "null", R"({"script":null})", R"({"script":""})"}) {
        platform.tasks[5].command = "old";
        EXPECT_EQ(SetExtra(extra), R"(success {"id":5})") << extra;
        EXPECT_EQ(platform.tasks[5].action, "#common:run#: ") << extra;
        EXPECT_EQ(platform.tasks[5].command, "") << extra;
    }
}

TEST_F(ScriptTask, AScriptThatIsANumberIsItsText) {
    EXPECT_EQ(SetExtra(R"({"script":42})"), R"(success {"id":5})");
    EXPECT_EQ(platform.tasks[5].command, "42");
}

TEST_F(ScriptTask, AScriptThatIsNoTextEndsAsAnExceptionWithNothingSaved) {
    for (const char* extra : {R"({"script":["date"]})", R"({"script":{}})", "[1]", "5"}) {
        EXPECT_THROW(SetExtra(extra), Json::LogicError) << extra;
    }
    EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
    EXPECT_EQ(platform.tasks[5].appArgs, "{\"script\":\"true\"}\n");
}

TEST_F(ScriptTask, AFailingSetterIsPassedOver) {
    ExpectFailingSettersArePassedOver(
        {"ORVASchedCTaskSetEditForm", "ORVASchedCTaskSetSimpleEditForm",
         "ORVASchedCTaskSetCanEditName", "ORVASchedCTaskSetCanEditOwner",
         "ORVASchedCTaskSetCanRunTaskSameTime", "ORVASchedCTaskSetCanRunAppSameTime",
         "ORVASchedCTaskSetListable", "ORVASchedCTaskSetAppName", "ORVASchedCTaskSetApp",
         "ORVASchedCTaskSetAppArgs", "ORVASchedCTaskSetAction", "ORVASchedCTaskSetCommand"},
        [] { return SetExtra(R"({"script":"date"})"); });
}

TEST_F(ScriptTask, AnExceptionFromASetterFreesTheRecord) {
    platform.ThrowFrom("ORVASchedCTaskSetAppArgs");
    EXPECT_THROW(SetExtra(R"({"script":"date"})"), std::runtime_error);
}

}  // namespace
}  // namespace fakes
