#include "include/TaskSchedulerBeepHandler.h"

#include <stdexcept>
#include <string>

#include "tests/src/TypedHandlers.h"

namespace fakes {
namespace {

using ::testing::ElementsAre;

constexpr const char* kBeep = "ORVA.ZUM.TaskScheduler.Beep";

class BeepTask : public PlatformTest {
  protected:
    void SetUp() override { platform.AddTask(StoredTask(5, kBeep, "{\"beep_duration\":7}\n")); }

    // Sets task 5 to the duration, given as JSON.
    static std::string SetDuration(const std::string& duration) {
        return Serve<TaskSchedulerBeepHandler>(
            "set", R"({"id":5,"name":"Job","extra":{"beep_duration":)" + duration + "}}");
    }

    // The command of task 5 after such a set.
    std::string CommandFor(const std::string& duration) {
        EXPECT_EQ(SetDuration(duration), R"(success {"id":5})") << duration;
        return platform.tasks[5].command;
    }
};

TEST_F(BeepTask, SetWritesEveryPropertyInItsOrder) {
    EXPECT_EQ(Serve<TaskSchedulerBeepHandler>(
                  "set", R"({"id":5,"name":"Wake","owner":"eva","enable":true,)"
                         R"("schedule":{"minute":1,"week_day":"1","repeat_date":"never"},)"
                         R"("extra":{"beep_duration":90,"more":true}})"),
              R"(success {"id":5})");
    EXPECT_THAT(
        platform.Journal(),
        ElementsAre("ORVASchedTaskAlloc()",
                    R"(ORVASchedTaskConvertFromJson_Basic({"enabled":"on","id":"5",)"
                    R"("owner":"eva","task_name":"Wake"}, #1))",
                    R"(ORVASchedTaskConvertFromJson_Schedule({"min":1,"repeat":"never",)"
                    R"("week_name":"1"}, #1))",
                    R"(ORVASchedCTaskSetEditForm(#1, "ORVA.ZUM.TaskScheduler.Beep.FormPanel"))",
                    "ORVASchedCTaskSetSimpleEditForm(#1, 1)", "ORVASchedCTaskSetCanEditName(#1, 1)",
                    "ORVASchedCTaskSetCanEditOwner(#1, 0)",
                    "ORVASchedCTaskSetCanRunAppSameTime(#1, 1)", "ORVASchedCTaskSetListable(#1, 1)",
                    R"(ORVASchedCTaskSetApp(#1, "ORVA.ZUM.TaskScheduler.Beep"))",
                    R"(ORVASchedCTaskSetAppName(#1, "#beep:beep_title#"))",
                    R"(ORVASchedCTaskSetAppArgs(#1, "{\"beep_duration\":90,\"more\":true}\n"))",
                    R"(ORVASchedCTaskSetAction(#1, "#volume:beep_on# 90 #common:time_seconds#"))",
                    R"(ORVASchedCTaskSetCommand(#1, "/tmp/orvaschedtool --beep 90"))",
                    "ORVASchedTaskSave(#1)", "ORVASchedTaskFree(#1)"));
}

TEST_F(BeepTask, CreateStoresANewTask) {
    EXPECT_EQ(Serve<TaskSchedulerBeepHandler>(
                  "set", R"({"type":"beep","name":"Wake","extra":{"beep_duration":3}})"),
              R"(success {"id":100})");
    EXPECT_EQ(
        platform.tasks[100].ToText(),
        R"(id=100, name="Wake", owner="admin", enabled=0, app="ORVA.ZUM.TaskScheduler.Beep", )"
        R"(appName="#beep:beep_title#", appArgs="{\"beep_duration\":3}\n", )"
        R"(action="#volume:beep_on# 3 #common:time_seconds#", )"
        R"(command="/tmp/orvaschedtool --beep 3", )"
        R"(editForm="ORVA.ZUM.TaskScheduler.Beep.FormPanel", nextTriggerTime="N/A", )"
        R"(simpleEditForm=1, canEditName=1, canEditOwner=0, canRunTaskSameTime=0, )"
        R"(canRunAppSameTime=1, listable=1, canRunFromUI=1, canEditFromUI=1, )"
        R"(canDeleteFromUI=1, isNew=0, schedule={"min":null,"repeat":null,)"
        R"("week_name":null})");
}

TEST_F(BeepTask, ShortDurationsSoundForOneSecond) {
    for (const char* duration :
         {"0", "-1", "-5.5", "0.99", "-1e300", "-9223372036854775808", "null", "false"}) {
        EXPECT_EQ(CommandFor(duration), "/tmp/orvaschedtool --beep 1") << duration;
        EXPECT_EQ(platform.tasks[5].action, "#volume:beep_on# 1 #common:time_seconds#");
    }
}

TEST_F(BeepTask, WithoutADurationSoundsForOneSecond) {
    for (const char* extra :
         {R"({"id":5,"extra":{}})", R"({"id":5,"extra":null})", R"({"id":5})"}) {
        platform.tasks[5].command.clear();
        EXPECT_EQ(Serve<TaskSchedulerBeepHandler>("set", extra), R"(success {"id":5})");
        EXPECT_EQ(platform.tasks[5].command, "/tmp/orvaschedtool --beep 1") << extra;
    }
    EXPECT_EQ(platform.tasks[5].appArgs, "null\n");
}

TEST_F(BeepTask, DurationsWithinTheBoundsAreKept) {
    EXPECT_EQ(CommandFor("1"), "/tmp/orvaschedtool --beep 1");
    EXPECT_EQ(CommandFor("599"), "/tmp/orvaschedtool --beep 599");
    EXPECT_EQ(CommandFor("600"), "/tmp/orvaschedtool --beep 600");
    EXPECT_EQ(CommandFor("59.9"), "/tmp/orvaschedtool --beep 59");
    EXPECT_EQ(CommandFor("true"), "/tmp/orvaschedtool --beep 1");
}

TEST_F(BeepTask, LongDurationsSoundForTenMinutes) {
    for (const char* duration : {"601", "600.5", "2147483648", "4294967297", "9223372036854775808",
                                 "18446744073709551615", "1e300"}) {
        EXPECT_EQ(CommandFor(duration), "/tmp/orvaschedtool --beep 600") << duration;
        EXPECT_EQ(platform.tasks[5].action, "#volume:beep_on# 600 #common:time_seconds#");
    }
}

TEST_F(BeepTask, TheTextOfANumberCountsAsTheNumber) {
    EXPECT_EQ(CommandFor("\"60\""), "/tmp/orvaschedtool --beep 60");
    EXPECT_EQ(CommandFor("\"-3\""), "/tmp/orvaschedtool --beep 1");
    EXPECT_EQ(CommandFor("\"601\""), "/tmp/orvaschedtool --beep 600");
    EXPECT_EQ(CommandFor("\"99999999999999999999\""), "/tmp/orvaschedtool --beep 600");
    EXPECT_EQ(CommandFor("\"-99999999999999999999\""), "/tmp/orvaschedtool --beep 1");
    EXPECT_EQ(platform.tasks[5].appArgs, "{\"beep_duration\":\"-99999999999999999999\"}\n");
}

TEST_F(BeepTask, ADurationThatIsNoNumberEndsAsAnExceptionWithNothingSaved) {
    for (const char* duration :
         {"\"\"", "\"abc\"", "\"60s\"", "\" 60\"", "\"99999999999999999999x\"", "{}", "[60]"}) {
        EXPECT_THROW(SetDuration(duration), Json::LogicError) << duration;
    }
    EXPECT_EQ(platform.tasks[5].appArgs, "{\"beep_duration\":7}\n");
    EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
}

TEST_F(BeepTask, AFormThatIsNoObjectEndsAsAnExceptionWithNothingSaved) {
    for (const char* extra : {"5", "[1]", "\"60\"", "true"}) {
        EXPECT_THROW(Serve<TaskSchedulerBeepHandler>(
                         "set", std::string(R"({"id":5,"extra":)") + extra + "}"),
                     Json::LogicError)
            << extra;
    }
    EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
}

TEST_F(BeepTask, GetShowsTheDurationAsItWasSent) {
    CommandFor("9000");
    EXPECT_EQ(Serve<TaskSchedulerBeepHandler>("get", R"({"id":5})"),
              R"(success {"action":"#volume:beep_on# 600 #common:time_seconds#",)"
              R"("can_edit_name":true,"can_edit_owner":false,"enable":false,)"
              R"("extra":{"beep_duration":9000},"id":5,"name":"Job","owner":"admin",)"
              R"("schedule":{"minute":null,"repeat_date":null,"week_day":null},"type":"beep"})");
}

TEST_F(BeepTask, ANewTaskSoundsForSixtySecondsGivenAsText) {
    EXPECT_EQ(Serve<TaskSchedulerBeepHandler>("get", R"({"id":-1,"type":"beep"})"),
              R"(success {"action":"","can_edit_name":true,"can_edit_owner":false,"enable":true,)"
              R"("extra":{"beep_duration":"60"},"id":-1,"name":"","owner":"admin",)"
              R"("schedule":{"minute":null,"repeat_date":null,"week_day":null},)"
              R"("type":"custom"})");
    EXPECT_EQ(platform.Calls("ORVASchedTaskGetAppArgs"), 0);
}

TEST_F(BeepTask, StoredArgumentsThatAreNoJsonAreStillAnsweredWithSuccess) {
    for (const char* arguments : {"", "not json", "{\"beep_duration\":", "[1"}) {
        platform.tasks[5].appArgs = arguments;
        EXPECT_EQ(Serve<TaskSchedulerBeepHandler>("get", R"({"id":5})").substr(0, 7), "success")
            << arguments;
    }
}

TEST_F(BeepTask, SetLeavesTheSameTimeFlagAsItIs) {
    platform.tasks[5].canRunTaskSameTime = true;
    CommandFor("5");
    EXPECT_EQ(platform.Calls("ORVASchedCTaskSetCanRunTaskSameTime"), 0);
    EXPECT_TRUE(platform.tasks[5].canRunTaskSameTime);
}

TEST_F(BeepTask, AFailingSetterIsPassedOver) {
    ExpectFailingSettersArePassedOver(
        {"ORVASchedCTaskSetEditForm", "ORVASchedCTaskSetSimpleEditForm",
         "ORVASchedCTaskSetCanEditName", "ORVASchedCTaskSetCanEditOwner",
         "ORVASchedCTaskSetCanRunAppSameTime", "ORVASchedCTaskSetListable", "ORVASchedCTaskSetApp",
         "ORVASchedCTaskSetAppName", "ORVASchedCTaskSetAppArgs", "ORVASchedCTaskSetAction",
         "ORVASchedCTaskSetCommand"},
        [] { return SetDuration("5"); });
}

TEST_F(BeepTask, AnExceptionFromASetterFreesTheRecord) {
    platform.ThrowFrom("ORVASchedCTaskSetCommand");
    EXPECT_THROW(SetDuration("5"), std::runtime_error);
}

}  // namespace
}  // namespace fakes
