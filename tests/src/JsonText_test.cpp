#include "include/JsonText.h"

#include <gtest/gtest.h>

#include <string>

#include "tests/fakes/RecordingPlatform.h"

namespace {

TEST(JsonTextTest, WritesCompactTextInOrderOfNamesEndedByANewline) {
    EXPECT_EQ(WriteJsonText(fakes::Document(R"({"b": [1, true, null, -2], "a": {"c": "x y"}})")),
              "{\"a\":{\"c\":\"x y\"},\"b\":[1,true,null,-2]}\n");
    EXPECT_EQ(WriteJsonText(Json::Value()), "null\n");
    EXPECT_EQ(WriteJsonText(Json::Value(Json::objectValue)), "{}\n");
}

TEST(JsonTextTest, ReadsBackWhatItWrote) {
    const Json::Value section =
        fakes::Document(R"({"script": "echo \"ä\" #1\nexit\\", "empty": "", "list": [{"id": 5}]})");
    Json::Value read;
    EXPECT_TRUE(ParseJsonText(WriteJsonText(section), read));
    EXPECT_EQ(read, section);
}

TEST(JsonTextTest, KeepsComments) {
    Json::Value read;
    EXPECT_TRUE(ParseJsonText("// first\n{\"a\": 1}", read));
    EXPECT_EQ(read["a"], 1);
    EXPECT_EQ(read.getComment(Json::commentBefore), "// first");
}

TEST(JsonTextTest, RefusesWhatIsNotJson) {
    Json::Value read;
    EXPECT_FALSE(ParseJsonText("", read));
    EXPECT_FALSE(ParseJsonText("{\"a\": ", read));
    EXPECT_FALSE(ParseJsonText("beep", read));
}

TEST(JsonTextTest, RefusesWhatIsNestedDeeperThanAThousandLevels) {
    const auto nested = [](std::size_t levels) {
        return std::string(levels, '[') + std::string(levels, ']');
    };
    Json::Value read;
    EXPECT_TRUE(ParseJsonText(nested(1000), read));
    EXPECT_TRUE(read.isArray());
    for (const std::string& text :
         {nested(1001), std::string(1500, '['), std::string(2000000, '[')}) {
        read = "before";
        EXPECT_FALSE(ParseJsonText(text, read)) << text.size();
        EXPECT_TRUE(read.isNull()) << text.size();
    }
}

}  // namespace
