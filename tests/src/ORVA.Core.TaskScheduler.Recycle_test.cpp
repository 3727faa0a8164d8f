#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "tests/src/RecycleTask.h"

namespace fakes {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::MatchesRegex;

// --- The record ----------------------------------------------------------------------------------

TEST_F(RecycleTask, SetWritesEveryPropertyInItsOrderAndEnablesTheBinsBeforeItSaves) {
    Stored().appArgs = R"({"recycle_action":"1"})";
    EXPECT_EQ(SetForm(R"({"clean_share_policy":{"clean_all":false,"shares":["docs","it's"]},)"
                      R"("enableRecycle":"select"})"),
              R"(success {"id":5})");
    EXPECT_THAT(
        platform.Journal(),
        ElementsAre(
            "ORVASchedTaskAlloc()", "ORVASchedTaskLoad(5, #1)", "ORVASchedTaskFree(#1)",
            "ORVASchedTaskAlloc()",
            R"(ORVASchedTaskConvertFromJson_Basic({"enabled":"off","id":"5","owner":null,)"
            R"("task_name":"Job"}, #2))",
            R"(ORVASchedTaskConvertFromJson_Schedule({"min":null,"repeat":null,)"
            R"("week_name":null}, #2))",
            R"(ORVASchedCTaskSetEditForm(#2, "ORVA.ZUM.TaskScheduler.Recycle.FormPanel"))",
            "ORVASchedCTaskSetSimpleEditForm(#2, 1)", "ORVASchedCTaskSetCanEditName(#2, 1)",
            "ORVASchedCTaskSetCanEditOwner(#2, 0)", "ORVASchedCTaskSetCanRunAppSameTime(#2, 1)",
            "ORVASchedCTaskSetListable(#2, 1)",
            R"(ORVASchedCTaskSetApp(#2, "ORVA.ZUM.TaskScheduler.Recycle"))",
            R"(ORVASchedCTaskSetAppName(#2, "#share:recycle_bin#"))",
            R"(ORVASchedCTaskSetAppArgs(#2, "{\"clean_all\":\"no\",\"recycle_action\":\"1\",)"
            R"(\"selected_shares\":[\"docs\",\"it's\"]}\n"))",
            R"(QLIBCEncShParam("docs", 10))", R"(QLIBCEncShParam("it's", 10))",
            R"(ORVASchedCTaskSetAction(#2, "#share:share_enable_recycle_bin#: \"docs\" \"it's\""))",
            R"(ORVASchedCTaskSetCommand(#2, "/usr/orva/bin/orvarecycle --enable 'docs' 'it'\\''s'"))",
            R"(ORVARecycleStatusSet("docs", 1))", R"(ORVARecycleStatusSet("it's", 1))",
            "ORVASchedTaskSave(#2)", "ORVASchedTaskFree(#2)"));
}

TEST_F(RecycleTask, SetLeavesTheSameTimeFlagAsItIs) {
    Stored().canRunTaskSameTime = true;
    SetForm("{}");
    EXPECT_EQ(platform.Calls("ORVASchedCTaskSetCanRunTaskSameTime"), 0);
    EXPECT_TRUE(Stored().canRunTaskSameTime);
}

TEST_F(RecycleTask, CreateStoresATaskThatCleansAllShares) {
    EXPECT_EQ(Serve<TaskSchedulerRecycleHandler>("set", R"({"name":"New"})"),
              R"(success {"id":100})");
    EXPECT_EQ(platform.tasks[100].ToText(),
              R"(id=100, name="New", owner="admin", enabled=0, )"
              R"(app="ORVA.ZUM.TaskScheduler.Recycle", appName="#share:recycle_bin#", )"
              R"(appArgs="{\"clean_all\":\"yes\",\"recycle_action\":\"2\"}\n", )"
              R"(action="#share:share_clean_all_recycle_bin#", )"
              R"(command="/usr/orva/bin/orvarecycle --clean", )"
              R"(editForm="ORVA.ZUM.TaskScheduler.Recycle.FormPanel", nextTriggerTime="N/A", )"
              R"(simpleEditForm=1, canEditName=1, canEditOwner=0, canRunTaskSameTime=0, )"
              R"(canRunAppSameTime=1, listable=1, canRunFromUI=1, canEditFromUI=1, )"
              R"(canDeleteFromUI=1, isNew=0, schedule={"min":null,"repeat":null,)"
              R"("week_name":null})");
}

TEST_F(RecycleTask, TheStoredActionChoosesSwitchAndText) {
    const auto with = [](const char* action) {
        return std::string(R"({"clean_all":"no","selected_shares":["docs"],"recycle_action":")") +
               action + "\"}";
    };
    EXPECT_EQ(CommandOf(with("0")), "/usr/orva/bin/orvarecycle --disable 'docs'");
    EXPECT_EQ(Stored().action, R"(#share:share_disable_recycle_bin#: "docs")");
    EXPECT_EQ(CommandOf(with("1")), "/usr/orva/bin/orvarecycle --enable 'docs'");
    EXPECT_EQ(Stored().action, R"(#share:share_enable_recycle_bin#: "docs")");
    EXPECT_EQ(CommandOf(with("2")), "/usr/orva/bin/orvarecycle --clean 'docs'");
    EXPECT_EQ(Stored().action, R"(#schedule:clean_recycle_bin#: "docs")");
}

TEST_F(RecycleTask, AllSharesAreMeantUnlessTheSectionSaysNo) {
    for (const char* cleanAll : {R"("clean_all":"yes",)", R"("clean_all":"No",)",
                                 R"("clean_all":"",)", R"("clean_all":null,)", ""}) {
        EXPECT_EQ(CommandOf(std::string("{") + cleanAll +
                            R"("recycle_action":"0","selected_shares":["docs"]})"),
                  "/usr/orva/bin/orvarecycle --disable")
            << cleanAll;
        EXPECT_EQ(Stored().action, "#share:share_clean_all_recycle_bin#");
    }
}

TEST_F(RecycleTask, ANameThatCannotBeQuotedLeavesAnEmptyWord) {
    platform.FailCall("QLIBCEncShParam");
    EXPECT_EQ(CommandOf(R"({"clean_all":"no","recycle_action":"1","selected_shares":["a","b"]})"),
              "/usr/orva/bin/orvarecycle --enable  'b'");
    EXPECT_EQ(Stored().action, R"(#share:share_enable_recycle_bin#: "a" "b")");
    ASSERT_EQ(platform.Log().size(), 1U);
    EXPECT_THAT(platform.Log()[0], MatchesRegex("lib\\.cpp:21 escape cmd=a failed, errno=.*"));
}

TEST_F(RecycleTask, ANameThatThereIsNoMemoryToQuoteLeavesAnEmptyWord) {
    platform.FailCall("calloc");
    EXPECT_EQ(CommandOf(R"({"clean_all":"no","recycle_action":"1","selected_shares":["a","b"]})"),
              "/usr/orva/bin/orvarecycle --enable  'b'");
    EXPECT_EQ(Stored().action, R"(#share:share_enable_recycle_bin#: "a" "b")");
    ASSERT_EQ(platform.Log().size(), 1U);
    EXPECT_THAT(platform.Log()[0], MatchesRegex("lib\\.cpp:16 malloc failed, errno=.*"));
}

TEST_F(RecycleTask, WithoutMemoryToQuoteAnyNameASelectionIsRefused) {
    platform.FailCall("calloc", 0);
    EXPECT_EQ(SetForm(R"({"clean_share_policy":{"clean_all":false,"shares":["docs","it's"]},)"
                      R"("enableRecycle":"select"})"),
              R"(error 117 {"msg":"Invalid (app) object"})");
    ASSERT_EQ(platform.Log().size(), 4U);
    EXPECT_THAT(platform.Log()[0], MatchesRegex("lib\\.cpp:16 malloc failed, errno=.*"));
    EXPECT_THAT(platform.Log()[2], ::testing::HasSubstr("error selected_shares, json app={"));
    EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
    EXPECT_THAT(Enabled(), IsEmpty());
}

TEST_F(RecycleTask, SharesOfWhichNoneCanBeQuotedNeverMeanAllShares) {
    for (const char* shares : {R"([""])", R"(["",""])"}) {
        platform.ClearJournal();
        Stored().appArgs =
            std::string(R"({"clean_all":"no","recycle_action":"2","selected_shares":)") + shares +
            "}";
        EXPECT_EQ(SetForm("{}"), R"(error 117 {"msg":"Invalid (app) object"})") << shares;
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetCommand"), 0);
        EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
    }
}

TEST_F(RecycleTask, ARulesSwitchInThePlaceOfAShareIsRefused) {
    for (const char* shares : {R"(["-t","30"])", R"(["docs","-s","0"])", R"(["-o","1"])",
                               R"(["-m","1"])", R"(["-l","1"])", R"(["-file_ext=x"])"}) {
        platform.ClearJournal();
        Stored().appArgs =
            std::string(R"({"clean_all":"no","recycle_action":"2","selected_shares":)") + shares +
            "}";
        EXPECT_EQ(SetForm("{}"), R"(error 117 {"msg":"Invalid (app) object"})") << shares;
        EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
    }
}

TEST_F(RecycleTask, AnUnknownActionIsLoggedAndRefusedAfterTheArgumentsAreWritten) {
    for (const char* action : {R"("3")", R"("")", R"("clean")", "{}", "null"}) {
        platform.ClearJournal();
        const std::string before = std::string(R"({"recycle_action":)") + action + "}";
        Stored().appArgs = before;
        EXPECT_EQ(SetForm(R"({"enableRecycle":"all"})"),
                  R"(error 117 {"msg":"Invalid (app) object"})")
            << action;
        ASSERT_EQ(platform.Log().size(), 2U);
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetAppArgs"), 1);
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetAppName"), 1);
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetAction"), 0);
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetCommand"), 0);
        EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
        EXPECT_THAT(Enabled(), IsEmpty());
        EXPECT_EQ(Stored().appArgs, before);
    }
}

TEST_F(RecycleTask, TheLogShowsTheRefusedSectionStyled) {
    Stored().appArgs = R"({"recycle_action":"9"})";
    SetForm(R"({"enableRecycle":"all"})");
    EXPECT_THAT(platform.Log()[0],
                MatchesRegex("ORVA\\.Core\\.TaskScheduler\\.Recycle\\.cpp:[0-9]+ error "
                             "recycle_action, json app=\\{\n\t\"recycle_action\" : \"9\"\n\\}\n"));
}

TEST_F(RecycleTask, ASelectionWithoutSharesIsLoggedAndRefused) {
    for (const char* shares : {R"(,"selected_shares":[])", "", R"(,"selected_shares":null)",
                               R"(,"selected_shares":"docs")", R"(,"selected_shares":{"a":"b"})"}) {
        platform.ClearJournal();
        Stored().appArgs = std::string(R"({"clean_all":"no","recycle_action":"2")") + shares + "}";
        EXPECT_EQ(SetForm(R"({"enableRecycle":"all"})"),
                  R"(error 117 {"msg":"Invalid (app) object"})")
            << shares;
        EXPECT_THAT(platform.Log()[0],
                    MatchesRegex("ORVA\\.Core\\.TaskScheduler\\.Recycle\\.cpp:[0-9]+ error "
                                 "selected_shares, json app=\\{\n\t\"clean_all\" : \"no\".*"));
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetAppArgs"), 1);
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetAction"), 0);
        EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
        EXPECT_THAT(Enabled(), IsEmpty());
    }
}

TEST_F(RecycleTask, ASelectionWithAnElementThatIsNoNameIsLoggedAndRefused) {
    for (const char* element : {"5", "null", "{}", "[\"docs\"]", "true"}) {
        platform.ClearJournal();
        EXPECT_EQ(SetForm(std::string(R"({"clean_share_policy":{"clean_all":false,)"
                                      R"("shares":["docs",)") +
                          element + R"(]},"enableRecycle":"select"})"),
                  R"(error 117 {"msg":"Invalid (app) object"})")
            << element;
        EXPECT_THAT(platform.Log()[0], ::testing::HasSubstr("error selected_shares, json app={"));
        EXPECT_THAT(Enabled(), IsEmpty());
    }
}

// --- The clean policy in the command -------------------------------------------------------------

TEST_F(RecycleTask, TheTimePolicyPassesTheDaysAsTheyStand) {
    const std::string head = R"({"recycle_action":"2","clean_policy":"clean_policy_by_time")";
    EXPECT_EQ(CommandOf(head + R"(,"clean_policy_by_time_day":"7"})"),
              "/usr/orva/bin/orvarecycle --clean -t 7");
    EXPECT_EQ(CommandOf(head + R"(,"clean_policy_by_time_day":7})"),
              "/usr/orva/bin/orvarecycle --clean -t 7");
    EXPECT_EQ(CommandOf(head + R"(,"clean_policy_by_time_day":""})"),
              "/usr/orva/bin/orvarecycle --clean -t ");
    EXPECT_EQ(CommandOf(head + "}"), "/usr/orva/bin/orvarecycle --clean -t ");
}

TEST_F(RecycleTask, TheSizePolicyPassesBytesAndTheOrderOfDeletion) {
    const auto with = [](const std::string& sortType) {
        return R"({"recycle_action":"2","clean_policy":"clean_policy_by_size",)"
               R"("clean_policy_by_size_MB_number":"3")" +
               sortType + "}";
    };
    EXPECT_EQ(CommandOf(with(R"(,"clean_policy_by_size_sort_type":"Delete large files first")")),
              "/usr/orva/bin/orvarecycle --clean -s 3145728 -o 2");
    EXPECT_EQ(CommandOf(with(R"(,"clean_policy_by_size_sort_type":"Delete old files first")")),
              "/usr/orva/bin/orvarecycle --clean -s 3145728 -o 1");
    EXPECT_EQ(CommandOf(with("")), "/usr/orva/bin/orvarecycle --clean -s 3145728 -o 1");
}

TEST_F(RecycleTask, BytesAreThoseOfSigned32BitArithmeticWidened) {
    const std::vector<std::pair<std::string, std::string>> cases = {
        {R"("0")", "0"},
        {R"("1")", "1048576"},
        {R"("100")", "104857600"},
        {R"("2047")", "2146435072"},
        {R"("2048")", "18446744071562067968"},
        {R"("4095")", "18446744073708503040"},
        {R"("4096")", "0"},
        {R"("4097")", "1048576"},
        {R"("-1")", "18446744073708503040"},
        {R"("12abc")", "12582912"},
        {R"(" +12")", "12582912"},
        {R"("abc")", "0"},
        {R"("")", "0"},
        {"null", "0"},
        {"12", "12582912"},
        {R"("99999999999999999999")", "18446744073708503040"},
        {R"("-99999999999999999999")", "0"},
        {"{}", "0"},
    };
    for (const auto& [megabytes, bytes] : cases) {
        EXPECT_EQ(CommandOf(R"({"recycle_action":"2","clean_policy":"clean_policy_by_size",)"
                            R"("clean_policy_by_size_MB_number":)" +
                            megabytes + "}"),
                  "/usr/orva/bin/orvarecycle --clean -s " + bytes + " -o 1")
            << megabytes;
    }
    EXPECT_EQ(CommandOf(R"({"recycle_action":"2","clean_policy":"clean_policy_by_size"})"),
              "/usr/orva/bin/orvarecycle --clean -s 0 -o 1");
}

TEST_F(RecycleTask, KeepRulesFollowThePolicyInTheirOrder) {
    EXPECT_EQ(CommandOf(R"({"recycle_action":"2","clean_policy":"clean_policy_by_time",)"
                        R"("clean_policy_by_time_day":"30","advconfig":{)"
                        R"("reserve_policy_size_smaller_check":"on",)"
                        R"("reserve_policy_size_smaller":"2",)"
                        R"("reserve_policy_size_greater_check":"on",)"
                        R"("reserve_policy_size_greater":"100",)"
                        R"("reserve_policy_extension_check":"on",)"
                        R"("reserve_policy_extension":[{"file_ext":"doc"},{"file_ext":"jpg"}]}})"),
              "/usr/orva/bin/orvarecycle --clean -t 30 -file_ext=\"doc.jpg\" -m 104857600 "
              "-l 2097152");
}

TEST_F(RecycleTask, AKeepRuleCountsOnlyWhenItsCheckIsOn) {
    for (const char* check : {R"("off")", R"("ON")", R"("")", "true", "null", "[]"}) {
        EXPECT_EQ(CommandOf(std::string(R"({"recycle_action":"2","advconfig":{)"
                                        R"("reserve_policy_size_smaller":"2",)"
                                        R"("reserve_policy_size_greater":"3",)"
                                        R"("reserve_policy_extension":[{"file_ext":"doc"}],)"
                                        R"("reserve_policy_size_smaller_check":)") +
                            check + R"(,"reserve_policy_size_greater_check":)" + check +
                            R"(,"reserve_policy_extension_check":)" + check + "}}"),
                  "/usr/orva/bin/orvarecycle --clean")
            << check;
    }
    EXPECT_EQ(CommandOf(R"({"recycle_action":"2","advconfig":{)"
                        R"("reserve_policy_size_greater_check":"on"}})"),
              "/usr/orva/bin/orvarecycle --clean -m 0");
}

std::string KeepingExtensions(const std::string& extensions) {
    return R"({"advconfig":{"reserve_policy_extension":)" + extensions +
           R"(,"reserve_policy_extension_check":"on"},"recycle_action":"2"})";
}

TEST_F(RecycleTask, WithoutExtensionsTheCheckAddsNothing) {
    for (const char* extensions : {"[]", "null"}) {
        EXPECT_EQ(CommandOf(KeepingExtensions(extensions)), "/usr/orva/bin/orvarecycle --clean")
            << extensions;
    }
    EXPECT_EQ(
        CommandOf(R"({"recycle_action":"2","advconfig":{"reserve_policy_extension_check":"on"}})"),
        "/usr/orva/bin/orvarecycle --clean");
}

TEST_F(RecycleTask, ExtensionsThatAreNoneAreLoggedAndRefusedBeforeAnyBinIsEnabled) {
    for (const char* extensions :
         {R"("doc")", R"({"file_ext":"doc"})", "5", "true", R"(["doc"])",
          R"([{"file_ext":"doc"},"pdf"])", R"([{"file_ext":"doc"},{}])", R"([{"file_ext":5}])",
          R"([{"file_ext":null}])", R"([{"file_ext":["doc"]}])", "[null]", "[5]", R"([["doc"]])",
          R"([{"file_ext":""}])", R"([{"file_ext":""},{"file_ext":" . "}])",
          R"([{"file_ext":"\t."}])"}) {
        platform.ClearJournal();
        const std::string before = KeepingExtensions(extensions);
        Stored().appArgs = before;
        Stored().command = "former";
        EXPECT_EQ(SetForm(R"({"enableRecycle":"all"})"),
                  R"(error 117 {"msg":"Invalid (app) object"})")
            << extensions;
        ASSERT_EQ(platform.Log().size(), 2U);
        EXPECT_THAT(platform.Log()[0],
                    MatchesRegex("ORVA\\.Core\\.TaskScheduler\\.Recycle\\.cpp:[0-9]+ error "
                                 "reserve_policy_extension, json app=\\{\n\t\"advconfig\" : .*"));
        EXPECT_EQ(platform.Log()[1],
                  "ORVA.Core.TaskScheduler.Basic.cpp:244 Convert task from json (app) failed. "
                  "[0x0000 :0]");
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetAppArgs"), 1);
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetAction"), 0);
        EXPECT_EQ(platform.Calls("ORVASchedCTaskSetCommand"), 0);
        EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
        EXPECT_THAT(Enabled(), IsEmpty());
        EXPECT_EQ(Stored().appArgs, before);
        EXPECT_EQ(Stored().command, "former");
    }
}

TEST_F(RecycleTask, ExtensionsThatAreNoneAreNotLookedAtWhereNothingIsKept) {
    EXPECT_EQ(CommandOf(R"({"recycle_action":"1","advconfig":{"reserve_policy_extension":["doc"],)"
                        R"("reserve_policy_extension_check":"on"}})"),
              "/usr/orva/bin/orvarecycle --enable");
    EXPECT_EQ(CommandOf(R"({"recycle_action":"2","advconfig":{"reserve_policy_extension":["doc"],)"
                        R"("reserve_policy_extension_check":"off"}})"),
              "/usr/orva/bin/orvarecycle --clean");
}

TEST_F(RecycleTask, AnEmptyTextBetweenExtensionsLeavesTheOthers) {
    EXPECT_EQ(CommandOf(KeepingExtensions(
                  R"([{"file_ext":"a"},{"file_ext":""},{"file_ext":"b","more":1}])")),
              "/usr/orva/bin/orvarecycle --clean -file_ext=\"a..b\"");
}

TEST_F(RecycleTask, ExtensionsGoIntoTheCommandAsTheyStand) {
    EXPECT_EQ(CommandOf(R"({"recycle_action":"2","advconfig":{)"
                        R"("reserve_policy_extension_check":"on",)"
                        R"("reserve_policy_extension":[{"file_ext":"$(id)\" `x` '"}]}})"),
              "/usr/orva/bin/orvarecycle --clean -file_ext=\"$(id)\" `x` '\"");
}

TEST_F(RecycleTask, PolicySwitchesBelongToCleaningOnly) {
    const std::string tail =
        R"(,"clean_policy":"clean_policy_by_time","clean_policy_by_time_day":"7",)"
        R"("advconfig":{"reserve_policy_size_greater_check":"on"}})";
    EXPECT_EQ(CommandOf(R"({"recycle_action":"0")" + tail), "/usr/orva/bin/orvarecycle --disable");
    EXPECT_EQ(CommandOf(R"({"recycle_action":"1")" + tail), "/usr/orva/bin/orvarecycle --enable");
    EXPECT_EQ(CommandOf(R"({"recycle_action":"2")" + tail),
              "/usr/orva/bin/orvarecycle --clean -t 7 -m 0");
}

TEST_F(RecycleTask, OtherPoliciesAddNoSwitch) {
    for (const char* policy : {R"("clean_policy_default")", R"("else")", "null", "[]"}) {
        EXPECT_EQ(CommandOf(std::string(R"({"recycle_action":"2","clean_policy_by_time_day":"7",)"
                                        R"("clean_policy":)") +
                            policy + "}"),
                  "/usr/orva/bin/orvarecycle --clean");
    }
}

// --- Failures ------------------------------------------------------------------------------------

TEST_F(RecycleTask, AFailedSaveLeavesTheBinsEnabled) {
    platform.FailCall("ORVASchedTaskSave");
    EXPECT_EQ(SetForm(R"({"enableRecycle":"all"})"), R"(error 117 {"msg":"Failed to save task"})");
    EXPECT_EQ(Enabled().size(), 3U);
}

TEST_F(RecycleTask, AFailingSetterIsPassedOver) {
    ExpectFailingSettersArePassedOver(
        {"ORVASchedCTaskSetEditForm", "ORVASchedCTaskSetSimpleEditForm",
         "ORVASchedCTaskSetCanEditName", "ORVASchedCTaskSetCanEditOwner",
         "ORVASchedCTaskSetCanRunAppSameTime", "ORVASchedCTaskSetListable", "ORVASchedCTaskSetApp",
         "ORVASchedCTaskSetAppName", "ORVASchedCTaskSetAppArgs", "ORVASchedCTaskSetAction",
         "ORVASchedCTaskSetCommand"},
        [] { return SetForm("{}"); });
}

TEST_F(RecycleTask, AnExceptionFromThePlatformFreesRecordsAndLists) {
    for (const char* function : {"ORVAShareEnum", "QLIBCSzListGet", "ORVARecycleStatusSet",
                                 "ORVASchedCTaskSetAppArgs", "ORVASchedTaskGetAppArgs"}) {
        platform.ThrowFrom(function);
        EXPECT_THROW(SetForm(R"({"enableRecycle":"all"})"), std::runtime_error) << function;
        EXPECT_EQ(platform.Leftovers(), "") << function;
    }
}

}  // namespace
}  // namespace fakes
