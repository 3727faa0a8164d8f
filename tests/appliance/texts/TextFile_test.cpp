#include "appliance/texts/TextFile.h"

#include <gtest/gtest.h>

namespace {

const Json::Value kEmpty(Json::objectValue);

TEST(TextFileTest, ReadsSectionsOfTexts) {
    std::string error;
    const Json::Value texts =
        orva::ParseTextFile(R"({"common": {"run": "Ausführen", "empty": ""}, "none": {}})", error);
    EXPECT_EQ(texts["common"]["run"].asString(), "Ausführen");
    EXPECT_EQ(texts["common"]["empty"].asString(), "");
    EXPECT_EQ(texts.size(), 2U);
    EXPECT_EQ(error, "");
}

TEST(TextFileTest, CopiesStayWhenTheDocumentIsGone) {
    std::string error;
    Json::Value copy;
    {
        const Json::Value texts =
            orva::ParseTextFile(R"({"common": {"run": "Run", "stop": "Stop"}})", error);
        copy = texts;
    }
    const Json::Value next =
        orva::ParseTextFile(R"({"common": {"run": "Los", "stop": "Stop"}})", error);
    EXPECT_EQ(copy["common"]["run"], "Run");
    EXPECT_EQ(next["common"]["run"], "Los");
    copy["common"]["run"] = "mine";
    EXPECT_EQ(next["common"]["run"], "Los");
}

TEST(TextFileTest, ReadsMoreTextsThanItKeepsForGood) {
    constexpr std::size_t kLength = 1 << 20;
    for (char letter = 'a'; letter <= 'm'; ++letter) {
        const std::string text(kLength, letter);
        const std::string name = std::string("name ") + letter;
        std::string error;
        const Json::Value texts =
            orva::ParseTextFile("{\"s\": {\"" + name + "\": \"" + text + "\"}}", error);
        const Json::Value copy = texts;
        ASSERT_EQ(copy["s"][name].asString(), text);
        EXPECT_EQ(error, "");
    }
}

TEST(TextFileTest, LeavesOutOnlyWhatIsNoTextAndNamesTheFirst) {
    const auto parse = [](const char* content, std::string& error) {
        error.clear();
        return orva::ParseTextFile(content, error);
    };
    std::string error;
    Json::Value rest;
    rest["common"]["run"] = "Run";
    EXPECT_EQ(parse(R"({"common": {"run": "Run"}, "service": "x"})", error), rest);
    EXPECT_EQ(error, "section \"service\" is no object");
    EXPECT_EQ(parse(R"({"common": {"a": 7, "run": "Run"}})", error), rest);
    EXPECT_EQ(error, "\"common:a\" is no text");
    EXPECT_EQ(parse(R"({"common": {"run": "Run", "z": {"a": "b"}}})", error), rest);
    EXPECT_EQ(error, "\"common:z\" is no text");
    EXPECT_EQ(parse(R"({"common": {"run": "Run", "y": null, "z": []}})", error), rest);
    EXPECT_EQ(error, "\"common:y\" is no text (faults in all: 2)");
    EXPECT_EQ(parse(R"({"a": [], "b": 1, "common": {"run": "Run", "x": 0}})", error), rest);
    EXPECT_EQ(error, "section \"a\" is no object (faults in all: 3)");
}

TEST(TextFileTest, KeepsASectionWhoseTextsAreAllWrong) {
    std::string error;
    Json::Value rest;
    rest["common"] = Json::Value(Json::objectValue);
    EXPECT_EQ(orva::ParseTextFile(R"({"common": {"run": 7}})", error), rest);
    EXPECT_EQ(error, "\"common:run\" is no text");
}

TEST(TextFileTest, NamesWhatIsWrongOnOneLineWhateverTheNameHolds) {
    std::string error;
    EXPECT_EQ(orva::ParseTextFile(R"({"a\nb\"": 1})", error), kEmpty);
    EXPECT_EQ(error, R"(section "a\nb\"" is no object)");
    error.clear();
    EXPECT_EQ(orva::ParseTextFile(R"({"a\n": {"b\n": 1}})", error)["a\n"], kEmpty);
    EXPECT_EQ(error, R"("a\n:b\n" is no text)");
}

TEST(TextFileTest, GivesAnEmptyObjectForAnythingElseAndSaysWhy) {
    const auto errorOf = [](const char* content) {
        std::string error;
        EXPECT_EQ(orva::ParseTextFile(content, error), kEmpty);
        return error;
    };
    EXPECT_EQ(errorOf("[]"), "the document is no object");
    EXPECT_EQ(errorOf("null"), "the document is no object");
    EXPECT_EQ(errorOf("{} x"), "line 1, column 4: an unexpected character");
    EXPECT_NE(errorOf(""), "");
}

}  // namespace
