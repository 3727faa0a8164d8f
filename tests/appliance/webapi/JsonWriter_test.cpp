#include "appliance/webapi/JsonWriter.h"

#include <gtest/gtest.h>

#include <limits>
#include <string>

namespace {

using orva::WriteJson;

TEST(JsonWriter, WritesEveryKindOfValueCompactly) {
    EXPECT_EQ(WriteJson(Json::Value()), "null");
    EXPECT_EQ(WriteJson(Json::Value(true)), "true");
    EXPECT_EQ(WriteJson(Json::Value(false)), "false");
    EXPECT_EQ(WriteJson(Json::Value("text")), "\"text\"");
    EXPECT_EQ(WriteJson(Json::Value(Json::stringValue)), "\"\"");
    EXPECT_EQ(WriteJson(Json::Value(Json::arrayValue)), "[]");
    EXPECT_EQ(WriteJson(Json::Value(Json::objectValue)), "{}");
    Json::Value document;
    document["b"].append(1);
    document["b"].append("two");
    document["b"].append(Json::Value());
    document["a"]["nested"] = false;
    EXPECT_EQ(WriteJson(document), R"({"a":{"nested":false},"b":[1,"two",null]})");
}

TEST(JsonWriter, WritesIntegersExactly) {
    EXPECT_EQ(WriteJson(Json::Value(0)), "0");
    EXPECT_EQ(WriteJson(Json::Value(Json::Int64(std::numeric_limits<std::int64_t>::min()))),
              "-9223372036854775808");
    EXPECT_EQ(WriteJson(Json::Value(Json::UInt64(std::numeric_limits<std::uint64_t>::max()))),
              "18446744073709551615");
}

TEST(JsonWriter, WritesRealsSoThatTheyComeBackAsReals) {
    EXPECT_EQ(WriteJson(Json::Value(5.0)), "5.0");
    EXPECT_EQ(WriteJson(Json::Value(-0.1)), "-0.1");
    EXPECT_EQ(WriteJson(Json::Value(1e300)), "1e+300");
    EXPECT_EQ(WriteJson(Json::Value(1.7976931348623157e308)), "1.7976931348623157e+308");
}

TEST(JsonWriter, WritesNullForNumbersThatJsonLacks) {
    EXPECT_EQ(WriteJson(Json::Value(std::numeric_limits<double>::infinity())), "null");
    EXPECT_EQ(WriteJson(Json::Value(std::numeric_limits<double>::quiet_NaN())), "null");
}

TEST(JsonWriter, EscapesWhatMayNotStandInAText) {
    EXPECT_EQ(WriteJson(Json::Value("\"\\/\b\f\n\r\t")), R"("\"\\/\b\f\n\r\t")");
    EXPECT_EQ(WriteJson(Json::Value(std::string("\0\x01\x1f\x7f", 4))),
              R"("\u0000\u0001\u001f\u007f")");
}

TEST(JsonWriter, EscapesMemberNames) {
    Json::Value document;
    document["a\"b\n"] = 1;
    EXPECT_EQ(WriteJson(document), R"({"a\"b\n":1})");
}

TEST(JsonWriter, LeavesValidUtf8AsItIs) {
    const std::string text = "\xC3\xBC \xE6\x97\xA5 \xF0\x9F\x98\x80";
    EXPECT_EQ(WriteJson(Json::Value(text)), "\"" + text + "\"");
}

TEST(JsonWriter, ReplacesEveryByteThatIsNotUtf8) {
    const std::string r = "\xEF\xBF\xBD";
    EXPECT_EQ(WriteJson(Json::Value("a\xFFz")), "\"a" + r + "z\"");
    EXPECT_EQ(WriteJson(Json::Value("\xFF\xFE")), "\"" + r + r + "\"");
    EXPECT_EQ(WriteJson(Json::Value("cut \xC3")), "\"cut " + r + "\"");
    EXPECT_EQ(WriteJson(Json::Value("\xC0\x80\"")), "\"" + r + r + "\\\"\"");
    EXPECT_EQ(WriteJson(Json::Value("\xED\xA0\x80")), "\"" + r + r + r + "\"");
}

TEST(JsonWriter, AppendsToWhatIsThere) {
    std::string text = "data:";
    orva::AppendJson(Json::Value(1), text);
    EXPECT_EQ(text, "data:1");
}

}  // namespace
