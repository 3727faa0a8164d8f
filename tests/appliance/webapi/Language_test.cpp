#include "appliance/webapi/Language.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <string>

#include "appliance/root/Root.h"
#include "tests/system/Process.h"

namespace {

using orva::ChooseLanguage;
using orva::FindLanguage;
using orva::IsLanguageTag;

class LanguageTest : public testing::Test {
  protected:
    LanguageTest() {
        for (const char* language : {"en", "de", "ja", "pt-BR", "zh_TW"}) {
            std::filesystem::create_directories(Texts() / language);
        }
        orva::SetRoot(sandbox.Path().string());
    }

    std::filesystem::path Texts() const { return sandbox.Path() / "usr/orva/orvaman/webman/texts"; }

    orva::test::Sandbox sandbox;
};

TEST_F(LanguageTest, KnowsALanguageTagByItsForm) {
    for (const char* tag : {"en", "deu", "de-AT", "zh_TW", "zh-Hant-TW", "es-419", "abcdefgh"}) {
        EXPECT_TRUE(IsLanguageTag(tag)) << tag;
    }
    for (const char* tag : {"", "e", "e1", "1e", "-de", "de-", "de--AT", "de-_AT", "abcdefghi",
                            "de-ABCDEFGHI", "../../etc", "de/..", "de.", "*", "d\xC3\xA9", "de AT",
                            "en-a-b-c-d-e-f-g-h-i-j-k-l-m-n-o-p-q"}) {
        EXPECT_FALSE(IsLanguageTag(tag)) << tag;
    }
    EXPECT_FALSE(IsLanguageTag(std::string("de\0", 3)));
    EXPECT_FALSE(IsLanguageTag(std::string(4096, 'a')));
}

TEST_F(LanguageTest, FindsTheDirectoryOfALanguage) {
    EXPECT_EQ(FindLanguage("de"), "de");
    EXPECT_EQ(FindLanguage("pt-BR"), "pt-BR");
    EXPECT_EQ(FindLanguage("zh_TW"), "zh_TW");
    EXPECT_EQ(FindLanguage("fr"), std::nullopt);
    EXPECT_EQ(FindLanguage("../texts/de"), std::nullopt);
}

TEST_F(LanguageTest, FallsBackFromARegionToItsLanguage) {
    EXPECT_EQ(FindLanguage("de-AT"), "de");
    EXPECT_EQ(FindLanguage("de_Latn-AT"), "de");
    EXPECT_EQ(FindLanguage("pt-PT"), std::nullopt);
}

TEST_F(LanguageTest, FindsALanguageWrittenInCapitals) { EXPECT_EQ(FindLanguage("DE"), "de"); }

TEST_F(LanguageTest, NeedsADirectoryNotAFile) {
    sandbox.Write("usr/orva/orvaman/webman/texts/fr", "not a directory");
    EXPECT_EQ(FindLanguage("fr"), std::nullopt);
}

TEST_F(LanguageTest, TakesTheExplicitChoiceBeforeTheHeader) {
    EXPECT_EQ(ChooseLanguage("ja", "de"), "ja");
}

TEST_F(LanguageTest, AnswersInEnglishWhenTheExplicitChoiceIsUnknown) {
    EXPECT_EQ(ChooseLanguage("fr", "de"), "en");
    EXPECT_EQ(ChooseLanguage("../../etc", "de"), "en");
    EXPECT_EQ(ChooseLanguage("", "de"), "en");
    EXPECT_EQ(ChooseLanguage(std::string(4096, 'd'), ""), "en");
}

TEST_F(LanguageTest, TakesTheBestKnownLanguageOfTheHeader) {
    EXPECT_EQ(ChooseLanguage(std::nullopt, "de"), "de");
    EXPECT_EQ(ChooseLanguage(std::nullopt, "fr, de-AT;q=0.8, ja;q=0.9"), "ja");
    EXPECT_EQ(ChooseLanguage(std::nullopt, "ja;q=0.5,de;q=0.5"), "ja");
    EXPECT_EQ(ChooseLanguage(std::nullopt, "ja ; q=0.1 , de ; Q=0.123"), "de");
}

TEST_F(LanguageTest, AnswersInEnglishWhenTheHeaderHelpsNot) {
    for (const char* header : {"", "fr", "*", "../../etc", ";;;", ",,,", "de;q=0", "de;q=0.000",
                               "de;q=2", "de;q=0.1234", "de;q=x", "de;x=1"}) {
        EXPECT_EQ(ChooseLanguage(std::nullopt, header), "en") << header;
    }
}

TEST_F(LanguageTest, ReadsOnlyTheFirstLanguagesOfAnEndlessHeader) {
    std::string header;
    for (int i = 0; i < 16; ++i) {
        header += "xx,";
    }
    EXPECT_EQ(ChooseLanguage(std::nullopt, header + "de"), "en");
    EXPECT_EQ(ChooseLanguage(std::nullopt, "de," + header), "de");
}

TEST_F(LanguageTest, AnswersInEnglishWithoutAnyTexts) {
    std::filesystem::remove_all(Texts());
    EXPECT_EQ(ChooseLanguage("de", "de"), "en");
}

}  // namespace
