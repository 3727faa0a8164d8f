// The method "create".
#include <string>
#include <utility>
#include <vector>

#include "tests/src/TypedMethodTest.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

TEST_F(TypedMethodTest, CreateRefusesAMissingOrMalformedTypeWithoutALogLine) {
    for (const std::string parameters :
         {R"({})", R"({"type": null})", R"({"type": 5})", R"({"type": ["beep"]})"}) {
        EXPECT_EQ(Call("create", parameters), "error 4800 null") << parameters;
    }
    EXPECT_THAT(platform.FullJournal(), IsEmpty());
}

TEST_F(TypedMethodTest, CreateKnowsOnlyTheKindsThatTheEditorMakes) {
    for (const std::string type :
         {"custom", "report", "backup", "power", "kelupdate", "Beep", "script ", ""}) {
        platform.ClearJournal();
        EXPECT_EQ(Call("create", R"({"extra": {}, "type": ")" + type + "\"," + kEdited + "}"),
                  "error 4800 null")
            << type;
        EXPECT_THAT(platform.FullJournal(),
                    ElementsAre("LOG_ERR main.cpp:155 Unknown app type: " + type));
    }
    EXPECT_THAT(platform.tasks, IsEmpty());
}

TEST_F(TypedMethodTest, CreateMakesATaskOfTheAskedKind) {
    EXPECT_EQ(Call("create", R"({"type": "script", "extra": {"script": "uptime"},)" +
                                 std::string(kEdited) + "}"),
              R"(success {"id":100})");
    EXPECT_EQ(platform.tasks[100].app, "ORVA.ZUM.TaskScheduler.Script");
    EXPECT_EQ(Call("create", R"({"type": "beep", "extra": {"beep_duration": 5},)" +
                                 std::string(kEdited) + "}"),
              R"(success {"id":101})");
    EXPECT_EQ(platform.tasks[101].app, "ORVA.ZUM.TaskScheduler.Beep");
}

TEST_F(TypedMethodTest, CreateWithTheIdOfAnotherKindsTaskTurnsItIntoTheCreatedKind) {
    for (const auto& [type, kind] :
         std::vector<std::pair<std::string, std::string>>{{"beep", "Beep"},
                                                          {"script", "Script"},
                                                          {"service", "Service"},
                                                          {"recycle", "Recycle"}}) {
        Add(5, "com.example.Notes",
            R"({"service_action": "0", "recycle_action": "2", "clean_all": "yes",
                "service_store": [{"name": "NTP", "enabled": true, "service_type": 1}]})");
        EXPECT_EQ(
            Call("create", R"({"id": 5, "extra": {}, "type": ")" + type + "\"," + kEdited + "}"),
            R"(success {"id":5})")
            << type;
        EXPECT_EQ(platform.tasks.size(), 1U) << type;
        EXPECT_EQ(platform.tasks[5].name, "edited") << type;
        EXPECT_EQ(platform.tasks[5].app, "ORVA.ZUM.TaskScheduler." + kind) << type;
        EXPECT_EQ(platform.tasks[5].editForm, "ORVA.ZUM.TaskScheduler." + kind + ".FormPanel")
            << type;
    }
}

TEST_F(TypedMethodTest, CreateWithTheIdOfNoTaskMakesNone) {
    EXPECT_EQ(Call("create", R"({"id": 9, "type": "script", "name": "new"})"),
              R"(error 117 {"msg":"Invalid (basic) object"})");
    EXPECT_THAT(platform.tasks, IsEmpty());
}

// --- Failures of create -------------------------------------------------------------------------

struct CreateFailure {
    std::string function;
    int call;
    std::string answer;
    std::vector<std::string> log;
    int frees;
};

class FailedCreateTest : public TypedMethodTest {
  protected:
    // Whether a create of this kind answers and logs each failure, frees what it took and stores
    // nothing.
    void ExpectFailures(const std::string& type, const std::vector<CreateFailure>& failures) {
        for (const CreateFailure& failure : failures) {
            platform.ClearJournal();
            platform.FailCall(failure.function, failure.call);
            EXPECT_EQ(Call("create", R"({"extra": {}, "type": ")" + type + "\"," + kEdited + "}"),
                      failure.answer)
                << type;
            EXPECT_EQ(platform.Log(), failure.log) << type;
            EXPECT_EQ(platform.Calls("ORVASchedTaskFree"), failure.frees)
                << type << ", " << failure.function;
            EXPECT_EQ(platform.Leftovers(), "") << type << ", " << failure.function;
            EXPECT_THAT(platform.tasks, IsEmpty());
        }
    }
};

TEST_F(FailedCreateTest, IsLoggedAndAnsweredForKindsThatLayAFormOverTheirDefaults) {
    const std::string refused =
        "ORVA.Core.TaskScheduler.Basic.cpp:222 Convert task from json (app) failed. "
        "[0x0900 platform.cpp:42]";
    for (const std::string type : {"recycle", "service"}) {
        ExpectFailures(
            type,
            {{"ORVASchedTaskAlloc",
              1,
              R"(error 117 {"msg":"Failed to allocate task"})",
              {"ORVA.Core.TaskScheduler.Basic.cpp:102 alloc task failed. id:[-1] "
               "[0x0900 platform.cpp:42]",
               refused},
              0},
             {"ORVASchedTaskLoad",
              1,
              R"(error 4801 {"msg":"Failed to load task"})",
              {"ORVA.Core.TaskScheduler.Basic.cpp:108 load task failed. id:[-1] "
               "[0x0900 platform.cpp:42]",
               refused},
              1},
             {"ORVASchedTaskAlloc",
              2,
              R"(error 117 {"msg":"Failed to new task"})",
              {"ORVA.Core.TaskScheduler.Basic.cpp:229 Failed to new task. "
               "[0x0900 platform.cpp:42]"},
              1},
             {"ORVASchedTaskConvertFromJson_Basic",
              1,
              R"(error 117 {"msg":"Invalid (basic) object"})",
              {"ORVA.Core.TaskScheduler.Basic.cpp:234 Convert task from json (basic) failed. "
               "[0x0900 platform.cpp:42]"},
              2},
             {"ORVASchedTaskConvertFromJson_Schedule",
              1,
              R"(error 117 {"msg":"Invalid (schedule) object"})",
              {"ORVA.Core.TaskScheduler.Basic.cpp:239 Convert task from json (schedule) failed. "
               "[0x0900 platform.cpp:42]"},
              2},
             {"ORVASchedTaskSave",
              1,
              R"(error 117 {"msg":"Failed to save task"})",
              {"ORVA.Core.TaskScheduler.Basic.cpp:251 Save task failed. "
               "[0x0900 platform.cpp:42]"},
              2}});
    }
}

TEST_F(FailedCreateTest, IsLoggedAndAnsweredForKindsThatTakeTheirFormAsItIs) {
    for (const std::string type : {"beep", "script"}) {
        ExpectFailures(
            type,
            {{"ORVASchedTaskAlloc",
              1,
              R"(error 117 {"msg":"Failed to new task"})",
              {"ORVA.Core.TaskScheduler.Basic.cpp:229 Failed to new task. "
               "[0x0900 platform.cpp:42]"},
              0},
             {"ORVASchedTaskConvertFromJson_Basic",
              1,
              R"(error 117 {"msg":"Invalid (basic) object"})",
              {"ORVA.Core.TaskScheduler.Basic.cpp:234 Convert task from json (basic) failed. "
               "[0x0900 platform.cpp:42]"},
              1},
             {"ORVASchedTaskConvertFromJson_Schedule",
              1,
              R"(error 117 {"msg":"Invalid (schedule) object"})",
              {"ORVA.Core.TaskScheduler.Basic.cpp:239 Convert task from json (schedule) failed. "
               "[0x0900 platform.cpp:42]"},
              1},
             {"ORVASchedTaskSave",
              1,
              R"(error 117 {"msg":"Failed to save task"})",
              {"ORVA.Core.TaskScheduler.Basic.cpp:251 Save task failed. "
               "[0x0900 platform.cpp:42]"},
              1}});
        EXPECT_EQ(platform.Calls("ORVASchedTaskLoad"), 0) << type;
    }
}

}  // namespace
