// Storing a task of any kind.
#include <string>

#include "tests/src/BasicTask.h"

namespace fakes {
namespace {

using ::testing::ElementsAre;

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

}  // namespace
}  // namespace fakes
