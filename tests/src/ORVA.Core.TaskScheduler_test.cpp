#include <string>
#include <utility>
#include <vector>

#include "include/TaskSchedulerHandler.h"
#include "tests/src/ModuleTest.h"

namespace {

using ::testing::ElementsAre;

// --- The frame of a request ---------------------------------------------------------------------

class HandlerTest : public fakes::PlatformTest {
  protected:
    ORVA::APIRequest request = fakes::Request("{}");
    ORVA::APIResponse response;
};

TEST_F(HandlerTest, ReadsTheTextsOfTheRequestsLanguage) {
    ORVA::APIRequest german(Json::Value(Json::objectValue), "ger");
    const TaskSchedulerHandler handler(&german, &response);
    EXPECT_THAT(platform.TextsJournal(),
                ElementsAre("JSConfigParser(\"ger\")", "JSConfigParser::Parse()",
                            "JSConfigParser::GetTexts()",
                            "ParseTexts(\"/usr/orva/orvaman/webman/texts/ger\")"));
    EXPECT_EQ(fakes::Answer(response), "nothing");
}

TEST_F(HandlerTest, IgnoresMethodsThatItDoesNotKnow) {
    TaskSchedulerHandler handler(&request, &response);
    for (const char* method : {"List", "LIST", "", "list ", "get", "set", "create", "setenable"}) {
        handler.Process_v1(method);
        EXPECT_EQ(fakes::Answer(response), "nothing") << method;
    }
    handler.Process_v1(nullptr);
    EXPECT_EQ(fakes::Answer(response), "nothing");
    EXPECT_THAT(platform.Journal(), ElementsAre());
}

TEST_F(HandlerTest, RunsTheOperationOfTheMethodAndAnswersItsResult) {
    TaskSchedulerHandler handler(&request, &response);
    handler.Process_v1("list");
    EXPECT_EQ(fakes::Answer(response), R"(success {"tasks":[],"total":0})");
}

TEST_F(HandlerTest, AnswersAFailedOperationWithItsError) {
    for (const auto& [method, answer] : std::vector<std::pair<const char*, const char*>>{
             {"set_enable", R"(error 4800 {"msg":"tasks must be an array"})"},
             {"delete", R"(error 4800 {"msg":"task must be an array of id or a single id"})"},
             {"run", R"(error 4800 {"msg":"task must be an array of id or a single id"})"}}) {
        TaskSchedulerHandler handler(&request, &response);
        handler.Process_v1(method);
        EXPECT_EQ(fakes::Answer(response), answer) << method;
    }
}

TEST_F(HandlerTest, ReportsTheFirstOfSeveralErrors) {
    TaskSchedulerHandler handler(&request, &response);
    handler.SetError(4802, "Failed to delete task");
    handler.SetError(4803, "Failed to run task");
    handler.SetError(117, "Failed to save task", fakes::Document(R"({"id": 5})"));
    handler.ReportError();
    EXPECT_EQ(fakes::Answer(response), R"(error 4802 {"msg":"Failed to delete task"})");
}

TEST_F(HandlerTest, SendsTheMessageAmongTheDetails) {
    TaskSchedulerHandler handler(&request, &response);
    handler.SetError(117, "Failed to save task", fakes::Document(R"({"id": 5})"));
    handler.SetError(4800, "later", fakes::Document(R"({"later": true})"));
    handler.ReportError();
    EXPECT_EQ(fakes::Answer(response), R"(error 117 {"id":5,"msg":"Failed to save task"})");
}

TEST_F(HandlerTest, SendsNullDetailsForAnErrorWithoutAMessage) {
    for (const Json::Value& details :
         {Json::Value(), Json::Value(Json::objectValue), Json::Value(Json::arrayValue)}) {
        TaskSchedulerHandler handler(&request, &response);
        handler.SetError(4800, "", details);
        handler.ReportError();
        EXPECT_EQ(fakes::Answer(response), "error 4800 null");
    }
}

TEST_F(HandlerTest, TurnsEmptyDetailsOfAnyKindIntoAnObjectWithTheMessage) {
    TaskSchedulerHandler handler(&request, &response);
    handler.SetError(4800, "bad", Json::Value(Json::arrayValue));
    handler.ReportError();
    EXPECT_EQ(fakes::Answer(response), R"(error 4800 {"msg":"bad"})");
}

TEST_F(HandlerTest, SendsDetailsWithoutAMessageAsTheyAre) {
    TaskSchedulerHandler handler(&request, &response);
    handler.SetError(4800, "", fakes::Document(R"({"field": "id"})"));
    handler.ReportError();
    EXPECT_EQ(fakes::Answer(response), R"(error 4800 {"field":"id"})");
}

TEST_F(HandlerTest, KeepsTheDetailsOfCodeZeroUntilOthersAreGiven) {
    TaskSchedulerHandler handler(&request, &response);
    handler.SetError(0, "x", fakes::Document(R"({"k": 1})"));
    handler.SetError(4800, "y");
    handler.ReportError();
    EXPECT_EQ(fakes::Answer(response), R"(error 4800 {"k":1,"msg":"y"})");
}

TEST_F(HandlerTest, ReplacesTheDetailsOfCodeZeroByTheFirstErrorsOwn) {
    TaskSchedulerHandler handler(&request, &response);
    handler.SetError(0, "x", fakes::Document(R"({"k": 1})"));
    handler.SetError(4800, "y", fakes::Document(R"({"z": 2})"));
    handler.ReportError();
    EXPECT_EQ(fakes::Answer(response), R"(error 4800 {"msg":"y","z":2})");
}

TEST_F(HandlerTest, ReportsCodeZeroWhenNoErrorWasRecorded) {
    TaskSchedulerHandler handler(&request, &response);
    handler.ReportError();
    EXPECT_EQ(fakes::Answer(response), "error 0 null");
}

// --- Filters and comparison ---------------------------------------------------------------------

class FilterTest : public fakes::PlatformTest {
  protected:
    // Whether the filter lets a task with these properties through.
    bool Accepts(bool (*filter)(_tag_orva_sched_task_*), bool listable, bool enabled) {
        fakes::Task task = TaskWithId(5);
        task.listable = listable;
        task.enabled = enabled;
        platform.AddTask(task);
        _tag_orva_sched_task_* record = ORVASchedTaskAlloc();
        ORVASchedTaskLoad(5, record);
        const bool accepts = filter(record);
        ORVASchedTaskFree(record);
        return accepts;
    }
};

TEST_F(FilterTest, OnlyListableAcceptsListableTasksWhateverTheirState) {
    EXPECT_TRUE(Accepts(onlyListable, true, true));
    EXPECT_TRUE(Accepts(onlyListable, true, false));
    EXPECT_FALSE(Accepts(onlyListable, false, true));
}

TEST_F(FilterTest, OnlyListAndEnableAcceptsListableTasksThatAreEnabled) {
    EXPECT_TRUE(Accepts(onlyListAndEnable, true, true));
    EXPECT_FALSE(Accepts(onlyListAndEnable, true, false));
    EXPECT_FALSE(Accepts(onlyListAndEnable, false, true));
    EXPECT_FALSE(Accepts(onlyListAndEnable, false, false));
}

TEST_F(FilterTest, OnlyListableLogsANullTaskAndRefusesIt) {
    EXPECT_FALSE(onlyListable(nullptr));
    EXPECT_THAT(
        platform.FullJournal(),
        ElementsAre("LOG_ERR ORVA.Core.TaskScheduler.cpp:9 Invaild Argument (0 != pTask)=[0]\n",
                    "QLIBCErrSetEx(3328, \"ORVA.Core.TaskScheduler.cpp\", 9)"));
}

TEST_F(FilterTest, OnlyListAndEnableLogsANullTaskAndRefusesIt) {
    EXPECT_FALSE(onlyListAndEnable(nullptr));
    EXPECT_THAT(
        platform.FullJournal(),
        ElementsAre("LOG_ERR ORVA.Core.TaskScheduler.cpp:16 Invaild Argument (0 != pTask)=[0]\n",
                    "QLIBCErrSetEx(3328, \"ORVA.Core.TaskScheduler.cpp\", 16)"));
}

TEST(ParameterComparisonTest, ComparesLengthAndBytes) {
    const ORVA::APIParameter<std::string> beep(true, false, "beep");
    EXPECT_TRUE(std::string("beep") == beep);
    EXPECT_FALSE(std::string("bee") == beep);
    EXPECT_FALSE(std::string("Beep") == beep);
    EXPECT_FALSE(std::string("beep ") == beep);
    EXPECT_FALSE(std::string("beep\0", 5) == beep);
    EXPECT_TRUE(std::string() == ORVA::APIParameter<std::string>());
}

}  // namespace
