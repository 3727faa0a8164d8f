// Enabling the recycle bins that a form asks for.
#include <algorithm>
#include <string>
#include <vector>

#include "tests/src/RecycleTask.h"

namespace fakes {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::MatchesRegex;

TEST_F(RecycleTask, SelectWithoutSharesEnablesNothingAndSucceeds) {
    EXPECT_EQ(SetForm(R"({"enableRecycle":"select","clean_share_policy":{"shares":["docs"]}})"),
              R"(success {"id":5})");
    EXPECT_THAT(Enabled(), IsEmpty());
    EXPECT_EQ(platform.Calls("ORVAShareEnum"), 0);
}

TEST_F(RecycleTask, AnyOtherWishEnablesEveryShareInListOrder) {
    for (const char* wish : {R"("all")", R"("")", R"("Select")", "true", "false", "1", "0"}) {
        platform.ClearJournal();
        EXPECT_EQ(SetForm(std::string(R"({"enableRecycle":)") + wish + "}"), R"(success {"id":5})");
        EXPECT_THAT(Enabled(), ElementsAre(R"(ORVARecycleStatusSet("docs", 1))",
                                           R"(ORVARecycleStatusSet("home", 1))",
                                           R"(ORVARecycleStatusSet("it's", 1))"))
            << wish;
    }
}

TEST_F(RecycleTask, AllIncludeHomeEnablesEveryShareAndThenHome) {
    platform.shares = {"docs", "video"};
    SetForm(R"({"enableRecycle":"all_include_home"})");
    const std::vector<std::string> journal = platform.Journal();
    const auto from = std::find(journal.begin(), journal.end(), "QLIBCSzListAlloc(100)");
    EXPECT_THAT(
        std::vector<std::string>(from, journal.end()),
        ElementsAre("QLIBCSzListAlloc(100)", "ORVAShareEnum(#1, 783)",
                    R"(ORVARecycleStatusSet("docs", 1))", R"(ORVARecycleStatusSet("video", 1))",
                    R"(ORVARecycleStatusSet("home", 1))",
                    MatchesRegex("LOG_ERR ORVA\\.Core\\.TaskScheduler\\.Recycle\\.cpp:[0-9]+ "
                                 "enable share=home recycle bin failed"),
                    "QLIBCSzListFree(#1)", "ORVASchedTaskSave(#2)", "ORVASchedTaskFree(#2)"));
}

TEST_F(RecycleTask, AllIncludeHomeEnablesHomeOnceMoreWhereItIsListedToo) {
    EXPECT_EQ(SetForm(R"({"enableRecycle":"all_include_home"})"), R"(success {"id":5})");
    EXPECT_THAT(
        Enabled(),
        ElementsAre(R"(ORVARecycleStatusSet("docs", 1))", R"(ORVARecycleStatusSet("home", 1))",
                    R"(ORVARecycleStatusSet("it's", 1))", R"(ORVARecycleStatusSet("home", 1))"));
    EXPECT_THAT(platform.Log(), IsEmpty());
}

TEST_F(RecycleTask, WithoutAnyShareOnlyHomeIsEnabled) {
    platform.shares.clear();
    SetForm(R"({"enableRecycle":"all_include_home"})");
    EXPECT_THAT(Enabled(), ElementsAre(R"(ORVARecycleStatusSet("home", 1))"));
}

TEST_F(RecycleTask, AShareThatCannotBeEnabledIsLoggedAndTheNextOnesFollow) {
    platform.FailCall("ORVARecycleStatusSet", 2);
    EXPECT_EQ(SetForm(R"({"enableRecycle":"all"})"), R"(success {"id":5})");
    EXPECT_EQ(Enabled().size(), 3U);
    ASSERT_EQ(platform.Log().size(), 1U);
    EXPECT_THAT(platform.Log()[0],
                MatchesRegex("ORVA\\.Core\\.TaskScheduler\\.Recycle\\.cpp:[0-9]+ enable share=home "
                             "recycle bin failed"));
}

TEST_F(RecycleTask, WithoutMemoryForTheSharesTheTaskIsSavedAllTheSame) {
    platform.FailCall("QLIBCSzListAlloc");
    EXPECT_EQ(SetForm(R"({"enableRecycle":"all"})"), R"(success {"id":5})");
    ASSERT_EQ(platform.Log().size(), 1U);
    EXPECT_THAT(platform.Log()[0],
                MatchesRegex("ORVA\\.Core\\.TaskScheduler\\.Recycle\\.cpp:[0-9]+ malloc failed"));
    EXPECT_THAT(Enabled(), IsEmpty());
}

TEST_F(RecycleTask, WithoutTheListOfSharesTheTaskIsSavedAllTheSame) {
    platform.FailCall("ORVAShareEnum");
    EXPECT_EQ(SetForm(R"({"enableRecycle":"all_include_home"})"), R"(success {"id":5})");
    const std::vector<std::string> journal = platform.Journal();
    const auto from = std::find(journal.begin(), journal.end(), "QLIBCSzListAlloc(100)");
    EXPECT_THAT(
        std::vector<std::string>(from, journal.end()),
        ElementsAre("QLIBCSzListAlloc(100)", "ORVAShareEnum(#1, 783)",
                    MatchesRegex("LOG_ERR ORVA\\.Core\\.TaskScheduler\\.Recycle\\.cpp:[0-9]+ enum "
                                 "share failed"),
                    "QLIBCSzListFree(#1)", "ORVASchedTaskSave(#2)", "ORVASchedTaskFree(#2)"));
}

TEST_F(RecycleTask, ANameMissingFromTheListIsPassedOver) {
    platform.FailCall("QLIBCSzListGet", 2);
    SetForm(R"({"enableRecycle":"all"})");
    EXPECT_THAT(Enabled(), ElementsAre(R"(ORVARecycleStatusSet("docs", 1))",
                                       R"(ORVARecycleStatusSet("it's", 1))"));
}

TEST_F(RecycleTask, EnablingReportsWhetherTheListOfSharesCouldBeHad) {
    ORVA::APIRequest request = Request("{}");
    ORVA::APIResponse response;
    TaskSchedulerRecycleHandler handler(&request, &response);
    EXPECT_TRUE(handler.EnableRecycleBin(Document(R"(["docs",5,"none"])"), "select"));
    EXPECT_THAT(Enabled(), ElementsAre(R"(ORVARecycleStatusSet("docs", 1))",
                                       R"(ORVARecycleStatusSet("none", 1))"));
    EXPECT_TRUE(handler.EnableRecycleBin(Json::Value(), "all"));
    platform.FailCall("QLIBCSzListAlloc");
    EXPECT_FALSE(handler.EnableRecycleBin(Json::Value(), "all"));
    platform.FailCall("ORVAShareEnum");
    EXPECT_FALSE(handler.EnableRecycleBin(Json::Value(), "all"));
}

TEST_F(RecycleTask, AWishThatIsNoTextEndsAsAnExceptionWithNothingEnabledOrSaved) {
    for (const char* wish : {"{}", "[\"select\"]"}) {
        EXPECT_THROW(SetForm(std::string(R"({"enableRecycle":)") + wish + "}"), Json::LogicError);
    }
    EXPECT_THAT(Enabled(), IsEmpty());
    EXPECT_EQ(platform.Calls("ORVASchedTaskSave"), 0);
}

}  // namespace
}  // namespace fakes
