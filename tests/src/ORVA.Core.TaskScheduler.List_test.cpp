#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "tests/src/ListTest.h"

namespace {

using ::testing::ElementsAre;

// --- Rows ---------------------------------------------------------------------------------------

TEST_F(ListTest, AnswersAnEmptyArrayWhenThereAreNoTasks) {
    EXPECT_EQ(Call("list", "{}"), R"(success {"tasks":[],"total":0})");
    EXPECT_THAT(platform.Journal(), ElementsAre("ORVASchedTaskListGet(null, filter)"));
}

TEST_F(ListTest, LeavesOutTasksThatAreNotListable) {
    Add(1);
    Add(2).listable = false;
    Add(3);
    const Json::Value document = List(R"({"sort_by": "id"})");
    EXPECT_THAT(Ids(document), ElementsAre(1, 3));
    EXPECT_EQ(document["total"], 2);
}

TEST_F(ListTest, FreesNothingWhenNoStoredTaskIsListable) {
    Add(1).listable = false;
    Add(2).listable = false;
    EXPECT_EQ(Call("list", "{}"), R"(success {"tasks":[],"total":0})");
    EXPECT_THAT(platform.Journal(), ElementsAre("ORVASchedTaskListGet(null, filter)"));
}

TEST_F(ListTest, ShowsEveryMemberOfATask) {
    fakes::Task& task = Add(7);
    task.name = "Morning \"beep\" ä";
    task.action = "Beep for 60 seconds";
    task.nextTriggerTime = "2026-11-22 06:30";
    task.canDeleteFromUI = false;
    EXPECT_EQ(Call("list", "{}"),
              R"(success {"tasks":[{"action":"Beep for 60 seconds","can_delete":false,)"
              R"("can_edit":true,"can_run":true,"enable":true,"id":7,)"
              R"("name":"Morning \"beep\" ä","next_trigger_time":"2026-11-22 06:30",)"
              R"("type":"beep"}],"total":1})");
}

TEST_F(ListTest, ShowsEachFlagUnderItsOwnName) {
    const std::vector<std::pair<std::string, bool fakes::Task::*>> flags{
        {"enable", &fakes::Task::enabled},
        {"can_run", &fakes::Task::canRunFromUI},
        {"can_edit", &fakes::Task::canEditFromUI},
        {"can_delete", &fakes::Task::canDeleteFromUI},
    };
    for (const auto& [name, flag] : flags) {
        Add(1).*flag = false;
        const Json::Value row = List("{}")["tasks"][0];
        for (const auto& [other, unused] : flags) {
            EXPECT_EQ(row[other], other != name) << name << ", " << other;
        }
    }
}

TEST_F(ListTest, ShowsADashForATaskWithoutANextTriggerTime) {
    Add(1).nextTriggerTime = "N/A";
    EXPECT_EQ(List("{}")["tasks"][0]["next_trigger_time"], "-");
}

TEST_F(ListTest, NamesTheApplicationOfCustomTasksOnly) {
    platform.texts[kTexts] = fakes::Document(R"({"backup": {"title": "Backup"}})");
    for (const auto& [app, hasName] : std::vector<std::pair<std::string, bool>>{
             {"com.example.Notes", true},
             {"ORVA.ZUM.TaskScheduler.Beep", false},
             {"ORVA.ZUM.TaskScheduler.Service", false},
             {"ORVA.ZUM.DataAnalysis", false},
             {"ORVA.ZUM.BackupApp.NetBackup", false},
             {"ORVA.ZUM.TaskScheduler.AutoPower", false},
             {"ORVA.ZUM.TaskScheduler.KELAutoUpdate", false}}) {
        Add(1, app).appName = "#backup:title#";
        const Json::Value row = List("{}")["tasks"][0];
        EXPECT_EQ(row.isMember("app_name"), hasName) << app;
        EXPECT_EQ(row.get("app_name", "Backup"), "Backup") << app;
    }
}

TEST_F(ListTest, TranslatesTheNameAndTheActionWithTheTextsOfTheOwningApplication) {
    platform.texts[kTexts] = fakes::Document(R"({"app": {"title": "Common", "do": "common do"}})");
    platform.appTexts["com.example.Notes"] = "apps/notes/enu";
    platform.texts["/usr/orva/orvaman/webman/apps/notes/enu"] =
        fakes::Document(R"({"app": {"title": "Notes", "do": "tidy up"}})");
    fakes::Task& task = Add(1, "com.example.Notes");
    task.appName = "#app:title#";
    task.action = "#app:do# now";
    const Json::Value row = List("{}")["tasks"][0];
    EXPECT_EQ(row["type"], "custom");
    EXPECT_EQ(row["app_name"], "Notes");
    EXPECT_EQ(row["action"], "tidy up now");
}

// --- Sorting ------------------------------------------------------------------------------------

TEST_F(ListTest, SortsByTheStoresKeyOfTheColumn) {
    AddTasks(2);
    for (const auto& [column, key] : std::vector<std::pair<std::string, std::string>>{
             {R"("enable")", "state"},
             {R"("id")", "id"},
             {R"("type")", "app name"},
             {R"("name")", "name"},
             {R"("app_name")", "app name"},
             {R"("action")", "action"},
             {R"("next_trigger_time")", "next trigger time"},
             {R"("")", "next trigger time"},
             {R"("Name")", "next trigger time"},
             {R"("state")", "next trigger time"},
             {R"("name ")", "next trigger time"},
             {"5", "next trigger time"},
             {"null", "next trigger time"}}) {
        platform.ClearJournal();
        List(R"({"sort_by": )" + column + "}");
        EXPECT_EQ(platform.Journal()[1].substr(platform.Journal()[1].find(' ')),
                  " \"" + key + "\", 1)")
            << column;
    }
}

TEST_F(ListTest, SortsByNextTriggerTimeAscendingWhenNothingIsAsked) {
    AddTasks(2);
    List("{}");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskListGet(null, filter)",
                            "ORVASchedTaskListSort(#1, \"next trigger time\", 1)",
                            "ORVASchedTaskListFree(#1)"));
}

TEST_F(ListTest, SortsDescendingForTheWordDescInAnyCaseOnly) {
    AddTasks(3);
    for (const auto& [direction, descending] :
         std::vector<std::pair<std::string, bool>>{{R"("desc")", true},
                                                   {R"("DESC")", true},
                                                   {R"("Desc")", true},
                                                   {R"("descending")", false},
                                                   {R"("des")", false},
                                                   {R"("asc")", false},
                                                   {R"("")", false},
                                                   {"0", false},
                                                   {"null", false}}) {
        const Json::Value document =
            List(R"({"sort_by": "id", "sort_direction": )" + direction + "}");
        EXPECT_THAT(Ids(document), descending ? ElementsAre(3, 2, 1) : ElementsAre(1, 2, 3))
            << direction;
    }
}

TEST_F(ListTest, DoesNotSortASingleTask) {
    AddTasks(1);
    EXPECT_THAT(Ids(List("{}")), ElementsAre(1));
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskListGet(null, filter)", "ORVASchedTaskListFree(#1)"));
}

// --- Paging -------------------------------------------------------------------------------------

TEST_F(ListTest, CutsOutTheAskedPage) {
    AddTasks(10);
    const std::vector<int> all{1, 2, 3, 4, 5, 6, 7, 8, 9, 10};
    const std::vector<int> none;
    for (const auto& [page, ids] : std::vector<std::pair<std::string, std::vector<int>>>{
             {R"("offset": 2, "limit": 3)", {3, 4, 5}},
             {R"("offset": 0, "limit": 1)", {1}},
             {R"("offset": 8, "limit": 5)", {9, 10}},
             {R"("offset": 8)", {9, 10}},
             {R"("limit": 2)", {1, 2}},
             {R"("limit": 10)", all},
             {R"("limit": 11)", all},
             {R"("limit": 0)", none},
             {R"("offset": 5, "limit": 0)", none},
             {R"("limit": -1)", all},
             {R"("offset": 10)", none},
             {R"("offset": 1000, "limit": 5)", none},
             // Not before the start: the walk would have to end at a negative position.
             {R"("offset": 0, "limit": -5)", all},
             {R"("offset": 3, "limit": -5)", {4, 5, 6, 7, 8, 9, 10}},
             // Ends at position 5, before the first row.
             {R"("offset": 10, "limit": -5)", none},
             {R"("offset": 5, "limit": -5)", none},
             {R"("offset": -3, "limit": 5)", {1, 2}},
             {R"("offset": -3)", all},
             {R"("offset": 2147483647, "limit": 2147483647)", none},
             {R"("offset": 1, "limit": 2147483647)", {2, 3, 4, 5, 6, 7, 8, 9, 10}},
             {R"("offset": -2147483648, "limit": -2147483648)", all},
             // What is no integer of 32 bits counts as not asked.
             {R"("offset": "2", "limit": "3")", all},
             {R"("offset": null, "limit": null)", all},
             {R"("offset": 2.0, "limit": true)", all},
             {R"("offset": 4294967298, "limit": 4294967299)", all}}) {
        const Json::Value document = List(R"({"sort_by": "id", )" + page + "}");
        EXPECT_EQ(Ids(document), ids) << page;
        EXPECT_EQ(document["total"], 10) << page;
        EXPECT_TRUE(document["tasks"].isArray()) << page;
    }
}

TEST_F(ListTest, ReadsNoTaskBeyondThePage) {
    AddTasks(10);
    platform.ClearJournal();
    List(R"({"sort_by": "id", "offset": 2, "limit": 3})");
    EXPECT_EQ(platform.Calls("ORVASchedTaskGetName"), 3);
    EXPECT_EQ(platform.Calls("ORVASchedTaskNext"), 5);
}

// --- Failures -----------------------------------------------------------------------------------

TEST_F(ListTest, ReportsAListThatCannotBeRead) {
    AddTasks(2);
    platform.FailCall("ORVASchedTaskListGet", 1, {0x0601, "list.cpp", 20});
    EXPECT_EQ(Call("list", "{}"), R"(error 117 {"msg":"get task list failed"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskListGet(null, filter)",
                            "LOG_ERR ORVA.Core.TaskScheduler.cpp:160 get task list failed. "
                            "[0x0601 list.cpp:20]"));
}

TEST_F(ListTest, FreesWhatAFailedReadLeftBehind) {
    AddTasks(2);
    platform.FailCall("ORVASchedTaskListGet", 1, {0x0601, "list.cpp", 20});
    platform.listOfFailedGet = true;
    EXPECT_EQ(Call("list", "{}"), R"(error 117 {"msg":"get task list failed"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskListGet(null, filter)",
                            "LOG_ERR ORVA.Core.TaskScheduler.cpp:160 get task list failed. "
                            "[0x0601 list.cpp:20]",
                            "ORVASchedTaskListFree(#1)"));
}

TEST_F(ListTest, ReportsAListThatCannotBeSortedAndFreesIt) {
    AddTasks(2);
    platform.FailCall("ORVASchedTaskListSort", 1, {0x0D00, "sort.cpp", 21});
    EXPECT_EQ(Call("list", R"({"sort_by": "name", "sort_direction": "desc"})"),
              R"(error 117 {"msg":"sort task list failed"})");
    EXPECT_THAT(
        platform.Journal(),
        ElementsAre("ORVASchedTaskListGet(null, filter)", "ORVASchedTaskListSort(#1, \"name\", 0)",
                    "LOG_ERR ORVA.Core.TaskScheduler.cpp:173 sort task list failed. "
                    "[0x0D00 sort.cpp:21]",
                    "ORVASchedTaskListFree(#1)"));
}

TEST_F(ListTest, FreesTheListWhenThePlatformThrows) {
    for (const std::string call :
         {"ORVASchedTaskListSort", "ORVASchedTaskNext", "ORVASchedTaskGetApp",
          "ORVASchedTaskGetName", "ORVASchedTaskGetAction", "ORVASchedTaskGetNextTriggerTime",
          "ORVASchedTaskIsEnabled", "QLIBCStrReplace"}) {
        Add(1, "ORVA.ZUM.TaskScheduler.Service").action = "FTP";
        Add(2);
        platform.ThrowFrom(call);
        EXPECT_THROW(Call("list", "{}"), std::runtime_error) << call;
        EXPECT_EQ(platform.Leftovers(), "") << call;
    }
}

TEST_F(ListTest, DoesNotCheckTheReadersOfATask) {
    Add(1);
    platform.FailCall("ORVASchedTaskGetName");
    platform.FailCall("ORVASchedTaskGetNextTriggerTime");
    const Json::Value row = List("{}")["tasks"][0];
    EXPECT_EQ(row["name"], "");
    EXPECT_EQ(row["next_trigger_time"], "");
}

}  // namespace
