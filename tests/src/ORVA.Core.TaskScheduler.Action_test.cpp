#include <string>
#include <utility>
#include <vector>

#include "include/TaskSchedulerHandler.h"
#include "tests/src/ModuleTest.h"

namespace {

using ::testing::ElementsAre;

class TranslateActionKeyTest : public fakes::PlatformTest {
  protected:
    TranslateActionKeyTest() {
        platform.texts["/usr/orva/orvaman/webman/texts/enu"] = fakes::Document(R"({
            "a": {"b": "AB", "b:c": "ABC", "empty": "", "self": "again #a:b#", "": "no key"},
            "c": {"d": "CD"},
            "": {"k": "no section"}
        })");
    }

    // The row after translating, as text.
    std::string Translate(const Json::Value& row, const std::string& app = "") {
        ORVA::APIRequest request = fakes::Request("{}");
        ORVA::APIResponse response;
        TaskSchedulerHandler handler(&request, &response);
        Json::Value translated = row;
        handler.TranslateActionKey(translated, app);
        return fakes::Compact(translated);
    }

    std::string Action(const std::string& action, const std::string& app = "") {
        Json::Value row;
        row["action"] = action;
        return fakes::Document(Translate(row, app))["action"].asString();
    }
};

TEST_F(TranslateActionKeyTest, LeavesAnActionThatIsNoTextAlone) {
    for (const std::string row :
         {R"({"action":5})", R"({"action":null})", R"({"action":["#a:b#"]})",
          R"({"action":{"text":"#a:b#"}})", R"({"action":true})"}) {
        EXPECT_EQ(Translate(fakes::Document(row)), row);
    }
}

TEST_F(TranslateActionKeyTest, GivesARowWithoutAnActionANullOne) {
    EXPECT_EQ(Translate(fakes::Document(R"({"id":5})")), R"({"action":null,"id":5})");
    EXPECT_EQ(Translate(Json::Value()), R"({"action":null})");
}

TEST_F(TranslateActionKeyTest, ChangesNothingButTheAction) {
    EXPECT_EQ(Translate(fakes::Document(R"({"action":"#a:b#","name":"#a:b#"})")),
              R"({"action":"AB","name":"#a:b#"})");
}

TEST_F(TranslateActionKeyTest, ReplacesKeysAndKeepsThePlainText) {
    for (const auto& [action, translated] : std::vector<std::pair<std::string, std::string>>{
             {"", ""},
             {"no mark: none, at all:", "no mark: none, at all:"},
             {"#a:b#", "AB"},
             {"Run #a:b# now", "Run AB now"},
             {"#a:b##c:d#", "ABCD"},
             {"#a:b##a:b#", "ABAB"},
             {"#a:b# and #c:d# and #a:b#", "AB and CD and AB"},
             {"#:k#", "no section"},
             {"#a:#", "no key"},
             {"#a:b:c#", "ABC"},
             {"##a:b#", "#AB"},
             {"###a:b##", "##AB#"},
             {"#ab#a:b#", "#abAB"},
             {"x:#ab#", "x:#ab#"},
             {"x:#a:b#", "x:AB"},
             {"x:#ab#c:d#", "x:#abCD"},
             {"#a:b#x#c:d#", "ABxCD"},
             {":#a:b#", ":AB"},
             {":#ab#", ":#ab#"},
             {"#abc", "#abc"},
             {"#a:b", "#a:b"},
             {"#a:b# #a:b", "AB #a:b"},
             {"#", "#"},
             {"##", "##"},
             {"#:", "#:"},
             {"#missing:key# #a:b#", "#missing:key# AB"},
             {"#a:empty#", "#a:empty#"},
             {"#a:b\n#", "#a:b\n#"},
             {"ä#a:b#ö", "äABö"}}) {
        EXPECT_EQ(Action(action), translated) << action;
    }
}

TEST_F(TranslateActionKeyTest, ClosesAKeyAtTheFirstMarkAfterAColon) {
    // "#a:b#" is a key; "c:d#" after it has lost its opening mark.
    EXPECT_EQ(Action("#a:b#c:d#"), "ABc:d#");
    // The colon before the opening mark does not count, the one after it does.
    EXPECT_EQ(Action(":#c:d#:"), ":CD:");
}

TEST_F(TranslateActionKeyTest, DoesNotTranslateTheTextsThatItPutIn) {
    EXPECT_EQ(Action("#a:self#"), "again #a:b#");
}

TEST_F(TranslateActionKeyTest, ReplacesTheFirstOccurrenceThatTheOutputHas) {
    // The text of the first key holds the second key, which is therefore found inside it.
    EXPECT_EQ(Action("#a:self# #a:b#"), "again AB #a:b#");
}

TEST_F(TranslateActionKeyTest, AsksForNothingWhenTheActionHoldsNoKey) {
    platform.appTexts["com.example.Notes"] = "apps/notes";
    for (const std::string action :
         {"", "plain: text", "#common#", ":#ab#", "#a:b", "a:b#", "##"}) {
        platform.ClearJournal();
        EXPECT_EQ(Action(action, "com.example.Notes"), action);
        EXPECT_THAT(platform.TextsJournal(),
                    ElementsAre("JSConfigParser(\"enu\")", "JSConfigParser::Parse()",
                                "JSConfigParser::GetTexts()",
                                "ParseTexts(\"/usr/orva/orvaman/webman/texts/enu\")"))
            << action;
    }
}

TEST_F(TranslateActionKeyTest, AsksForEveryOccurrenceOfAKeyOfTheOwningApplication) {
    platform.appTexts["com.example.Notes"] = "apps/notes";
    platform.texts["/usr/orva/orvaman/webman/apps/notes"] =
        fakes::Document(R"({"a": {"b": "note"}, "": {"": "nothing"}})");
    EXPECT_EQ(Action("#a:b# #a:b# #c:d# #:#", "com.example.Notes"), "note note CD nothing");
    EXPECT_THAT(platform.TextsJournal(),
                ElementsAre("JSConfigParser(\"enu\")", "JSConfigParser::Parse()",
                            "JSConfigParser::GetTexts()",
                            "ParseTexts(\"/usr/orva/orvaman/webman/texts/enu\")",
                            "ParseTexts(\"/usr/orva/orvaman/webman/apps/notes\")",
                            "ParseTexts(\"/usr/orva/orvaman/webman/apps/notes\")",
                            "ParseTexts(\"/usr/orva/orvaman/webman/apps/notes\")",
                            "ParseTexts(\"/usr/orva/orvaman/webman/apps/notes\")"));
}

}  // namespace
