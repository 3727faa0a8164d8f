#include "include/TaskSchedulerBasicHandler.h"

#include <cstddef>
#include <cstring>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <vector>

#include "include/TaskSchedulerBeepHandler.h"
#include "include/TaskSchedulerRecycleHandler.h"
#include "include/TaskSchedulerScriptHandler.h"
#include "include/TaskSchedulerServiceHandler.h"
#include "tests/src/TypedHandlers.h"

namespace fakes {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kGetOne = R"({"id":5})";
constexpr const char* kSetOne =
    R"({"id":5,"name":"New name","owner":"eva","enable":true,)"
    R"("schedule":{"minute":15,"week_day":"2","repeat_date":"daily","hour":4},"extra":{"a":1}})";

#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wnon-virtual-dtor"

// A kind whose operations succeed or fail as the test says.
class ScriptedKind : public TaskSchedulerBasicHandler {
  public:
    using TaskSchedulerBasicHandler::TaskSchedulerBasicHandler;

    static inline bool writesApp, readsApp, toForm, fromForm, usesStoredApp;
    static void Reset() {
        writesApp = readsApp = toForm = fromForm = true;
        usesStoredApp = false;
    }

    bool ConvertToJson_App(const _tag_orva_sched_task_&, Json::Value& document) override {
        document["app"]["stored"] = true;
        return writesApp;
    }
    bool ConvertFromJson_App(const Json::Value&, _tag_orva_sched_task_& task) override {
        ORVASchedCTaskSetApp(&task, "ORVA.Test");
        return readsApp;
    }
    bool ReConstructJsonGet_App(Json::Value& app) override {
        app["shown"] = true;
        return toForm;
    }
    bool ReConstructJsonSet_App(Json::Value& app) override {
        if (usesStoredApp) {
            return GetOriginAppObj(app);
        }
        app["kept"] = true;
        return fromForm;
    }
    bool GetAppEditOwnerValue() override { return true; }
};

// The whole document that a kind gets to see.
class DocumentKind : public ScriptedKind {
  public:
    using ScriptedKind::ScriptedKind;
    static inline std::string document;
    bool ConvertFromJson_App(const Json::Value& given, _tag_orva_sched_task_& task) override {
        document = Compact(given);
        return ScriptedKind::ConvertFromJson_App(given, task);
    }
};

#pragma GCC diagnostic pop

class BasicHandler : public PlatformTest {
  protected:
    void SetUp() override {
        ScriptedKind::Reset();
        platform.AddTask(StoredTask(5, "ORVA.ZUM.DataAnalysis", "kept"));
        platform.lastError = {0x0D00, "kind.cpp", 7};
    }
};

// --- Get ---------------------------------------------------------------------------------------

TEST_F(BasicHandler, GetAnswersTheEditorsFormOfATask) {
    Task& task = platform.tasks[5];
    task.basic = Document(
        R"({"id":5,"task_name":"Job","owner":"eva","enabled":"on","app":"ORVA.ZUM.DataAnalysis",)"
        R"("action":"Report","can_edit_name":false,"more":1})");
    task.schedule = Document(R"({"min":30,"week_name":"1,3","repeat":"never","hour":4,)"
                             R"("next_trigger_time":"2030-01-02 03:04"})");

    EXPECT_EQ(Serve<TaskSchedulerBasicHandler>("get", kGetOne),
              R"(success {"action":"Report","can_edit_name":false,"can_edit_owner":false,)"
              R"("enable":true,"extra":null,"id":5,"name":"Job","owner":"eva",)"
              R"("schedule":{"hour":4,"minute":30,"repeat_date":"never","week_day":"1,3"},)"
              R"("type":"report"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                            "ORVASchedTaskConvertToJson_Basic(#1)",
                            "ORVASchedTaskConvertToJson_Schedule(#1)", "ORVASchedTaskFree(#1)"));
}

TEST_F(BasicHandler, GetAnswersNullForEveryMemberThatTheStoreDoesNotName) {
    platform.tasks[5].basic = Json::Value(Json::objectValue);
    platform.tasks[5].schedule = Json::Value();

    EXPECT_EQ(Serve<TaskSchedulerBasicHandler>("get", kGetOne),
              R"(success {"action":null,"can_edit_name":null,"can_edit_owner":false,)"
              R"("enable":false,"extra":null,"id":null,"name":null,"owner":null,)"
              R"("schedule":{"minute":null,"repeat_date":null,"week_day":null},)"
              R"("type":"custom"})");
}

TEST_F(BasicHandler, GetAnswersNullExtraForACustomTaskAndLetsItsOwnerBe) {
    platform.AddTask(StoredTask(6, "Somebody.Else", "{\"a\":1}"));
    EXPECT_EQ(Serve<TaskSchedulerBasicHandler>("get", R"({"id":6})"),
              R"(success {"action":"","can_edit_name":true,"can_edit_owner":false,"enable":true,)"
              R"("extra":null,"id":6,"name":"Job","owner":"admin",)"
              R"("schedule":{"minute":30,"repeat_date":"never","week_day":"1,3"},)"
              R"("type":"custom"})");
}

TEST_F(BasicHandler, GetShowsTheKindsFormAndItsOwnerRule) {
    EXPECT_EQ(Serve<ScriptedKind>("get", kGetOne),
              R"(success {"action":"","can_edit_name":true,"can_edit_owner":true,"enable":true,)"
              R"("extra":{"shown":true,"stored":true},"id":5,"name":"Job","owner":"admin",)"
              R"("schedule":{"minute":30,"repeat_date":"never","week_day":"1,3"},)"
              R"("type":"report"})");
}

TEST_F(BasicHandler, GetTakesEnabledInAnyCaseAndNothingElseForEnabled) {
    const auto enable = [&](const std::string& enabled) {
        platform.tasks[5].basic = Document("{\"enabled\":" + enabled + "}");
        const std::string answer = Serve<TaskSchedulerBasicHandler>("get", kGetOne);
        return answer.find("\"enable\":true") != std::string::npos;
    };
    EXPECT_TRUE(enable("\"on\""));
    EXPECT_TRUE(enable("\"ON\""));
    EXPECT_TRUE(enable("\"oN\""));
    EXPECT_FALSE(enable("\"off\""));
    EXPECT_FALSE(enable("\"onn\""));
    EXPECT_FALSE(enable("\"o\""));
    EXPECT_FALSE(enable("\"\""));
    EXPECT_FALSE(enable("true"));
    EXPECT_FALSE(enable("null"));
}

TEST_F(BasicHandler, GetTranslatesTheActionForTheOwningApplication) {
    platform.tasks[5].action = "#beep:beep_title# now";
    platform.texts["/usr/orva/orvaman/webman/texts/enu"] =
        Document(R"({"beep":{"beep_title":"Beep"}})");
    const std::string answer = Serve<TaskSchedulerBasicHandler>("get", kGetOne);
    EXPECT_NE(answer.find(R"("action":"Beep now")"), std::string::npos) << answer;
}

TEST_F(BasicHandler, GetOfMinusOneAnswersTheBlankFormOfACustomTask) {
    EXPECT_EQ(Serve<TaskSchedulerBasicHandler>("get", R"({"id":-1})"),
              R"(success {"action":"","can_edit_name":true,"can_edit_owner":false,"enable":true,)"
              R"("extra":null,"id":-1,"name":"","owner":"admin",)"
              R"("schedule":{"minute":null,"repeat_date":null,"week_day":null},)"
              R"("type":"custom"})");
}

TEST_F(BasicHandler, GetRefusesAnIdThatIsMissingOrNoInteger) {
    for (const char* parameters : {"{}", R"({"id":"5"})", R"({"id":5.0})", R"({"id":null})",
                                   R"({"id":4294967301})", R"({"id":[5]})"}) {
        EXPECT_EQ(Serve<TaskSchedulerBasicHandler>("get", parameters),
                  R"(error 4800 {"msg":"id is invalid"})")
            << parameters;
    }
    EXPECT_THAT(platform.Journal(), IsEmpty());
}

TEST_F(BasicHandler, GetWithoutARecordIsLoggedAndAnswered) {
    platform.FailCall("ORVASchedTaskAlloc");
    EXPECT_EQ(Serve<ScriptedKind>("get", kGetOne),
              R"(error 117 {"msg":"Failed to allocate task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:144 alloc task failed. "
                            "id:[5] [0x0900 platform.cpp:42]"));
}

TEST_F(BasicHandler, GetOfAnUnknownTaskIsLoggedAndAnswered) {
    EXPECT_EQ(Serve<ScriptedKind>("get", R"({"id":77})"),
              R"(error 4801 {"msg":"Failed to load task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(77, #1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:150 load task failed. "
                            "id:[77] [0x0300 store.cpp:1]",
                            "ORVASchedTaskFree(#1)"));
}

TEST_F(BasicHandler, GetWithoutTheBasicSectionIsLoggedAndAnswered) {
    platform.FailCall("ORVASchedTaskConvertToJson_Basic");
    EXPECT_EQ(Serve<ScriptedKind>("get", kGetOne),
              R"(error 117 {"msg":"Failed to convert basic object"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                            "ORVASchedTaskConvertToJson_Basic(#1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:156 convert task to json "
                            "(basic) faield. id:[5] [0x0900 platform.cpp:42]",
                            "ORVASchedTaskFree(#1)"));
}

TEST_F(BasicHandler, GetWithoutTheScheduleIsLoggedAndAnswered) {
    platform.FailCall("ORVASchedTaskConvertToJson_Schedule");
    EXPECT_EQ(Serve<ScriptedKind>("get", kGetOne),
              R"(error 117 {"msg":"Failed to convert schedule object"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                            "ORVASchedTaskConvertToJson_Basic(#1)",
                            "ORVASchedTaskConvertToJson_Schedule(#1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:162 convert task to json "
                            "(schedule) faield. id:[5] [0x0900 platform.cpp:42]",
                            "ORVASchedTaskFree(#1)"));
}

TEST_F(BasicHandler, GetOfAKindThatCannotReadItsSectionIsLoggedAndAnswered) {
    ScriptedKind::writesApp = false;
    EXPECT_EQ(Serve<ScriptedKind>("get", kGetOne),
              R"(error 117 {"msg":"Failed to convert app object"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                            "ORVASchedTaskConvertToJson_Basic(#1)",
                            "ORVASchedTaskConvertToJson_Schedule(#1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:168 convert task to json "
                            "(app) faield. id:[5] [0x0D00 kind.cpp:7]",
                            "ORVASchedTaskFree(#1)"));
}

TEST_F(BasicHandler, GetOfAKindThatCannotShowItsSectionIsLoggedAndAnswered) {
    ScriptedKind::toForm = false;
    EXPECT_EQ(Serve<ScriptedKind>("get", kGetOne),
              R"(error 117 {"msg":"Failed to convert app object"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                            "ORVASchedTaskConvertToJson_Basic(#1)",
                            "ORVASchedTaskConvertToJson_Schedule(#1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:185 Convert task from json "
                            "(app) failed. [0x0D00 kind.cpp:7]",
                            "ORVASchedTaskFree(#1)"));
}

// --- Set ---------------------------------------------------------------------------------------

TEST_F(BasicHandler, SetRebuildsTheTaskFromTheRequestAndAnswersItsId) {
    EXPECT_EQ(Serve<TaskSchedulerBasicHandler>("set", kSetOne), R"(success {"id":5})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()",
                            R"(ORVASchedTaskConvertFromJson_Basic({"enabled":"on","id":"5",)"
                            R"("owner":"eva","task_name":"New name"}, #1))",
                            R"(ORVASchedTaskConvertFromJson_Schedule({"hour":4,"min":15,)"
                            R"("repeat":"daily","week_name":"2"}, #1))",
                            "ORVASchedTaskSave(#1)", "ORVASchedTaskFree(#1)"));
    const Task& task = platform.tasks[5];
    EXPECT_EQ(task.name, "New name");
    EXPECT_EQ(task.owner, "eva");
    EXPECT_EQ(task.app, "ORVA.ZUM.DataAnalysis");
    EXPECT_EQ(task.appArgs, "kept");
}

TEST_F(BasicHandler, SetWithoutAnIdCreatesATaskAndAnswersItsId) {
    EXPECT_EQ(Serve<ScriptedKind>("set", R"({"name":"New","enable":true})"),
              R"(success {"id":100})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()",
                            R"(ORVASchedTaskConvertFromJson_Basic({"enabled":"on","id":"-1",)"
                            R"("owner":null,"task_name":"New"}, #1))",
                            R"(ORVASchedTaskConvertFromJson_Schedule({"min":null,)"
                            R"("repeat":null,"week_name":null}, #1))",
                            R"(ORVASchedCTaskSetApp(#1, "ORVA.Test"))", "ORVASchedTaskSave(#1)",
                            "ORVASchedTaskFree(#1)"));
    EXPECT_EQ(platform.tasks[100].name, "New");
}

TEST_F(BasicHandler, SetWithoutAnyMemberStoresNullsAndADisabledTask) {
    platform.FailCall("ORVASchedTaskSave");
    Serve<ScriptedKind>("set", "{}");
    EXPECT_EQ(platform.Journal()[1],
              R"(ORVASchedTaskConvertFromJson_Basic({"enabled":"off","id":"-1","owner":null,)"
              R"("task_name":null}, #1))");
    EXPECT_EQ(platform.Journal()[2],
              R"(ORVASchedTaskConvertFromJson_Schedule({"min":null,"repeat":null,)"
              R"("week_name":null}, #1))");
}

TEST_F(BasicHandler, SetReplacesTheRequestsOwnStoreSectionsAndCarriesOtherMembersAlong) {
    EXPECT_EQ(Serve<DocumentKind>(
                  "set", R"({"id":5,"name":"Job","basic":{"x":1},"app":{"y":2},"other":[3],)"
                         R"("schedule":{"min":1,"repeat":"old","week_name":"old","hour":2}})"),
              R"(success {"id":5})");
    EXPECT_EQ(DocumentKind::document,
              R"({"app":{"kept":true},"basic":{"enabled":"off","id":"5","owner":null,)"
              R"("task_name":"Job"},"other":[3],)"
              R"("schedule":{"hour":2,"min":null,"repeat":null,"week_name":null}})");
}

TEST_F(BasicHandler, SetHandsTheFormsExtraToTheKindAsItsSection) {
    Serve<DocumentKind>("set", kSetOne);
    EXPECT_EQ(DocumentKind::document,
              R"({"app":{"a":1,"kept":true},"basic":{"enabled":"on","id":"5","owner":"eva",)"
              R"("task_name":"New name"},)"
              R"("schedule":{"hour":4,"min":15,"repeat":"daily","week_name":"2"}})");
}

TEST_F(BasicHandler, SetTakesEnableAsABoolean) {
    const auto enabled = [&](const std::string& enable) {
        platform.ClearJournal();
        Serve<TaskSchedulerBasicHandler>("set", R"({"id":5,"enable":)" + enable + "}");
        return platform.tasks[5].enabled;
    };
    EXPECT_TRUE(enabled("true"));
    EXPECT_FALSE(enabled("false"));
    EXPECT_TRUE(enabled("1"));
    EXPECT_FALSE(enabled("0"));
    EXPECT_TRUE(enabled("0.5"));
    EXPECT_FALSE(enabled("null"));
}

TEST_F(BasicHandler, SetNamesANumericIdByItsDecimalText) {
    platform.AddTask(StoredTask(2147483647, "Somebody.Else", ""));
    EXPECT_EQ(Serve<TaskSchedulerBasicHandler>("set", R"({"id":2147483647})"),
              R"(success {"id":2147483647})");
}

TEST_F(BasicHandler, SetThatTheKindCannotReshapeIsLoggedAndAnswered) {
    ScriptedKind::fromForm = false;
    EXPECT_EQ(Serve<ScriptedKind>("set", kSetOne), R"(error 4800 {"msg":"invalid (app) object"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:222 Convert task from json "
                            "(app) failed. [0x0D00 kind.cpp:7]"));
}

TEST_F(BasicHandler, SetWithoutARecordIsLoggedAndAnswered) {
    platform.FailCall("ORVASchedTaskAlloc");
    EXPECT_EQ(Serve<ScriptedKind>("set", kSetOne), R"(error 117 {"msg":"Failed to new task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:229 Failed to new task. "
                            "[0x0900 platform.cpp:42]"));
}

constexpr const char* kBasicLine =
    R"(ORVASchedTaskConvertFromJson_Basic({"enabled":"on","id":"5","owner":"eva",)"
    R"("task_name":"New name"}, #1))";
constexpr const char* kScheduleLine =
    R"(ORVASchedTaskConvertFromJson_Schedule({"hour":4,"min":15,"repeat":"daily",)"
    R"("week_name":"2"}, #1))";

TEST_F(BasicHandler, SetWithABasicSectionThatTheStoreRefusesIsLoggedAndAnswered) {
    platform.FailCall("ORVASchedTaskConvertFromJson_Basic");
    EXPECT_EQ(Serve<ScriptedKind>("set", kSetOne), R"(error 117 {"msg":"Invalid (basic) object"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", kBasicLine,
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:234 Convert task from json "
                            "(basic) failed. [0x0900 platform.cpp:42]",
                            "ORVASchedTaskFree(#1)"));
}

TEST_F(BasicHandler, SetWithAScheduleThatTheStoreRefusesIsLoggedAndAnswered) {
    platform.FailCall("ORVASchedTaskConvertFromJson_Schedule");
    EXPECT_EQ(Serve<ScriptedKind>("set", kSetOne),
              R"(error 117 {"msg":"Invalid (schedule) object"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", kBasicLine, kScheduleLine,
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:239 Convert task from json "
                            "(schedule) failed. [0x0900 platform.cpp:42]",
                            "ORVASchedTaskFree(#1)"));
}

TEST_F(BasicHandler, SetThatTheKindRefusesIsLoggedAndAnswered) {
    ScriptedKind::readsApp = false;
    EXPECT_EQ(Serve<ScriptedKind>("set", kSetOne), R"(error 117 {"msg":"Invalid (app) object"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", kBasicLine, kScheduleLine,
                            R"(ORVASchedCTaskSetApp(#1, "ORVA.Test"))",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:244 Convert task from json "
                            "(app) failed. [0x0D00 kind.cpp:7]",
                            "ORVASchedTaskFree(#1)"));
    EXPECT_EQ(platform.tasks[5].name, "Job");
}

TEST_F(BasicHandler, SetThatCannotBeSavedIsLoggedAndAnswered) {
    platform.FailCall("ORVASchedTaskSave");
    EXPECT_EQ(Serve<ScriptedKind>("set", kSetOne), R"(error 117 {"msg":"Failed to save task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", kBasicLine, kScheduleLine,
                            R"(ORVASchedCTaskSetApp(#1, "ORVA.Test"))", "ORVASchedTaskSave(#1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:251 Save task failed. "
                            "[0x0900 platform.cpp:42]",
                            "ORVASchedTaskFree(#1)"));
    EXPECT_EQ(platform.tasks[5].name, "Job");
}

// --- The section as it is stored now -------------------------------------------------------------

class StoredSection : public BasicHandler {
  protected:
    void SetUp() override {
        BasicHandler::SetUp();
        ScriptedKind::usesStoredApp = true;
    }

    // Whether it could be had, and what it then held.
    static std::string Read(const std::string& parameters) {
        ORVA::APIRequest request = Request(parameters);
        ORVA::APIResponse response;
        ScriptedKind handler(&request, &response);
        Json::Value app = "untouched";
        const bool had = handler.GetOriginAppObj(app);
        return (had ? "true " : "false ") + Compact(app);
    }
};

TEST_F(StoredSection, IsReadFromTheTaskThatTheRequestNames) {
    EXPECT_EQ(Read(R"({"id":5})"), R"(true {"stored":true})");
    EXPECT_THAT(platform.Journal(), ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                                                "ORVASchedTaskFree(#1)"));
}

TEST_F(StoredSection, OfARequestWithoutAnIdIsThatOfANewTask) {
    EXPECT_EQ(Read("{}"), R"(true {"stored":true})");
    EXPECT_THAT(platform.Journal(), ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(-1, #1)",
                                                "ORVASchedTaskFree(#1)"));
}

TEST_F(StoredSection, TakesTheLeadingDigitsOfAnIdThatIsText) {
    Read(R"({"id":" 5x"})");
    Read(R"({"id":"x"})");
    Read(R"({"id":null})");
    EXPECT_EQ(platform.Journal()[1], "ORVASchedTaskLoad(5, #1)");
    EXPECT_EQ(platform.Journal()[4], "ORVASchedTaskLoad(0, #2)");
    EXPECT_EQ(platform.Calls("ORVASchedTaskLoad"), 3);
    EXPECT_EQ(platform.Journal()[8], "ORVASchedTaskLoad(0, #3)");
}

TEST_F(StoredSection, NeverTakesAnIdBeyondTheRangeForAnother) {
    EXPECT_EQ(Read(R"({"id":"4294967301"})"), R"(false "untouched")");
    EXPECT_EQ(Read(R"({"id":"-99999999999999999999"})"), R"(false "untouched")");
    EXPECT_EQ(platform.Journal()[1], "ORVASchedTaskLoad(2147483647, #1)");
    EXPECT_EQ(platform.Journal()[5], "ORVASchedTaskLoad(-2147483648, #2)");
}

TEST_F(StoredSection, WithoutARecordIsLoggedAndItsErrorIsTheOneAnswered) {
    platform.FailCall("ORVASchedTaskAlloc");
    EXPECT_EQ(Serve<ScriptedKind>("set", kSetOne),
              R"(error 117 {"msg":"Failed to allocate task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:102 alloc task failed. "
                            "id:[5] [0x0900 platform.cpp:42]",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:222 Convert task from json "
                            "(app) failed. [0x0900 platform.cpp:42]"));
}

TEST_F(StoredSection, OfAnUnknownTaskIsLoggedAndItsErrorIsTheOneAnswered) {
    platform.FailCall("ORVASchedTaskLoad");
    EXPECT_EQ(Serve<ScriptedKind>("set", kSetOne), R"(error 4801 {"msg":"Failed to load task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:108 load task failed. "
                            "id:[5] [0x0900 platform.cpp:42]",
                            "ORVASchedTaskFree(#1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:222 Convert task from json "
                            "(app) failed. [0x0900 platform.cpp:42]"));
}

TEST_F(StoredSection, ThatTheKindCannotReadIsLoggedAndItsErrorIsTheOneAnswered) {
    ScriptedKind::writesApp = false;
    EXPECT_EQ(Serve<ScriptedKind>("set", kSetOne),
              R"(error 117 {"msg":"Failed to convert app object"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:114 convert task to json "
                            "(app) faield. id:[5] [0x0D00 kind.cpp:7]",
                            "ORVASchedTaskFree(#1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:222 Convert task from json "
                            "(app) failed. [0x0D00 kind.cpp:7]"));
}

// --- Dispatch and form ---------------------------------------------------------------------------

TEST_F(BasicHandler, OtherMethodsLeaveTheResponseUntouched) {
    for (const char* method : {"create", "delete", "list", "Get", "SET", "get ", ""}) {
        EXPECT_EQ(Serve<ScriptedKind>(method, kSetOne), "nothing") << method;
    }
    EXPECT_EQ(Serve<ScriptedKind>(nullptr, kSetOne), "nothing");
    EXPECT_THAT(platform.Journal(), IsEmpty());
}

TEST_F(BasicHandler, OnlyScriptTasksMayChangeTheirOwner) {
    ORVA::APIRequest request = Request("{}");
    ORVA::APIResponse response;
    EXPECT_FALSE(TaskSchedulerBasicHandler(&request, &response).GetAppEditOwnerValue());
    EXPECT_FALSE(TaskSchedulerBeepHandler(&request, &response).GetAppEditOwnerValue());
    EXPECT_TRUE(TaskSchedulerScriptHandler(&request, &response).GetAppEditOwnerValue());
    EXPECT_FALSE(TaskSchedulerRecycleHandler(&request, &response).GetAppEditOwnerValue());
    EXPECT_FALSE(TaskSchedulerServiceHandler(&request, &response).GetAppEditOwnerValue());
}

// The place of a virtual operation in the dispatch table, as its pointer tells: the first word
// holds the place in bytes, on some machines with the lowest bit set.
template <class Operation>
std::size_t SlotOf(Operation operation) {
    std::size_t word = 0;
    static_assert(sizeof(operation) == 2 * sizeof(word));
    std::memcpy(&word, &operation, sizeof(word));
    return word / sizeof(void*);
}

TEST_F(BasicHandler, TheFiveOperationsOfAKindStandInTheDispatchTableInTheirOrder) {
    EXPECT_EQ(SlotOf(&TaskSchedulerBasicHandler::ConvertToJson_App), 0U);
    EXPECT_EQ(SlotOf(&TaskSchedulerBasicHandler::ConvertFromJson_App), 1U);
    EXPECT_EQ(SlotOf(&TaskSchedulerBasicHandler::ReConstructJsonGet_App), 2U);
    EXPECT_EQ(SlotOf(&TaskSchedulerBasicHandler::ReConstructJsonSet_App), 3U);
    EXPECT_EQ(SlotOf(&TaskSchedulerBasicHandler::GetAppEditOwnerValue), 4U);
}

TEST_F(BasicHandler, KindsAddNoFieldsAndNoVirtualDestructor) {
    EXPECT_EQ(sizeof(TaskSchedulerBasicHandler), sizeof(TaskSchedulerHandler) + sizeof(void*));
    EXPECT_EQ(sizeof(TaskSchedulerBeepHandler), sizeof(TaskSchedulerBasicHandler));
    EXPECT_EQ(sizeof(TaskSchedulerScriptHandler), sizeof(TaskSchedulerBasicHandler));
    EXPECT_EQ(sizeof(TaskSchedulerRecycleHandler), sizeof(TaskSchedulerBasicHandler));
    EXPECT_EQ(sizeof(TaskSchedulerServiceHandler), sizeof(TaskSchedulerBasicHandler));
    EXPECT_FALSE(std::has_virtual_destructor_v<TaskSchedulerBasicHandler>);
    EXPECT_FALSE(std::has_virtual_destructor_v<TaskSchedulerServiceHandler>);
}

// --- Exceptions ----------------------------------------------------------------------------------

TEST_F(BasicHandler, AnExceptionFromAnyCallOfThePlatformFreesTheRecord) {
    for (const char* function :
         {"ORVASchedTaskAlloc", "ORVASchedTaskLoad", "ORVASchedTaskConvertToJson_Basic",
          "ORVASchedTaskConvertToJson_Schedule"}) {
        platform.ThrowFrom(function);
        EXPECT_THROW(Serve<ScriptedKind>("get", kGetOne), std::runtime_error) << function;
        EXPECT_EQ(platform.Leftovers(), "") << function;
    }
    for (const char* function :
         {"ORVASchedTaskAlloc", "ORVASchedTaskConvertFromJson_Basic",
          "ORVASchedTaskConvertFromJson_Schedule", "ORVASchedCTaskSetApp", "ORVASchedTaskSave"}) {
        platform.ThrowFrom(function);
        EXPECT_THROW(Serve<ScriptedKind>("set", kSetOne), std::runtime_error) << function;
        EXPECT_EQ(platform.Leftovers(), "") << function;
    }
}

TEST_F(BasicHandler, ParametersOfAWrongTypeEndAsAnExceptionBeforeAnythingIsTouched) {
    for (const char* parameters :
         {R"({"id":5,"schedule":5})", R"({"id":5,"schedule":[1]})", R"({"id":5,"enable":"yes"})",
          R"({"id":5,"enable":{}})", R"({"id":{}})", R"({"id":[5]})"}) {
        EXPECT_THROW(Serve<TaskSchedulerBasicHandler>("set", parameters), Json::LogicError)
            << parameters;
    }
    EXPECT_THAT(platform.Journal(), IsEmpty());
}

}  // namespace
}  // namespace fakes
