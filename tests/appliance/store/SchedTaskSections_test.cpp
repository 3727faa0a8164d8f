#include <gmock/gmock.h>
#include <json/writer.h>

#include <string>
#include <vector>

#include "appliance/util/Error.h"
#include "appliance/util/StrictJson.h"
#include "platform/qlibc.h"
#include "platform/schedtask.h"
#include "tests/appliance/store/StoreTest.h"

namespace {

using orva::TaskData;
using orva::TaskStore;
using testing::ElementsAre;

Json::Value Parse(const std::string& text) {
    std::string error;
    return orva::ParseStrictJson(text, error).value_or("not JSON: " + error);
}

std::string ToText(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    return Json::writeString(builder, value);
}

class SchedTaskSectionsTest : public StoreTest {
  protected:
    // Why the basic section is refused; "" when it is taken.
    static std::string BasicProblem(const std::string& doc) {
        const Record task;
        TakeLog();
        if (ORVASchedTaskConvertFromJson_Basic(Parse(doc), *task)) {
            return "";
        }
        EXPECT_TRUE(ORVASchedTaskIsNew(*task));
        EXPECT_EQ(ORVASchedTaskGetName(*task), "");
        const std::vector<std::string> log = TakeLog();
        return log.size() == 1 ? log[0] : "log lines: " + std::to_string(log.size());
    }

    static std::string NewTask(const std::string& members) {
        return R"({"basic":{"id":"-1",)" + members + "}}";
    }
};

TEST_F(SchedTaskSectionsTest, WritesTheBasicSectionOfAStoredTask) {
    TaskData task = SampleTask("Backup");
    task.action = "#a:b#";
    task.flags = orva::kEnabled | orva::kCanEditName | orva::kListable;
    TaskStore::Current()->Save(task);
    const Record record;
    ASSERT_EQ(ORVASchedTaskLoad(1, record.Get()), 0);
    Json::Value doc;
    doc["kept"] = true;
    ASSERT_TRUE(ORVASchedTaskConvertToJson_Basic(*record, doc));
    EXPECT_EQ(ToText(doc),
              R"({"basic":{"action":"#a:b#","app":"ORVA.ZUM.TaskScheduler.Script",)"
              R"("can_delete_from_ui":false,"can_edit_from_ui":false,"can_edit_name":true,)"
              R"("can_edit_owner":false,"can_run_app_same_time":false,"can_run_from_ui":false,)"
              R"("can_run_task_same_time":false,"enabled":"on","id":1,"listable":true,)"
              R"("owner":"root","simple_edit_form":false,"task_name":"Backup"},"kept":true})");
}

TEST_F(SchedTaskSectionsTest, WritesTheScheduleSectionWithTheNextStart) {
    TaskStore::Current()->Save(SampleTask("a"));
    const Record record;
    ASSERT_EQ(ORVASchedTaskLoad(1, record.Get()), 0);
    Json::Value doc;
    ASSERT_TRUE(ORVASchedTaskConvertToJson_Schedule(*record, doc));
    EXPECT_EQ(ToText(doc),
              R"({"schedule":{"date":"","hour":6,"interval_min":0,"last_hour":23,"last_min":59,)"
              R"("min":30,"mode":"weekly","next_trigger_time":"2026-05-02 06:30",)"
              R"("repeat":"never","run_missed":false,"week_name":"0,1,2,3,4,5,6"}})");
    ORVASchedCTaskSetState(record.Get(), false);
    ASSERT_TRUE(ORVASchedTaskConvertToJson_Schedule(*record, doc));
    EXPECT_EQ(doc["schedule"]["next_trigger_time"].asString(), "N/A");
}

TEST_F(SchedTaskSectionsTest, SectionsCannotBeWrittenIntoWhatIsNoObject) {
    const Record record;
    for (Json::Value doc : {Json::Value("text"), Json::Value(1), Json::Value(Json::arrayValue)}) {
        EXPECT_FALSE(ORVASchedTaskConvertToJson_Basic(*record, doc));
        EXPECT_FALSE(ORVASchedTaskConvertToJson_Schedule(*record, doc));
        EXPECT_EQ(QLIBCErrGet(), orva::kErrBadDocument);
    }
}

TEST_F(SchedTaskSectionsTest, ANewTaskTakesNameOwnerAndState) {
    const Record record;
    ASSERT_TRUE(ORVASchedTaskConvertFromJson_Basic(
        Parse(NewTask(R"("task_name":"Bericht \u00e4","owner":"daemon","enabled":"off")")),
        *record));
    EXPECT_TRUE(ORVASchedTaskIsNew(*record));
    EXPECT_EQ(ORVASchedTaskGetName(*record), "Bericht \xc3\xa4");
    EXPECT_FALSE(ORVASchedTaskIsEnabled(*record));
    Json::Value doc;
    ASSERT_TRUE(ORVASchedTaskConvertToJson_Basic(*record, doc));
    EXPECT_EQ(doc["basic"]["owner"].asString(), "daemon");
    EXPECT_EQ(doc["basic"]["id"].asInt(), -1);
}

TEST_F(SchedTaskSectionsTest, AStoredTaskKeepsAllThatTheSectionDoesNotName) {
    TaskData stored = SampleTask("a");
    stored.appArgs = "args";
    stored.editForm = "form";
    stored.Set(orva::kCanRunTaskSameTime, true);
    stored.id = TaskStore::Current()->Save(stored);
    const Record record;
    ASSERT_TRUE(ORVASchedTaskConvertFromJson_Basic(
        Parse(R"({"basic":{"id":"1","task_name":"b","owner":null,"enabled":"off"}})"), *record));
    ASSERT_TRUE(ORVASchedTaskConvertFromJson_Schedule(
        Parse(R"({"schedule":{"min":45,"week_name":null,"repeat":null}})"), *record));
    ASSERT_EQ(ORVASchedTaskSave(record.Get()), 0);
    EXPECT_EQ(ORVASchedTaskGetID(*record), 1);
    stored.name = "b";
    stored.Set(orva::kEnabled, false);
    stored.schedule.firstMinute = 6 * 60 + 45;
    EXPECT_EQ(*TaskStore::Current()->Find(1), stored);
}

TEST_F(SchedTaskSectionsTest, AnIdMayComeAsTextOrAsTheIntegerOfTheOtherDirection) {
    TaskStore::Current()->Save(SampleTask("a"));
    EXPECT_NE(BasicProblem(R"({"basic":{"id":"2","task_name":"b"}})"), "");
    EXPECT_EQ(QLIBCErrGet(), orva::kErrNotFound);
    const Record record;
    EXPECT_TRUE(ORVASchedTaskConvertFromJson_Basic(Parse(R"({"basic":{"id":1}})"), *record));
    EXPECT_EQ(ORVASchedTaskGetName(*record), "a");
}

TEST_F(SchedTaskSectionsTest, RefusesIdsThatAreNone) {
    TaskStore::Current()->Save(SampleTask("a"));
    for (const char* id :
         {R"("")", R"("0")", R"("-2")", R"(" 1")", R"("1 ")", R"("+1")", R"("1x")", R"("0x1")",
          R"("99999999999")", R"("one")", "1.0", "0", "null", "true", "[]", "{}"}) {
        EXPECT_EQ(BasicProblem("{\"basic\":{\"task_name\":\"b\",\"id\":" + std::string(id) + "}}"),
                  "task refused: basic.id: is no decimal id")
            << id;
        EXPECT_EQ(QLIBCErrGet(), orva::kErrBadDocument);
    }
    EXPECT_EQ(BasicProblem(R"({"basic":{"task_name":"b"}})"),
              "task refused: basic.id: is no decimal id");
    EXPECT_EQ(BasicProblem(R"({"basic":{"id":"7","task_name":"b"}})"),
              "task refused: basic.id: no task 7");
}

TEST_F(SchedTaskSectionsTest, RefusesNamesThatAreNone) {
    const std::string at255(255, 'x');
    EXPECT_EQ(BasicProblem(NewTask("\"task_name\":\"" + at255 + "\"")), "");
    EXPECT_EQ(BasicProblem(NewTask("\"task_name\":\"" + at255 + "x\"")),
              "task refused: basic.task_name: is longer than 255 bytes");
    EXPECT_EQ(BasicProblem(NewTask(R"("task_name":"")")),
              "task refused: basic.task_name: is empty");
    EXPECT_EQ(BasicProblem(NewTask(R"("task_name":null)")),
              "task refused: basic.task_name: is missing");
    EXPECT_EQ(BasicProblem(NewTask(R"("owner":"root")")),
              "task refused: basic.task_name: is missing");
    for (const char* name : {R"("a\nb")", R"("\u0007")", R"("a\u007f")", R"("\u0085")",
                             R"("\u2028")", R"("x\u2029")"}) {
        EXPECT_EQ(BasicProblem(NewTask("\"task_name\":" + std::string(name))),
                  "task refused: basic.task_name: holds a control character")
            << name;
    }
    for (const char* name :
         {R"("a\u202agpj.exe")", R"("a\u202egpj.exe")", R"("\u2066a")", R"("a\u2069")",
          R"("\ufeff")", R"("\ufeffa")", R"("\ufffe\uffff")", R"("a\ufdd0")", R"("a\ufdef")",
          R"("\ud83f\udffe")", R"("\udbff\udfff")"}) {
        EXPECT_EQ(BasicProblem(NewTask("\"task_name\":" + std::string(name))),
                  "task refused: basic.task_name: holds a character that cannot be shown")
            << name;
    }
    for (const char* name : {R"(" ")", R"("   ")", R"("\u00a0\u3000 ")", R"("\u200b\u2060\u00ad")",
                             R"("\u3164\u2800")"}) {
        EXPECT_EQ(BasicProblem(NewTask("\"task_name\":" + std::string(name))),
                  "task refused: basic.task_name: is blank")
            << name;
    }
    for (const char* name : {"1", "true", "[]", "{}"}) {
        EXPECT_EQ(BasicProblem(NewTask("\"task_name\":" + std::string(name))),
                  "task refused: basic.task_name: is no text");
    }
    for (const char* name :
         {R"("\u00a0 \ud83d\ude00 \u2027")", R"("\ud83d\udc69\u200d\ud83d\udd27")", R"(" a ")",
          R"("\u200e\u05d0")", R"("\ufdcf\ufdf0\ufffd")", R"("\u3042\u0e01\udbff\udffd")"}) {
        EXPECT_EQ(BasicProblem(NewTask("\"task_name\":" + std::string(name))), "") << name;
    }
}

TEST_F(SchedTaskSectionsTest, RefusesBytesThatAreNoUtf8AndNul) {
    for (const std::string& name :
         {std::string("\xff"), std::string("a\xc3"), std::string("a\0b", 3)}) {
        Json::Value doc;
        doc["basic"]["id"] = "-1";
        doc["basic"]["task_name"] = name;
        const Record record;
        EXPECT_FALSE(ORVASchedTaskConvertFromJson_Basic(doc, *record));
        EXPECT_EQ(QLIBCErrGet(), orva::kErrBadDocument);
    }
}

TEST_F(SchedTaskSectionsTest, RefusesOwnersThatAreNoAccount) {
    EXPECT_EQ(BasicProblem(NewTask(R"("task_name":"a","owner":"no\nbody")")),
              "task refused: basic.owner: no account named \"no?body\"");
    EXPECT_EQ(BasicProblem(NewTask(R"("task_name":"a","owner":"")")),
              "task refused: basic.owner: no account named \"\"");
    EXPECT_EQ(BasicProblem(NewTask(R"("task_name":"a","owner":0)")),
              "task refused: basic.owner: is no text");
}

TEST_F(SchedTaskSectionsTest, RefusesStatesOtherThanOnAndOff) {
    for (const char* enabled : {R"("ON")", R"("")", "true", "1", "[]"}) {
        EXPECT_EQ(BasicProblem(NewTask(R"("task_name":"a","enabled":)" + std::string(enabled))),
                  "task refused: basic.enabled: is neither \"on\" nor \"off\"");
    }
}

TEST_F(SchedTaskSectionsTest, RefusesDocumentsWithoutAProperSection) {
    EXPECT_EQ(BasicProblem("{}"), "task refused: basic: is missing");
    EXPECT_EQ(BasicProblem("[]"), "task refused: basic: is missing");
    EXPECT_EQ(BasicProblem("null"), "task refused: basic: is missing");
    EXPECT_EQ(BasicProblem(R"({"basic":7})"), "task refused: basic.id: is no decimal id");
}

TEST_F(SchedTaskSectionsTest, AChangedNameOrOwnerIsRefusedWhereTheStoredTaskForbidsIt) {
    TaskData stored = SampleTask("a");
    stored.Set(orva::kCanEditName, false);
    TaskStore::Current()->Save(stored);
    EXPECT_EQ(BasicProblem(R"({"basic":{"id":"1","task_name":"b"}})"),
              "task refused: basic.task_name: may not be changed");
    EXPECT_EQ(QLIBCErrGet(), orva::kErrNotAllowed);
    EXPECT_EQ(BasicProblem(R"({"basic":{"id":"1","task_name":"a","owner":"daemon"}})"),
              "task refused: basic.owner: may not be changed");
    EXPECT_EQ(QLIBCErrGet(), orva::kErrNotAllowed);
    EXPECT_TRUE(ORVASchedTaskConvertFromJson_Basic(
        Parse(R"({"basic":{"id":"1","task_name":"a","owner":"root"}})"), *Record()));

    stored.id = 1;
    stored.Set(orva::kCanEditName, true);
    stored.Set(orva::kCanEditOwner, true);
    TaskStore::Current()->Save(stored);
    const Record record;
    EXPECT_TRUE(ORVASchedTaskConvertFromJson_Basic(
        Parse(R"({"basic":{"id":"1","task_name":"b","owner":"daemon"}})"), *record));
    EXPECT_EQ(ORVASchedTaskGetName(*record), "b");
}

TEST_F(SchedTaskSectionsTest, AnOwnerWhoseAccountIsGonePassesAsLongAsItIsNotChanged) {
    TaskData stored = SampleTask("a");
    stored.owner = "gone";
    stored.Set(orva::kCanEditOwner, true);
    stored.id = TaskStore::Current()->Save(stored);
    const Record record;
    ASSERT_TRUE(ORVASchedTaskConvertFromJson_Basic(
        Parse(R"({"basic":{"id":"1","task_name":"b","owner":"gone"}})"), *record));
    ASSERT_EQ(ORVASchedTaskSave(record.Get()), 0);
    stored.name = "b";
    EXPECT_EQ(*TaskStore::Current()->Find(1), stored);
    EXPECT_EQ(BasicProblem(R"({"basic":{"id":"1","owner":"gone too"}})"),
              "task refused: basic.owner: no account named \"gone too\"");
    EXPECT_EQ(BasicProblem(NewTask(R"("task_name":"c","owner":"gone")")),
              "task refused: basic.owner: no account named \"gone\"");
}

TEST_F(SchedTaskSectionsTest, ASetKeepsWhatOthersSavedSinceItTookOverTheTask) {
    TaskData stored = SampleTask("a");
    stored.id = TaskStore::Current()->Save(stored);
    const Record record;
    ASSERT_TRUE(ORVASchedTaskConvertFromJson_Basic(
        Parse(R"({"basic":{"id":"1","task_name":"b","owner":"root","enabled":"on"}})"), *record));
    ASSERT_TRUE(
        ORVASchedTaskConvertFromJson_Schedule(Parse(R"({"schedule":{"hour":7}})"), *record));
    const Record other;
    ASSERT_EQ(ORVASchedTaskLoad(1, other.Get()), 0);
    ORVASchedCTaskSetState(other.Get(), false);
    ORVASchedCTaskSetCommand(other.Get(), "false");
    ASSERT_TRUE(
        ORVASchedTaskConvertFromJson_Schedule(Parse(R"({"schedule":{"interval_min":5}})"), *other));
    ASSERT_EQ(ORVASchedTaskSave(other.Get()), 0);
    ASSERT_EQ(ORVASchedTaskSave(record.Get()), 0);
    stored.name = "b";
    stored.command = "false";
    stored.Set(orva::kEnabled, false);
    // The schedule is one property: its parts only make sense together.
    stored.schedule.firstMinute = 7 * 60 + 30;
    EXPECT_EQ(*TaskStore::Current()->Find(1), stored);
    EXPECT_EQ(ORVASchedTaskGetNextTriggerTime(*record), "N/A");
}

TEST_F(SchedTaskSectionsTest, ASetOfAnotherApplicationsTaskChangesNameOwnerStateAndScheduleOnly) {
    for (const char* app :
         {"ORVA.Example.PhotoIndex", "ORVA.ZUM.DataAnalysis", "ORVA.ZUM.BackupApp.NetBackup",
          "ORVA.ZUM.BackupApp.LocalBackup", "ORVA.ZUM.BackupApp.LUNBackup",
          "ORVA.ZUM.BackupApp.S3Backup", "ORVA.ZUM.TaskScheduler.AutoPower",
          "ORVA.ZUM.TaskScheduler.KELAutoUpdate"}) {
        TaskData task = SampleTask("before");
        task.app = app;
        task.appName = "#app:title# of " + task.app;
        task.appArgs = "{ \"b\":1,\"a\" : [2.50,null]}\n\n";
        task.action = "#app:does# \t\xc3\xa4";
        task.command = "run 'it'\nand wait";
        task.editForm = "Form";
        task.flags = orva::kEnabled | orva::kSimpleEditForm | orva::kCanEditName |
                     orva::kCanEditOwner | orva::kCanRunTaskSameTime | orva::kCanDeleteFromUI;
        task.schedule.date = absl::CivilDay(2028, 2, 29);
        task.schedule.runMissed = true;
        task.id = TaskStore::Current()->Save(task);

        Json::Value doc =
            Parse(R"({"basic":{"task_name":"after","owner":"daemon","enabled":"off",)"
                  R"("app":"x","action":"x","command":"x","app_args":"x","edit_form":"x",)"
                  R"("listable":true,"can_edit_name":false,"can_run_task_same_time":false},)"
                  R"("schedule":{"hour":22,"min":5,"week_name":"1,5"},)"
                  R"("app":{"a":"x"},"command":"x","listable":true})");
        doc["basic"]["id"] = std::to_string(task.id);
        const Record record;
        ASSERT_TRUE(ORVASchedTaskConvertFromJson_Basic(doc, *record)) << app;
        ASSERT_TRUE(ORVASchedTaskConvertFromJson_Schedule(doc, *record)) << app;
        ASSERT_EQ(ORVASchedTaskSave(record.Get()), 0) << app;
        task.name = "after";
        task.owner = "daemon";
        task.Set(orva::kEnabled, false);
        task.schedule.firstMinute = 22 * 60 + 5;
        task.schedule.weekDays = 0b100010;
        EXPECT_EQ(*TaskStore::Current()->Find(task.id), task) << app;
    }
}

TEST_F(SchedTaskSectionsTest, ARefusedScheduleLeavesTheRecordUnchanged) {
    const Record record;
    TakeLog();
    EXPECT_FALSE(ORVASchedTaskConvertFromJson_Schedule(
        Parse(R"({"schedule":{"hour":5,"min":"30"}})"), *record));
    EXPECT_EQ(QLIBCErrGet(), orva::kErrBadDocument);
    EXPECT_THAT(TakeLog(), ElementsAre("task refused: schedule.min: is no integer from 0 to 59"));
    EXPECT_EQ(ORVASchedTaskGetNextTriggerTime(*record), "2026-05-02 00:00");
    for (const char* doc : {"[]", "7", R"({"schedule":[]})", R"({"schedule":"x"})"}) {
        EXPECT_FALSE(ORVASchedTaskConvertFromJson_Schedule(Parse(doc), *record)) << doc;
    }
}

TEST_F(SchedTaskSectionsTest, AnAbsentScheduleChangesNothing) {
    const Record record;
    ASSERT_TRUE(ORVASchedTaskConvertFromJson_Schedule(Parse(R"({"schedule":{"hour":5,"min":30}})"),
                                                      *record));
    for (const char* doc : {"{}", R"({"schedule":null})", R"({"schedule":{}})"}) {
        EXPECT_TRUE(ORVASchedTaskConvertFromJson_Schedule(Parse(doc), *record)) << doc;
    }
    EXPECT_EQ(ORVASchedTaskGetNextTriggerTime(*record), "2026-05-02 05:30");
}

TEST_F(SchedTaskSectionsTest, AStoreThatCannotBeReadFailsTheSectionOfAStoredTask) {
    Write("/usr/orva/var/tasks.db", std::string(4096, 'x'));
    const Record record;
    EXPECT_FALSE(ORVASchedTaskConvertFromJson_Basic(Parse(R"({"basic":{"id":"1"}})"), *record));
    EXPECT_EQ(QLIBCErrGet(), orva::kErrDatabaseCorrupt);
}

}  // namespace
