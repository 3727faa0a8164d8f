#include <string>

#include "tests/src/RecycleTask.h"

namespace fakes {
namespace {

using ::testing::ElementsAre;

// --- From the form to the flat section -----------------------------------------------------------

TEST_F(RecycleTask, SetLaysTheWholeFormOverTheStoredSection) {
    EXPECT_EQ(FlatAfter(R"({"clean_share_policy":{"clean_all":false,"shares":["docs"]},)"
                        R"("clean_file_policy":{"policy":"size","size":12,"sort_type":1,)"
                        R"("reserve_policy":{"size_greater_check":true,"size_greater":3,)"
                        R"("size_smaller_check":true,"size_smaller":4,"extension_check":true,)"
                        R"("extension":[{"file_ext":"doc","more":1}]}}})"),
              R"({"advconfig":{"reserve_policy_extension":[{"file_ext":"doc","more":1}],)"
              R"("reserve_policy_extension_check":"on","reserve_policy_size_greater":"3",)"
              R"("reserve_policy_size_greater_check":"on","reserve_policy_size_smaller":"4",)"
              R"("reserve_policy_size_smaller_check":"on"},"clean_all":"no",)"
              R"("clean_policy":"clean_policy_by_size","clean_policy_by_size_MB_number":"12",)"
              R"("clean_policy_by_size_sort_type":"Delete old files first",)"
              R"("recycle_action":"2","selected_shares":["docs"]})");
}

constexpr const char* kFullFlat =
    R"({"advconfig":{"reserve_policy_extension":[{"file_ext":"doc"}],)"
    R"("reserve_policy_extension_check":"on","reserve_policy_size_greater":"3",)"
    R"("reserve_policy_size_greater_check":"on","reserve_policy_size_smaller":"4",)"
    R"("reserve_policy_size_smaller_check":"on"},"clean_all":"no",)"
    R"("clean_policy":"clean_policy_by_size","clean_policy_by_size_MB_number":"12",)"
    R"("clean_policy_by_size_sort_type":"Delete old files first","clean_policy_by_time_day":"9",)"
    R"("mine":1,"recycle_action":"1","selected_shares":["docs"]})";

TEST_F(RecycleTask, WhatTheFormLeavesOutKeepsItsValue) {
    for (const char* form :
         {"{}", "null", R"({"clean_share_policy":{},"clean_file_policy":{}})",
          R"({"clean_share_policy":5,"clean_file_policy":[1]})",
          R"({"clean_file_policy":{"reserve_policy":{}}})",
          R"({"clean_file_policy":{"reserve_policy":"x","policy":5}})", R"({"recycle_action":"0"})",
          R"({"clean_file_policy":{"size":77,"sort_type":0,"time":77}})"}) {
        Stored().appArgs = kFullFlat;
        EXPECT_EQ(FlatAfter(form), kFullFlat) << form;
    }
}

TEST_F(RecycleTask, WhatTheFormSendsWithAnotherTypeKeepsItsValue) {
    for (const char* form :
         {R"({"clean_share_policy":{"clean_all":"yes","shares":"docs"}})",
          R"({"clean_share_policy":{"clean_all":1,"shares":{"a":"b"}}})",
          R"({"clean_file_policy":{"policy":"size","size":"13","sort_type":"0"}})",
          R"({"clean_file_policy":{"policy":"size","size":13.0,"sort_type":0.0}})",
          R"({"clean_file_policy":{"policy":"size","size":1e3,"sort_type":true}})",
          R"({"clean_file_policy":{"policy":"size","size":18446744073709551616,"sort_type":1e0}})",
          R"({"clean_file_policy":{"reserve_policy":{"size_greater_check":"off",)"
          R"("size_smaller_check":0,"extension_check":null}}})",
          R"({"clean_file_policy":{"reserve_policy":{"size_greater_check":true,)"
          R"("size_greater":"9","size_smaller_check":true,"size_smaller":null,)"
          R"("extension_check":true,"extension":"jpg"}}})",
          R"({"clean_file_policy":{"reserve_policy":{"size_greater_check":true,)"
          R"("size_greater":9.0,"size_smaller_check":true,"size_smaller":true}}})",
          R"({"clean_file_policy":{"reserve_policy":{"size_greater":9,"size_smaller":9,)"
          R"("extension":[]}}})"}) {
        Stored().appArgs = kFullFlat;
        EXPECT_EQ(FlatAfter(form), kFullFlat) << form;
    }
}

TEST_F(RecycleTask, AnIntegerOfAnySizeIsKeptAsItsDecimalText) {
    for (const std::string number :
         {"0", "-1", "2147483647", "2147483648", "-2147483649", "4294967296", "9223372036854775807",
          "-9223372036854775808", "18446744073709551615"}) {
        Stored().appArgs = R"({"recycle_action":"2"})";
        EXPECT_EQ(
            FlatAfter(R"({"clean_file_policy":{"policy":"size","size":)" + number +
                      R"(,"reserve_policy":{"size_greater_check":true,"size_greater":)" + number +
                      R"(,"size_smaller_check":true,"size_smaller":)" + number + "}}}"),
            R"({"advconfig":{"reserve_policy_size_greater":")" + number +
                R"(","reserve_policy_size_greater_check":"on","reserve_policy_size_smaller":")" +
                number +
                R"(","reserve_policy_size_smaller_check":"on"},)"
                R"("clean_policy":"clean_policy_by_size","clean_policy_by_size_MB_number":")" +
                number + R"(","recycle_action":"2"})");
        Stored().appArgs = R"({"recycle_action":"2"})";
        EXPECT_EQ(FlatAfter(R"({"clean_file_policy":{"policy":"time","time":)" + number + "}}"),
                  R"({"clean_policy":"clean_policy_by_time","clean_policy_by_time_day":")" +
                      number + R"(","recycle_action":"2"})");
        EXPECT_EQ(Stored().command, "/usr/orva/bin/orvarecycle --clean -t " + number);
    }
}

TEST_F(RecycleTask, ACheckThatIsOffLeavesItsStoredValueInPlace) {
    Stored().appArgs = kFullFlat;
    EXPECT_EQ(FlatAfter(R"({"clean_file_policy":{"reserve_policy":{"size_greater_check":false,)"
                        R"("size_greater":9,"size_smaller_check":false,"size_smaller":9,)"
                        R"("extension_check":false,"extension":[]}}})"),
              R"({"advconfig":{"reserve_policy_extension":[{"file_ext":"doc"}],)"
              R"("reserve_policy_extension_check":"off","reserve_policy_size_greater":"3",)"
              R"("reserve_policy_size_greater_check":"off","reserve_policy_size_smaller":"4",)"
              R"("reserve_policy_size_smaller_check":"off"},"clean_all":"no",)"
              R"("clean_policy":"clean_policy_by_size","clean_policy_by_size_MB_number":"12",)"
              R"("clean_policy_by_size_sort_type":"Delete old files first",)"
              R"("clean_policy_by_time_day":"9","mine":1,"recycle_action":"1",)"
              R"("selected_shares":["docs"]})");
}

TEST_F(RecycleTask, EachPolicyOfTheFormHasItsStoredWord) {
    const auto policy = [&](const char* file) {
        Stored().appArgs = R"({"recycle_action":"2"})";
        return FlatAfter(std::string(R"({"clean_file_policy":)") + file + "}");
    };
    EXPECT_EQ(policy(R"({"policy":"time","time":14,"size":3})"),
              R"({"clean_policy":"clean_policy_by_time","clean_policy_by_time_day":"14",)"
              R"("recycle_action":"2"})");
    EXPECT_EQ(policy(R"({"policy":"size","size":-3,"time":14,"sort_type":0})"),
              R"({"clean_policy":"clean_policy_by_size","clean_policy_by_size_MB_number":"-3",)"
              R"("clean_policy_by_size_sort_type":"Delete large files first",)"
              R"("recycle_action":"2"})");
    EXPECT_EQ(policy(R"({"policy":"clean_all","time":14})"),
              R"({"clean_policy":"clean_policy_default","recycle_action":"2"})");
    EXPECT_EQ(policy(R"({"policy":""})"),
              R"({"clean_policy":"clean_policy_default","recycle_action":"2"})");
}

TEST_F(RecycleTask, TheWishToEnableBinsIsNeverStored) {
    EXPECT_EQ(FlatAfter(R"({"enableRecycle":"select"})"),
              R"({"clean_all":"yes","recycle_action":"2"})");
    EXPECT_EQ(FlatAfter(R"({"enableRecycle":null})"),
              R"({"clean_all":"yes","recycle_action":"2"})");
}

TEST_F(RecycleTask, DamagedStoredSectionsGiveWayToTheForm) {
    for (const char* stored : {"[1]", "5", "\"text\"", "not json", ""}) {
        Stored().appArgs = stored;
        EXPECT_EQ(SetForm("{}"), R"(error 117 {"msg":"Invalid (app) object"})") << stored;
    }
    Stored().appArgs = R"({"recycle_action":"2","advconfig":"x"})";
    EXPECT_EQ(FlatAfter(R"({"clean_file_policy":{"reserve_policy":{"extension_check":false}}})"),
              R"({"advconfig":{"reserve_policy_extension_check":"off"},"recycle_action":"2"})");
}

TEST_F(RecycleTask, AFormThatIsNoObjectEndsAsAnExceptionWithNothingSaved) {
    for (const char* form : {"5", "[1]", "\"x\"", "true"}) {
        EXPECT_THROW(SetForm(form), Json::LogicError) << form;
    }
    EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
}

TEST_F(RecycleTask, SetAnswersWhatKeptTheStoredSectionAway) {
    constexpr const char* kRefused =
        "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:222 Convert task from json (app) failed. "
        "[0x0900 platform.cpp:42]";
    platform.FailCall("ORVASchedTaskAlloc");
    EXPECT_EQ(SetForm("{}"), R"(error 117 {"msg":"Failed to allocate task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:102 alloc task failed. "
                            "id:[5] [0x0900 platform.cpp:42]",
                            kRefused));
    platform.ClearJournal();
    platform.FailCall("ORVASchedTaskLoad");
    EXPECT_EQ(SetForm("{}"), R"(error 4801 {"msg":"Failed to load task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:108 load task failed. "
                            "id:[5] [0x0900 platform.cpp:42]",
                            "ORVASchedTaskFree(#1)", kRefused));
}

TEST_F(RecycleTask, SetWithoutMemoryForTheSecondRecordIsLoggedAndAnswered) {
    platform.FailCall("ORVASchedTaskAlloc", 2);
    EXPECT_EQ(SetForm(R"({"enableRecycle":"all"})"), R"(error 117 {"msg":"Failed to new task"})");
    EXPECT_THAT(platform.Journal(),
                ElementsAre("ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)",
                            "ORVASchedTaskFree(#1)", "ORVASchedTaskAlloc()",
                            "LOG_ERR ORVA.Core.TaskScheduler.Basic.cpp:229 Failed to new task. "
                            "[0x0900 platform.cpp:42]"));
}

TEST_F(RecycleTask, AFormThatCannotBeLaidOverTheStoredSectionIsLeftUnchanged) {
    ORVA::APIRequest request = Request(R"({"id":99})");
    ORVA::APIResponse response;
    Json::Value app = "unchanged";
    EXPECT_FALSE(TaskSchedulerRecycleHandler(&request, &response).ReConstructJsonSet_App(app));
    EXPECT_EQ(Compact(app), R"("unchanged")");
}

// --- From the flat section to the form -----------------------------------------------------------

TEST_F(RecycleTask, GetShowsTheWholeSectionAsTheForm) {
    EXPECT_EQ(FormOf(kFullFlat),
              R"({"clean_file_policy":{"policy":"size","reserve_policy":{)"
              R"("extension":[{"file_ext":"doc"}],"extension_check":true,"size_greater":3,)"
              R"("size_greater_check":true,"size_smaller":4,"size_smaller_check":true},)"
              R"("size":12,"sort_type":1},)"
              R"("clean_share_policy":{"clean_all":false,"shares":["docs"]},"mine":1})");
}

TEST_F(RecycleTask, ANewTaskShowsTheBlankForm) {
    EXPECT_EQ(Serve<TaskSchedulerRecycleHandler>("get", R"({"id":-1,"type":"recycle"})"),
              R"(success {"action":"","can_edit_name":true,"can_edit_owner":false,"enable":true,)"
              R"("extra":{"clean_file_policy":{"policy":"clean_all","reserve_policy":{)"
              R"("extension_check":false,"size_greater_check":false,"size_smaller_check":false}},)"
              R"("clean_share_policy":{"clean_all":true,"shares":null}},"id":-1,"name":"",)"
              R"("owner":"admin",)"
              R"("schedule":{"minute":null,"repeat_date":null,"week_day":null},)"
              R"("type":"custom"})");
}

TEST_F(RecycleTask, ANewTaskHoldsTheActionCleanForAllShares) {
    ORVA::APIRequest request = Request("{}");
    ORVA::APIResponse response;
    Json::Value app;
    EXPECT_TRUE(TaskSchedulerRecycleHandler(&request, &response).GetOriginAppObj(app));
    EXPECT_EQ(Compact(app), R"({"clean_all":"yes","recycle_action":"2"})");
}

TEST_F(RecycleTask, GetShowsTheTimePolicy) {
    EXPECT_EQ(FormOf(R"({"clean_policy":"clean_policy_by_time","clean_policy_by_time_day":"14x",)"
                     R"("clean_policy_by_size_MB_number":"3"})"),
              R"({"clean_file_policy":{"policy":"time","reserve_policy":{)"
              R"("extension_check":false,"size_greater_check":false,"size_smaller_check":false},)"
              R"("time":14},"clean_share_policy":{"clean_all":false,"shares":null}})");
}

TEST_F(RecycleTask, TheDefaultPolicyReadsAsCleanAllAndIsWrittenBackAsTheDefault) {
    const std::string flat =
        R"({"advconfig":{"reserve_policy_extension_check":"off",)"
        R"("reserve_policy_size_greater_check":"off","reserve_policy_size_smaller_check":"off"},)"
        R"("clean_all":"yes","clean_policy":"clean_policy_default","recycle_action":"2"})";
    const std::string form = FormOf(flat);
    EXPECT_EQ(form, R"({"clean_file_policy":{"policy":"clean_all","reserve_policy":{)"
                    R"("extension_check":false,"size_greater_check":false,)"
                    R"("size_smaller_check":false}},)"
                    R"("clean_share_policy":{"clean_all":true,"shares":null}})");
    EXPECT_EQ(FlatAfter(form), flat);
}

TEST_F(RecycleTask, ASortTypeBeyondTheTwoIsWrittenAsLargeFirstAndReadBackAsZero) {
    for (const std::string sortType : {"2", "0", "-1", "4294967297", "18446744073709551615"}) {
        Stored().appArgs = kFullFlat;
        EXPECT_THAT(FlatAfter(R"({"clean_file_policy":{"policy":"size","size":1,"sort_type":)" +
                              sortType + "}}"),
                    ::testing::HasSubstr("Delete large files first"))
            << sortType;
        EXPECT_THAT(FormOf(Stored().appArgs), ::testing::HasSubstr(R"("sort_type":0)")) << sortType;
    }
}

TEST_F(RecycleTask, GetHidesTheActionAndALaterSetKeepsIt) {
    Stored().appArgs = R"({"clean_all":"yes","recycle_action":"1"})";
    const std::string form = FormOf(Stored().appArgs);
    EXPECT_EQ(form.find("recycle_action"), std::string::npos);
    EXPECT_THAT(FlatAfter(form), ::testing::HasSubstr(R"("recycle_action":"1")"));
    EXPECT_EQ(Stored().command, "/usr/orva/bin/orvarecycle --enable");
}

TEST_F(RecycleTask, GetReadsNumbersAsTheirLeadingDigits) {
    const auto size = [&](const std::string& megabytes) {
        const Json::Value form = Document(FormOf(R"({"clean_policy":"clean_policy_by_size",)"
                                                 R"("clean_policy_by_size_MB_number":)" +
                                                 megabytes + "}"));
        return Compact(form["clean_file_policy"]["size"]);
    };
    EXPECT_EQ(size(R"("12abc")"), "12");
    EXPECT_EQ(size(R"("-7")"), "-7");
    EXPECT_EQ(size(R"("")"), "0");
    EXPECT_EQ(size("null"), "0");
    EXPECT_EQ(size("15"), "15");
    EXPECT_EQ(size("[]"), "0");
    EXPECT_EQ(size(R"("99999999999999999999")"), "9223372036854775807");
}

TEST_F(RecycleTask, GetOfADamagedSectionShowsAFormWithoutValues) {
    const std::string blank =
        R"({"clean_file_policy":{"policy":"clean_all","reserve_policy":{)"
        R"("extension_check":false,"size_greater_check":false,"size_smaller_check":false}},)"
        R"("clean_share_policy":{"clean_all":false,"shares":null}})";
    for (const char* stored : {"", "not json", "[1]", "5", R"({"advconfig":[1]})",
                               R"({"advconfig":"x","clean_policy":{},"clean_all":[]})",
                               R"({"clean_share_policy":5,"clean_file_policy":[5]})"}) {
        EXPECT_EQ(FormOf(stored), blank) << stored;
    }
}

TEST_F(RecycleTask, AKeepRuleThatIsOnWithoutItsValueShowsZeroAndNull) {
    EXPECT_THAT(FormOf(R"({"advconfig":{"reserve_policy_size_greater_check":"on",)"
                       R"("reserve_policy_extension_check":"on"}})"),
                ::testing::HasSubstr(
                    R"("reserve_policy":{"extension":null,"extension_check":true,)"
                    R"("size_greater":0,"size_greater_check":true,"size_smaller_check":false})"));
}

}  // namespace
}  // namespace fakes
