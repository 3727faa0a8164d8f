#include "include/TaskSchedulerBasicHandler.h"

#include <cstddef>
#include <cstring>
#include <stdexcept>
#include <string>
#include <type_traits>

#include "include/TaskSchedulerBeepHandler.h"
#include "include/TaskSchedulerRecycleHandler.h"
#include "include/TaskSchedulerScriptHandler.h"
#include "include/TaskSchedulerServiceHandler.h"
#include "tests/src/BasicTask.h"

namespace fakes {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

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
