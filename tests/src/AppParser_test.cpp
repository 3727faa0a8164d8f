#include "include/AppParser.h"

#include <gmock/gmock.h>

#include <string>

#include "tests/fakes/PlatformTest.h"

namespace {

using ORVA::Core::TaskScheduler::AppParser;
using ::testing::ElementsAre;

class AppParserTest : public fakes::PlatformTest {
  protected:
    AppParserTest() {
        platform.texts["/usr/orva/orvaman/webman/texts/enu"] = fakes::Document(R"({
            "common": {"run": "Run", "empty": "", "number": 5, "a:b": "with colon"},
            "": {"": "nothing at all"},
            "odd": "not a section"
        })");
    }

    // Makes "com.example.Notes" a separately installed application with these texts.
    void InstallNotes(const std::string& texts) {
        platform.appTexts["com.example.Notes"] = "apps/notes/texts/enu";
        platform.texts["/usr/orva/orvaman/webman/apps/notes/texts/enu"] = fakes::Document(texts);
    }
};

TEST_F(AppParserTest, ReadsTheCommonTextsOfItsLanguageOnce) {
    const AppParser parser("enu");
    EXPECT_EQ(parser.GetString("", "#common:run#"), "Run");
    EXPECT_EQ(parser.GetString("", "#common:run#"), "Run");
    EXPECT_THAT(platform.TextsJournal(),
                ElementsAre("JSConfigParser(\"enu\")", "JSConfigParser::Parse()",
                            "JSConfigParser::GetTexts()",
                            "ParseTexts(\"/usr/orva/orvaman/webman/texts/enu\")"));
}

TEST_F(AppParserTest, UsesTheLanguageAsItStandsForTheNameOfTheDirectory) {
    const AppParser parser("");
    EXPECT_EQ(platform.TextsJournal().back(), "ParseTexts(\"/usr/orva/orvaman/webman/texts/\")");
}

TEST_F(AppParserTest, TakesATextForAKeyOnlyBetweenMarksAndWithAColon) {
    const AppParser parser("enu");
    EXPECT_TRUE(parser.IsSectionKey("#common:run#"));
    EXPECT_TRUE(parser.IsSectionKey("#:#"));
    EXPECT_TRUE(parser.IsSectionKey("#:k#"));
    EXPECT_TRUE(parser.IsSectionKey("#s:#"));
    EXPECT_FALSE(parser.IsSectionKey(""));
    EXPECT_FALSE(parser.IsSectionKey("#"));
    EXPECT_FALSE(parser.IsSectionKey("##"));
    EXPECT_FALSE(parser.IsSectionKey(":"));
    EXPECT_FALSE(parser.IsSectionKey("#common:run"));
    EXPECT_FALSE(parser.IsSectionKey("common:run#"));
    EXPECT_FALSE(parser.IsSectionKey("#common run#"));
    EXPECT_FALSE(parser.IsSectionKey("#common:run# "));
}

TEST_F(AppParserTest, GivesBackWhatIsNoKey) {
    const AppParser parser("enu");
    EXPECT_EQ(parser.GetString("", "Run"), "Run");
    EXPECT_EQ(parser.GetString("", ""), "");
    EXPECT_EQ(parser.GetString("", "#"), "#");
    EXPECT_EQ(parser.GetString("", "#common:run"), "#common:run");
    EXPECT_EQ(parser.GetString("", "#common#"), "#common#");
}

TEST_F(AppParserTest, LooksNothingUpForWhatIsNoKey) {
    InstallNotes("{}");
    const AppParser parser("enu");
    platform.ClearJournal();
    EXPECT_EQ(parser.GetString("com.example.Notes", "#common:run"), "#common:run");
    EXPECT_EQ(parser.GetString("com.example.Notes", "#common#"), "#common#");
    EXPECT_EQ(parser.GetString("com.example.Notes", "common:run"), "common:run");
    EXPECT_THAT(platform.FullJournal(), ElementsAre());
}

TEST_F(AppParserTest, GivesBackAKeyWithoutAText) {
    const AppParser parser("enu");
    EXPECT_EQ(parser.GetString("", "#common:missing#"), "#common:missing#");
    EXPECT_EQ(parser.GetString("", "#missing:run#"), "#missing:run#");
    EXPECT_EQ(parser.GetString("", "#common:#"), "#common:#");
}

TEST_F(AppParserTest, TreatsAnEmptyTextAsMissing) {
    const AppParser parser("enu");
    EXPECT_EQ(parser.GetString("", "#common:empty#"), "#common:empty#");
}

TEST_F(AppParserTest, TreatsMembersOfAWrongTypeAsMissing) {
    const AppParser parser("enu");
    EXPECT_EQ(parser.GetString("", "#common:number#"), "#common:number#");
    EXPECT_EQ(parser.GetString("", "#odd:key#"), "#odd:key#");
}

TEST_F(AppParserTest, DistinguishesUpperAndLowerCaseInKeys) {
    const AppParser parser("enu");
    EXPECT_EQ(parser.GetString("", "#Common:run#"), "#Common:run#");
    EXPECT_EQ(parser.GetString("", "#common:Run#"), "#common:Run#");
}

TEST_F(AppParserTest, SplitsAKeyAtItsFirstColon) {
    const AppParser parser("enu");
    EXPECT_EQ(parser.GetString("", "#common:a:b#"), "with colon");
}

TEST_F(AppParserTest, LooksUpAnEmptySectionAndAnEmptyKeyName) {
    const AppParser parser("enu");
    EXPECT_EQ(parser.GetString("", "#:#"), "nothing at all");
    const AppParser other("deu");
    EXPECT_EQ(other.GetString("", "#:#"), "#:#");
}

TEST_F(AppParserTest, PrefersTheTextsOfASeparatelyInstalledApplication) {
    InstallNotes(R"({"common": {"run": "Run notes"}})");
    const AppParser parser("enu");
    EXPECT_EQ(parser.GetString("com.example.Notes", "#common:run#"), "Run notes");
    EXPECT_EQ(parser.GetString("com.example.Other", "#common:run#"), "Run");
}

TEST_F(AppParserTest, FallsBackToTheCommonTextWhenTheApplicationsOwnIsEmpty) {
    InstallNotes(R"({"common": {"run": ""}})");
    const AppParser parser("enu");
    EXPECT_EQ(parser.GetString("com.example.Notes", "#common:run#"), "Run");
}

TEST_F(AppParserTest, FallsBackToTheCommonTextWhenTheApplicationLacksTheSection) {
    InstallNotes(R"({"notes": {"run": "Run notes"}})");
    const AppParser parser("enu");
    EXPECT_EQ(parser.GetString("com.example.Notes", "#common:run#"), "Run");
}

TEST_F(AppParserTest, FallsBackToTheCommonTextWhenTheApplicationsTextsHaveAWrongType) {
    for (const std::string texts : {R"(["common"])", R"({"common": "run"})", R"({"common": [1]})",
                                    R"({"common": {"run": 5}})", "null"}) {
        InstallNotes(texts);
        const AppParser parser("enu");
        EXPECT_EQ(parser.GetString("com.example.Notes", "#common:run#"), "Run") << texts;
    }
}

TEST_F(AppParserTest, GivesBackTheKeyWhenNeitherApplicationNorCommonTextsHaveIt) {
    InstallNotes(R"({"common": {"run": "Run notes"}})");
    const AppParser parser("enu");
    EXPECT_EQ(parser.GetString("com.example.Notes", "#common:missing#"), "#common:missing#");
}

TEST_F(AppParserTest, ReadsAnApplicationsTextsAfreshForEveryLookup) {
    InstallNotes(R"({"common": {"run": "Run notes"}})");
    const AppParser parser("enu");
    platform.ClearJournal();
    EXPECT_EQ(parser.GetString("com.example.Notes", "#common:run#"), "Run notes");
    InstallNotes(R"({"common": {"run": "Run new notes"}})");
    EXPECT_EQ(parser.GetString("com.example.Notes", "#common:run#"), "Run new notes");
    EXPECT_THAT(platform.TextsJournal(),
                ElementsAre("ParseTexts(\"/usr/orva/orvaman/webman/apps/notes/texts/enu\")",
                            "ParseTexts(\"/usr/orva/orvaman/webman/apps/notes/texts/enu\")"));
}

TEST_F(AppParserTest, ReadsNothingForApplicationsWithoutTextsOfTheirOwn) {
    InstallNotes("{}");
    const AppParser parser("enu");
    platform.ClearJournal();
    EXPECT_EQ(parser.GetString("", "#common:run#"), "Run");
    EXPECT_EQ(parser.GetString("ORVA.ZUM.TaskScheduler.Beep", "#common:run#"), "Run");
    EXPECT_EQ(parser.GetString("COM.EXAMPLE.NOTES", "#common:run#"), "Run");
    EXPECT_THAT(platform.FullJournal(), ElementsAre());
}

TEST_F(AppParserTest, KnowsSeparatelyInstalledApplicationsByTheirExactId) {
    InstallNotes("{}");
    const AppParser parser("enu");
    EXPECT_TRUE(parser.Is3rdPartyApp("com.example.Notes"));
    EXPECT_FALSE(parser.Is3rdPartyApp("com.example.notes"));
    EXPECT_FALSE(parser.Is3rdPartyApp("com.example"));
    EXPECT_FALSE(parser.Is3rdPartyApp(""));
}

TEST_F(AppParserTest, TreatsADirectoryThatIsNoTextAsMissing) {
    platform.appTexts["com.example.Notes"] = 5;
    const AppParser parser("enu");
    EXPECT_TRUE(parser.Is3rdPartyApp("com.example.Notes"));
    platform.ClearJournal();
    EXPECT_EQ(parser.GetString("com.example.Notes", "#common:run#"), "Run");
    EXPECT_THAT(platform.FullJournal(), ElementsAre());
}

TEST_F(AppParserTest, LivesWithReadersThatFindNothing) {
    for (const Json::Value& nothing :
         {Json::Value(), Json::Value(Json::arrayValue), Json::Value("texts"), Json::Value(5)}) {
        platform.appTexts = nothing;
        platform.texts["/usr/orva/orvaman/webman/texts/enu"] = nothing;
        const AppParser parser("enu");
        EXPECT_FALSE(parser.Is3rdPartyApp("com.example.Notes"));
        EXPECT_EQ(parser.GetString("com.example.Notes", "#common:run#"), "#common:run#");
    }
}

}  // namespace
