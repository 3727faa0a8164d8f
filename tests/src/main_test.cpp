#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "tests/src/TypedMethodTest.h"

extern "C" const ORVA::APITableRow gTable[];

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// --- The method table ---------------------------------------------------------------------------

TEST(MethodTableTest, IsTheSameOnEveryCall) {
    EXPECT_EQ(GetAPITable(), gTable);
    EXPECT_EQ(GetAPITable(), GetAPITable());
}

TEST(MethodTableTest, HoldsTheSevenMethodsInTheirOrder) {
    std::vector<std::string> rows;
    for (const ORVA::APITableRow* row = GetAPITable(); row->apiName != nullptr; ++row) {
        EXPECT_NE(row->method, nullptr) << row->methodName;
        rows.push_back(std::string(row->apiName) + " " + std::to_string(row->version) + " " +
                       row->methodName);
    }
    EXPECT_THAT(
        rows, ElementsAre("ORVA.Core.TaskScheduler 1 list", "ORVA.Core.TaskScheduler 1 set_enable",
                          "ORVA.Core.TaskScheduler 1 delete", "ORVA.Core.TaskScheduler 1 run",
                          "ORVA.Core.TaskScheduler 1 get", "ORVA.Core.TaskScheduler 1 set",
                          "ORVA.Core.TaskScheduler 1 create"));
}

TEST(MethodTableTest, EndsWithARowOfZeros) {
    const ORVA::APITableRow& end = GetAPITable()[7];
    EXPECT_EQ(end.apiName, nullptr);
    EXPECT_EQ(end.version, 0);
    EXPECT_EQ(end.methodName, nullptr);
    EXPECT_EQ(end.method, nullptr);
}

class EveryMethodTest : public ModuleTest {};

TEST_F(EveryMethodTest, AnswersARequestWithoutParameters) {
    for (const auto& [method, answer] : std::vector<std::pair<std::string, std::string>>{
             {"list", R"(success {"tasks":[],"total":0})"},
             {"set_enable", R"(error 4800 {"msg":"tasks must be an array"})"},
             {"delete", R"(error 4800 {"msg":"task must be an array of id or a single id"})"},
             {"run", R"(error 4800 {"msg":"task must be an array of id or a single id"})"},
             {"get", "error 4800 null"},
             {"set", "error 4800 null"},
             {"create", "error 4800 null"}}) {
        EXPECT_EQ(Call(method, "{}"), answer) << method;
    }
    EXPECT_THAT(platform.Log(), IsEmpty());
}

TEST_F(EveryMethodTest, LeavesNothingBehindWhenTheTextsCannotBeRead) {
    platform.ThrowFrom("ParseTexts", 0);
    for (const std::string method : {"list", "set_enable", "delete", "run"}) {
        EXPECT_THROW(Call(method, "{}"), std::runtime_error) << method;
    }
    EXPECT_THROW(Call("create", R"({"type": "beep"})"), std::runtime_error);
}

// --- Get and set ------------------------------------------------------------------------

TEST_F(TypedMethodTest, GetRefusesAMissingOrMalformedId) {
    Add(5, "ORVA.ZUM.TaskScheduler.Script", "{}");
    for (const std::string parameters :
         {R"({})", R"({"id": "5"})", R"({"id": 5.0})", R"({"id": null})", R"({"id": [5]})",
          R"({"id": true})", R"({"id": 4294967301})", R"({"id": "5", "type": "script"})",
          R"({"type": "script"})"}) {
        EXPECT_EQ(Call("get", parameters), "error 4800 null") << parameters;
    }
    EXPECT_THAT(platform.Journal(), IsEmpty());
}

TEST_F(TypedMethodTest, GetRefusesAMalformedTypeEvenWithAGoodId) {
    Add(5, "ORVA.ZUM.TaskScheduler.Script", "{}");
    for (const std::string type : {"5", "null", "true", "[]", R"({"type": "script"})"}) {
        EXPECT_EQ(Call("get", R"({"id": 5, "type": )" + type + "}"), "error 4800 null") << type;
    }
    EXPECT_THAT(platform.Journal(), IsEmpty());
}

TEST_F(TypedMethodTest, GetServesATaskByTheKindThatTheStoreKnows) {
    Add(5, "ORVA.ZUM.TaskScheduler.Script", "{\"script\":\"date\"}\n");
    EXPECT_EQ(Extra(R"({"id": 5})"), R"({"script":"date"})");
    std::vector<std::string> journal = platform.Journal();
    journal.resize(5);
    EXPECT_THAT(journal, ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                                     "ORVASchedTaskConvertToJson_Basic(#1)",
                                     "ORVASchedTaskFree(#1)", "ORVASchedTaskAlloc()"));
}

TEST_F(TypedMethodTest, GetTrustsAGivenTypeMoreThanTheStoredOne) {
    Add(5, "ORVA.ZUM.TaskScheduler.Script", "{\"beep_duration\":\"90\"}\n");
    EXPECT_NE(Extra(R"({"id": 5, "type": "beep"})").find("beep_duration"), std::string::npos);
    // The kind was not looked up: the only record is the handler's.
    EXPECT_EQ(platform.Calls("ORVASchedTaskAlloc"), 1);
}

TEST_F(TypedMethodTest, GetAnswersTheBlankFormOfANewTask) {
    EXPECT_EQ(Extra(R"({"id": -1, "type": "script"})"), R"({"script":""})");
}

TEST_F(TypedMethodTest, GetRefusesAnUnknownTypeAndLogsIt) {
    Add(5, "ORVA.ZUM.TaskScheduler.Script", "{}");
    for (const std::string type : {"Beep", "BEEP", "beep ", "", "other"}) {
        platform.ClearJournal();
        EXPECT_EQ(Call("get", R"({"id": 5, "type": ")" + type + "\"}"), "error 4800 null") << type;
        EXPECT_THAT(platform.FullJournal(),
                    ElementsAre("LOG_ERR main.cpp:95 Unknown app type: " + type));
    }
}

TEST_F(TypedMethodTest, GetAnswersThatATaskCannotBeFound) {
    EXPECT_EQ(Call("get", R"({"id": 9})"), "error 4801 null");
    EXPECT_THAT(platform.FullJournal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(9, #1)",
                            "LOG_ERR lib.cpp:43 load task failed. id:[9] [0x0300 store.cpp:1]",
                            "ORVASchedTaskFree(#1)"));
}

TEST_F(TypedMethodTest, GetAndSetAnswerThatTheKindCannotBeFoundWithoutAMessage) {
    Add(5, "ORVA.ZUM.TaskScheduler.Recycle", "{}");
    for (const std::string method : {"get", "set"}) {
        platform.ClearJournal();
        platform.FailCall("ORVASchedTaskAlloc");
        EXPECT_EQ(Call(method, R"({"id": 5})"), "error 4801 null") << method;
        EXPECT_THAT(platform.FullJournal(),
                    ElementsAre("ORVASchedTaskAlloc()",
                                "LOG_ERR lib.cpp:38 alloc task failed. id:[5] "
                                "[0x0900 platform.cpp:42]"))
            << method;
    }
}

TEST_F(TypedMethodTest, GetAndSetAnswerThatTheKindCannotBeConvertedWithoutAMessage) {
    Add(5, "ORVA.ZUM.TaskScheduler.Recycle", "{}");
    for (const auto& [method, record] :
         std::vector<std::pair<std::string, std::string>>{{"get", "#1"}, {"set", "#2"}}) {
        platform.ClearJournal();
        platform.FailCall("ORVASchedTaskConvertToJson_Basic");
        EXPECT_EQ(Call(method, R"({"id": 5})"), "error 4801 null") << method;
        EXPECT_THAT(platform.FullJournal(),
                    ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, " + record + ")",
                                "ORVASchedTaskConvertToJson_Basic(" + record + ")",
                                "LOG_ERR lib.cpp:48 convert task to json (basic) faield. id:[5] "
                                "[0x0900 platform.cpp:42]",
                                "ORVASchedTaskFree(" + record + ")"))
            << method;
    }
}

// Somebody deletes the task after its kind was found.
TEST_F(TypedMethodTest, GetOfATaskThatVanishesMeanwhileIsAnsweredWithAMessage) {
    Add(5, "ORVA.ZUM.TaskScheduler.Script", "{}");
    platform.FailCall("ORVASchedTaskLoad", 2, {0x0300, "store.cpp", 1});
    EXPECT_EQ(Call("get", R"({"id": 5})"), R"(error 4801 {"msg":"Failed to load task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                            "ORVASchedTaskConvertToJson_Basic(#1)", "ORVASchedTaskFree(#1)",
                            "ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #2)",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:150 load task failed. "
                            "id:[5] [0x0300 store.cpp:1]",
                            "ORVASchedTaskFree(#2)"));
}

TEST_F(TypedMethodTest, SetOfATaskThatVanishesMeanwhileIsAnsweredWithAMessage) {
    for (const auto& [kind, record] :
         std::vector<std::pair<std::string, int>>{{"Recycle", 1}, {"Service", 3}}) {
        const std::string first = "#" + std::to_string(record);
        const std::string second = "#" + std::to_string(record + 1);
        Add(5, "ORVA.ZUM.TaskScheduler." + kind, "{}");
        platform.ClearJournal();
        platform.FailCall("ORVASchedTaskLoad", 2, {0x0300, "store.cpp", 1});
        EXPECT_EQ(Call("set", R"({"id": 5, "name": "edited", "extra": {}})"),
                  R"(error 4801 {"msg":"Failed to load task"})")
            << kind;
        EXPECT_THAT(
            platform.Journal(),
            ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, " + first + ")",
                        "ORVASchedTaskConvertToJson_Basic(" + first + ")",
                        "ORVASchedTaskFree(" + first + ")", "ORVASchedTaskAlloc()",
                        "ORVASchedTaskLoad(5, " + second + ")",
                        "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:108 load task failed. id:[5] "
                        "[0x0300 store.cpp:1]",
                        "ORVASchedTaskFree(" + second + ")",
                        "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:222 Convert task from json "
                        "(app) failed. [0x0300 store.cpp:1]"))
            << kind;
        EXPECT_EQ(platform.tasks[5].name, "task 5") << kind;
    }
}

TEST_F(TypedMethodTest, GetOfMinusOneWithoutATypeAnswersTheBlankFormOfACustomTask) {
    EXPECT_EQ(Call("get", R"({"id": -1})"),
              R"(success {"action":"","can_edit_name":true,"can_edit_owner":false,"enable":true,)"
              R"("extra":null,"id":-1,"name":"","owner":"admin",)"
              R"("schedule":{"minute":null,"repeat_date":null,"week_day":null},)"
              R"("type":"custom"})");
}

TEST_F(TypedMethodTest, SetOfMinusOneCannotBeSaved) {
    EXPECT_EQ(Call("set", R"({"id": -1, "name": "new", "extra": {"script": "date"}})"),
              R"(error 117 {"msg":"Failed to save task"})");
    EXPECT_THAT(platform.Log(), ElementsAre("ORVA.Core.TaskScheduler.Basic.cpp:251 Save task "
                                            "failed. [0x0300 store.cpp:1]"));
    EXPECT_EQ(platform.Calls("ORVASchedTaskFree"), 2);
    EXPECT_THAT(platform.tasks, IsEmpty());
}

TEST_F(TypedMethodTest, SetRefusesAMissingOrMalformedId) {
    Add(5, "ORVA.ZUM.TaskScheduler.Script", "{}");
    for (const std::string parameters :
         {R"({})", R"({"id": "5"})", R"({"id": 5.0})", R"({"id": null})"}) {
        EXPECT_EQ(Call("set", parameters), "error 4800 null") << parameters;
    }
    EXPECT_THAT(platform.Journal(), IsEmpty());
}

TEST_F(TypedMethodTest, SetAnswersThatATaskCannotBeFound) {
    EXPECT_EQ(Call("set", R"({"id": 9, "type": "script"})"), "error 4801 null");
    EXPECT_THAT(platform.Log(),
                ElementsAre("lib.cpp:43 load task failed. id:[9] [0x0300 store.cpp:1]"));
}

TEST_F(TypedMethodTest, SetPaysNoAttentionToAType) {
    Add(5, "ORVA.ZUM.TaskScheduler.Script", "{\"script\":\"date\"}\n");
    for (const std::string type : {R"("beep")", R"("unknown")", "5", "null"}) {
        EXPECT_EQ(Call("set", R"({"id": 5, "extra": {"script": "uptime"}, "type": )" + type + "," +
                                  kEdited + "}"),
                  R"(success {"id":5})")
            << type;
        EXPECT_EQ(platform.tasks[5].command, "uptime") << type;
    }
}

TEST_F(TypedMethodTest, SetServesATaskOfAnUnknownApplicationAsACustomOne) {
    Add(5, "com.example.Notes", "kept as it is");
    platform.tasks[5].command = "tidy-notes";
    EXPECT_EQ(Call("set", R"({"id": 5,)" + std::string(kEdited) + "}"), R"(success {"id":5})");
    EXPECT_EQ(platform.tasks[5].name, "edited");
    EXPECT_EQ(platform.tasks[5].app, "com.example.Notes");
    EXPECT_EQ(platform.tasks[5].appArgs, "kept as it is");
    EXPECT_EQ(platform.tasks[5].command, "tidy-notes");
}

TEST_F(TypedMethodTest, GetServesATaskOfABasicKindWithoutItsApplicationSection) {
    for (const std::string app :
         {"ORVA.ZUM.DataAnalysis", "ORVA.ZUM.TaskScheduler.AutoPower",
          "ORVA.ZUM.TaskScheduler.KELAutoUpdate", "ORVA.ZUM.BackupApp.NetBackup",
          "ORVA.ZUM.BackupApp.LocalBackup", "ORVA.ZUM.BackupApp.LUNBackup",
          "ORVA.ZUM.BackupApp.S3Backup", "com.example.Notes"}) {
        Add(5, app, R"({"script":"date"})");
        EXPECT_EQ(Extra(R"({"id": 5})"), "null") << app;
    }
}

TEST_F(TypedMethodTest, GetKnowsEveryKindByItsKey) {
    for (const auto& [type, members] : std::vector<std::pair<std::string, std::string>>{
             {"beep", "beep_duration"},
             {"script", "script"},
             {"service", "action services"},
             {"recycle", "clean_file_policy clean_share_policy"},
             {"custom", ""},
             {"report", ""},
             {"backup", ""},
             {"power", ""},
             {"kelupdate", ""}}) {
        const Json::Value extra = fakes::Document(Extra(R"({"id": -1, "type": ")" + type + "\"}"));
        std::string names;
        for (auto at = extra.begin(); at != extra.end(); ++at) {
            names += (names.empty() ? "" : " ") + at.name();
        }
        EXPECT_EQ(names, members) << type;
    }
}

// The edit form that a saved task names tells the handler that saved it.
TEST_F(TypedMethodTest, SetServesATaskWithTheHandlerOfItsApplication) {
    for (const auto& [kind, extra] :
         std::vector<std::pair<std::string, std::string>>{{"Beep", R"({"beep_duration": 5})"},
                                                          {"Script", R"({"script": "date"})"},
                                                          {"Service", R"({"action": "start"})"},
                                                          {"Recycle", R"({})"}}) {
        Add(5, "ORVA.ZUM.TaskScheduler." + kind,
            R"({"beep_duration": 60, "script": "", "service_action": "0", "clean_all": "yes",
                "service_store": [{"name": "NTP", "enabled": true, "service_type": 1}],
                "recycle_action": "2"})");
        EXPECT_EQ(Call("set", R"({"id": 5, "extra": )" + extra + "," + kEdited + "}"),
                  R"(success {"id":5})")
            << kind;
        EXPECT_EQ(platform.tasks[5].editForm, "ORVA.ZUM.TaskScheduler." + kind + ".FormPanel");
    }
}

}  // namespace
