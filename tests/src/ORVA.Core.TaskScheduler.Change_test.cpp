// Deleting, starting, enabling and disabling tasks.
#include <stdexcept>
#include <string>

#include "tests/src/ModuleTest.h"

namespace {

using ::testing::ElementsAre;

// --- Delete and run -----------------------------------------------------------------------------

class DeleteTest : public ModuleTest {
  protected:
    DeleteTest() {
        for (const int id : {3, 4, 5, 7}) {
            platform.AddTask(TaskWithId(id));
        }
    }
};

TEST_F(DeleteTest, DeletesASingleTask) {
    EXPECT_EQ(Call("delete", R"({"task": 7})"), "success null");
    EXPECT_THAT(platform.Journal(), ElementsAre("ORVASchedTaskRemove(7)"));
    EXPECT_FALSE(platform.tasks.contains(7));
}

TEST_F(DeleteTest, DeletesTheTasksOfAnArrayInItsOrder) {
    EXPECT_EQ(Call("delete", R"({"task": [4, 3]})"), "success null");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskRemove(4)", "ORVASchedTaskRemove(3)"));
}

TEST_F(DeleteTest, SucceedsWithoutDoingAnythingForAnEmptyArray) {
    EXPECT_EQ(Call("delete", R"({"task": []})"), "success null");
    EXPECT_THAT(platform.Journal(), ElementsAre());
}

TEST_F(DeleteTest, RefusesWhatIsNeitherAnArrayNorAnInteger) {
    for (const std::string parameters :
         {R"({})", R"({"task": "7"})", R"({"task": {"id": 7}})", R"({"task": null})",
          R"({"task": true})", R"({"task": 7.0})", R"({"task": 7.5})", R"({"task": 1e30})"}) {
        EXPECT_EQ(Call("delete", parameters),
                  R"(error 4800 {"msg":"task must be an array of id or a single id"})")
            << parameters;
    }
    EXPECT_THAT(platform.Journal(), ElementsAre());
}

TEST_F(DeleteTest, StopsAtTheFirstElementThatIsNoIntegerAndKeepsWhatWasDone) {
    EXPECT_EQ(Call("delete", R"({"task": [3, "4", 5]})"),
              R"(error 4800 {"msg":"id must be an integer"})");
    EXPECT_THAT(platform.Journal(), ElementsAre("ORVASchedTaskRemove(3)"));
}

TEST_F(DeleteTest, TakesOnlyIntegersOf32BitsForIds) {
    for (const std::string task :
         {"2147483648", "-2147483649", "4294967301", "9223372036854775807", "18446744073709551615",
          "[4294967301]", "[5.0]", "[true]", "[null]", "[[5]]", R"([{"id": 5}])", R"(["5"])"}) {
        EXPECT_EQ(Call("delete", R"({"task": )" + task + "}"),
                  R"(error 4800 {"msg":"id must be an integer"})")
            << task;
    }
    EXPECT_THAT(platform.Journal(), ElementsAre());
}

TEST_F(DeleteTest, PassesTheSmallestAndTheLargestIdToTheStore) {
    Call("delete", R"({"task": 2147483647})");
    Call("delete", R"({"task": [-2147483648]})");
    EXPECT_EQ(platform.Journal().front(), "ORVASchedTaskRemove(2147483647)");
    EXPECT_EQ(platform.Log().back(),
              "ORVA.Core.TaskScheduler.cpp:250 Failed to delete task -2147483648. "
              "[0x0300 store.cpp:1]");
}

TEST_F(DeleteTest, StopsAtTheFirstTaskThatCannotBeDeleted) {
    platform.FailCall("ORVASchedTaskRemove", 2, {0x0602, "db.cpp", 31});
    EXPECT_EQ(Call("delete", R"({"task": [3, 4, 5]})"),
              R"(error 4802 {"msg":"Failed to delete task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskRemove(3)", "ORVASchedTaskRemove(4)",
                            "LOG_ERR ORVA.Core.TaskScheduler.cpp:250 Failed to delete task 4. "
                            "[0x0602 db.cpp:31]"));
    EXPECT_FALSE(platform.tasks.contains(3));
    EXPECT_TRUE(platform.tasks.contains(5));
}

TEST_F(DeleteTest, LetsAnExceptionOfTheStoreThrough) {
    platform.ThrowFrom("ORVASchedTaskRemove");
    EXPECT_THROW(Call("delete", R"({"task": 5})"), std::runtime_error);
}

class RunTest : public DeleteTest {};

TEST_F(RunTest, StartsASingleTask) {
    EXPECT_EQ(Call("run", R"({"task": 7})"), "success null");
    EXPECT_THAT(platform.Journal(), ElementsAre("ORVASchedTaskRun(7, 0, 0)"));
}

TEST_F(RunTest, StartsTheTasksOfAnArrayInItsOrder) {
    EXPECT_EQ(Call("run", R"({"task": [4, 3, 4]})"), "success null");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskRun(4, 0, 0)", "ORVASchedTaskRun(3, 0, 0)",
                            "ORVASchedTaskRun(4, 0, 0)"));
}

TEST_F(RunTest, SucceedsWithoutDoingAnythingForAnEmptyArray) {
    EXPECT_EQ(Call("run", R"({"task": []})"), "success null");
    EXPECT_THAT(platform.Journal(), ElementsAre());
}

TEST_F(RunTest, RefusesWhatIsNeitherAnArrayNorAnInteger) {
    for (const std::string parameters : {R"({})", R"({"task": "7"})", R"({"task": {"id": 7}})"}) {
        EXPECT_EQ(Call("run", parameters),
                  R"(error 4800 {"msg":"task must be an array of id or a single id"})")
            << parameters;
    }
    EXPECT_THAT(platform.Journal(), ElementsAre());
}

TEST_F(RunTest, StopsAtTheFirstElementThatIsNoIntegerAfterStartingThoseBefore) {
    EXPECT_EQ(Call("run", R"({"task": [3, "4", 5]})"),
              R"(error 4800 {"msg":"id must be an integer"})");
    EXPECT_THAT(platform.Journal(), ElementsAre("ORVASchedTaskRun(3, 0, 0)"));
}

TEST_F(RunTest, StopsAtTheFirstTaskThatCannotBeStarted) {
    platform.FailCall("ORVASchedTaskRun", 1, {0x0700, "run.cpp", 8});
    EXPECT_EQ(Call("run", R"({"task": [4, 5]})"), R"(error 4803 {"msg":"Failed to run task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskRun(4, 0, 0)",
                            "LOG_ERR ORVA.Core.TaskScheduler.cpp:289 Failed to run task [4]. "
                            "[0x0700 run.cpp:8]"));
}

class StoreResultTest : public DeleteTest {};

TEST_F(StoreResultTest, OnlyANegativeOneIsAFailure) {
    platform.success = 3;
    EXPECT_EQ(Call("set_enable", R"({"status": [{"id": 5, "enable": false}]})"), "success null");
    EXPECT_EQ(Call("run", R"({"task": 5})"), "success null");
    EXPECT_EQ(Call("delete", R"({"task": 5})"), "success null");
    EXPECT_EQ(Call("list", "{}").substr(0, 8), "success ");
    EXPECT_THAT(platform.Log(), ElementsAre());
}

// --- Enable and disable -------------------------------------------------------------------------

class SetEnableTest : public DeleteTest {};

TEST_F(SetEnableTest, SavesTheWantedStatesInOrderWithOneRecord) {
    EXPECT_EQ(Call("set_enable",
                   R"({"status": [{"id": 5, "enable": false}, {"id": 3, "enable": true}]})"),
              "success null");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                            "ORVASchedCTaskSetState(#1, 0)", "ORVASchedTaskSave(#1)",
                            "ORVASchedTaskLoad(3, #1)", "ORVASchedCTaskSetState(#1, 1)",
                            "ORVASchedTaskSave(#1)", "ORVASchedTaskFree(#1)"));
    EXPECT_FALSE(platform.tasks[5].enabled);
    EXPECT_TRUE(platform.tasks[3].enabled);
}

TEST_F(SetEnableTest, ChangesNothingButTheState) {
    platform.tasks[5].command = "date";
    platform.tasks[5].schedule = fakes::Document(R"({"hour": 3})");
    fakes::Task expected = platform.tasks[5];
    expected.enabled = false;
    Call("set_enable", R"({"status": [{"id": 5, "enable": false}]})");
    EXPECT_EQ(platform.tasks[5].ToText(), expected.ToText());
}

TEST_F(SetEnableTest, SucceedsForAnEmptyArray) {
    EXPECT_EQ(Call("set_enable", R"({"status": []})"), "success null");
    EXPECT_THAT(platform.Journal(), ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskFree(#1)"));
}

TEST_F(SetEnableTest, RefusesWhatIsNoArrayBeforeTakingARecord) {
    for (const std::string parameters :
         {R"({})", R"({"status": {"id": 5, "enable": true}})", R"({"status": null})",
          R"({"status": "5"})", R"({"status": 5})", R"({"tasks": []})"}) {
        EXPECT_EQ(Call("set_enable", parameters), R"(error 4800 {"msg":"tasks must be an array"})")
            << parameters;
    }
    EXPECT_THAT(platform.Journal(), ElementsAre());
}

TEST_F(SetEnableTest, RefusesElementsThatAreNoStatesAndFreesTheRecord) {
    for (const std::string element :
         {R"({"id": 5, "enable": 1})", R"({"id": 5, "enable": "true"})",
          R"({"id": 5, "enable": null})", R"({"id": 5})", R"({"enable": true})",
          R"({"id": "5", "enable": true})", R"({"id": 5.0, "enable": true})",
          R"({"id": true, "enable": true})", R"({"id": null, "enable": true})",
          R"({"id": 4294967301, "enable": true})", R"({"ID": 5, "enable": true})", "{}", "5",
          "null", R"("x")", "[1]", "[]", "true", "1.5"}) {
        platform.ClearJournal();
        EXPECT_EQ(Call("set_enable", R"({"status": [)" + element + "]}"),
                  R"(error 4800 {"msg":"id must be an integer, enabled must be a boolean"})")
            << element;
        EXPECT_EQ(platform.Calls("ORVASchedTaskLoad"), 0) << element;
        EXPECT_EQ(platform.Leftovers(), "") << element;
    }
}

TEST_F(SetEnableTest, KeepsWhatWasDoneBeforeABadElement) {
    EXPECT_EQ(Call("set_enable", R"({"status": [{"id": 3, "enable": false}, {"id": 4}]})"),
              R"(error 4800 {"msg":"id must be an integer, enabled must be a boolean"})");
    EXPECT_FALSE(platform.tasks[3].enabled);
    EXPECT_TRUE(platform.tasks[4].enabled);
}

TEST_F(SetEnableTest, ReportsAShortageOfRecords) {
    platform.FailCall("ORVASchedTaskAlloc", 1, {0x0200, "record.cpp", 5});
    EXPECT_EQ(Call("set_enable", R"({"status": [{"id": 5, "enable": true}]})"),
              R"(error 117 {"msg":"Failed to create task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()",
                            "LOG_ERR ORVA.Core.TaskScheduler.cpp:315 Failed to new task -1. "
                            "[0x0200 record.cpp:5]"));
}

TEST_F(SetEnableTest, ReportsATaskThatCannotBeLoadedAndFreesTheRecord) {
    EXPECT_EQ(Call("set_enable",
                   R"({"status": [{"id": 9, "enable": true}, {"id": 5, "enable": false}]})"),
              R"(error 4801 {"msg":"Failed to get task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(9, #1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.cpp:328 Failed to get task 9. "
                            "[0x0300 store.cpp:1]",
                            "ORVASchedTaskFree(#1)"));
    EXPECT_TRUE(platform.tasks[5].enabled);
}

TEST_F(SetEnableTest, StopsAtTheFirstTaskThatCannotBeSavedAndKeepsWhatWasDone) {
    platform.FailCall("ORVASchedTaskSave", 2, {0x0604, "db.cpp", 77});
    EXPECT_EQ(Call("set_enable", R"({"status": [{"id": 3, "enable": false},
                                                {"id": 4, "enable": false},
                                                {"id": 5, "enable": false}]})"),
              R"(error 4804 {"msg":"Failed to update task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(3, #1)",
                            "ORVASchedCTaskSetState(#1, 0)", "ORVASchedTaskSave(#1)",
                            "ORVASchedTaskLoad(4, #1)", "ORVASchedCTaskSetState(#1, 0)",
                            "ORVASchedTaskSave(#1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.cpp:335 Failed to upadte task 4. "
                            "[0x0604 db.cpp:77]",
                            "ORVASchedTaskFree(#1)"));
    EXPECT_FALSE(platform.tasks[3].enabled);
    EXPECT_TRUE(platform.tasks[4].enabled);
    EXPECT_TRUE(platform.tasks[5].enabled);
}

TEST_F(SetEnableTest, CannotSaveTheRecordOfANewTask) {
    EXPECT_EQ(Call("set_enable", R"({"status": [{"id": -1, "enable": true}]})"),
              R"(error 4804 {"msg":"Failed to update task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(-1, #1)",
                            "ORVASchedCTaskSetState(#1, 1)", "ORVASchedTaskSave(#1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.cpp:335 Failed to upadte task -1. "
                            "[0x0300 store.cpp:1]",
                            "ORVASchedTaskFree(#1)"));
    EXPECT_EQ(platform.tasks.size(), 4U);
}

TEST_F(SetEnableTest, DoesNotLookAtTheOutcomeOfSettingTheState) {
    platform.FailCall("ORVASchedCTaskSetState");
    EXPECT_EQ(Call("set_enable", R"({"status": [{"id": 5, "enable": false}]})"), "success null");
    EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 1);
}

TEST_F(SetEnableTest, FreesTheRecordWhenTheStoreThrows) {
    for (const std::string call :
         {"ORVASchedTaskLoad", "ORVASchedCTaskSetState", "ORVASchedTaskSave"}) {
        platform.ThrowFrom(call);
        EXPECT_THROW(Call("set_enable", R"({"status": [{"id": 5, "enable": false}]})"),
                     std::runtime_error)
            << call;
        EXPECT_EQ(platform.Leftovers(), "") << call;
    }
}

}  // namespace
