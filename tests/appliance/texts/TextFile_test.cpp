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

TEST(TextFileTest, GivesAnEmptyObjectForAnythingElseAndSaysWhy) {
    const auto errorOf = [](const char* content) {
        std::string error;
        EXPECT_EQ(orva::ParseTextFile(content, error), kEmpty);
        return error;
    };
    EXPECT_EQ(errorOf("[]"), "the document is no object");
    EXPECT_EQ(errorOf("null"), "the document is no object");
    EXPECT_EQ(errorOf(R"({"common": "run"})"), "section \"common\" is no object");
    EXPECT_EQ(errorOf(R"({"common": {"run": 7}})"), "\"common:run\" is no text");
    EXPECT_EQ(errorOf(R"({"common": {"run": {"a": "b"}}})"), "\"common:run\" is no text");
    EXPECT_EQ(errorOf("{} x"), "line 1, column 4: an unexpected character");
    EXPECT_NE(errorOf(""), "");
}

}  // namespace
