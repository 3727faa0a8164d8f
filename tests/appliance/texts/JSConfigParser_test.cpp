#include <gmock/gmock.h>

#include "platform/texts.h"
#include "tests/appliance/util/Sandbox.h"

namespace {

using ORVA::ZUM::JSConfigParser;

class JSConfigParserTest : public Sandbox {
  protected:
    void Install(const std::string& folder, const std::string& id,
                 const std::vector<std::string>& languages) const {
        const std::string directory = "/usr/orva/orvaman/webman/apps/" + folder;
        Write(directory + "/app.json", R"({"id": ")" + id + R"(", "texts": "ui/texts"})");
        for (const std::string& language : languages) {
            MakeDirectory(directory + "/ui/texts/" + language);
        }
    }

    static Json::Value TextsOf(const std::string& language) {
        JSConfigParser parser(language);
        parser.Parse();
        return parser.GetTexts();
    }
};

TEST_F(JSConfigParserTest, IsEmptyBeforeItParsed) {
    Install("a", "A", {"en"});
    EXPECT_EQ(JSConfigParser("en").GetTexts(), Json::Value(Json::objectValue));
}

TEST_F(JSConfigParserTest, IsEmptyWithoutApplications) {
    EXPECT_EQ(TextsOf("en"), Json::Value(Json::objectValue));
}

TEST_F(JSConfigParserTest, GivesEachApplicationsDirectoryInTheLanguage) {
    Install("a", "App.One", {"en", "de"});
    Install("b", "App.Two", {"en", "de"});
    const Json::Value texts = TextsOf("de");
    EXPECT_EQ(texts.size(), 2U);
    EXPECT_EQ(texts["App.One"].asString(), "apps/a/ui/texts/de");
    EXPECT_EQ(texts["App.Two"].asString(), "apps/b/ui/texts/de");
}

TEST_F(JSConfigParserTest, FallsBackToEnglishWhereTheLanguageIsMissing) {
    Install("a", "App.One", {"en", "de"});
    Install("b", "App.Two", {"en"});
    Install("c", "App.Three", {});
    const Json::Value texts = TextsOf("de");
    EXPECT_EQ(texts["App.One"].asString(), "apps/a/ui/texts/de");
    EXPECT_EQ(texts["App.Two"].asString(), "apps/b/ui/texts/en");
    EXPECT_EQ(texts["App.Three"].asString(), "apps/c/ui/texts/en");
}

TEST_F(JSConfigParserTest, LetsNoLanguageLeadOutOfTheTexts) {
    Install("a", "A", {"en"});
    for (const char* language : {"", ".", "..", "../..", "/", "en/../en"}) {
        EXPECT_EQ(TextsOf(language)["A"].asString(), "apps/a/ui/texts/en") << language;
    }
}

TEST_F(JSConfigParserTest, SeesALanguageThatIsInstalledLater) {
    Install("a", "A", {"en"});
    EXPECT_EQ(TextsOf("ja")["A"].asString(), "apps/a/ui/texts/en");
    Install("a", "A", {"ja"});
    EXPECT_EQ(TextsOf("ja")["A"].asString(), "apps/a/ui/texts/ja");
}

}  // namespace
