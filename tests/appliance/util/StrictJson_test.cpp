#include "appliance/util/StrictJson.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using orva::ParseStrictJson;
using namespace std::string_literals;

std::string ErrorOf(const std::string& text) {
    std::string error;
    EXPECT_FALSE(ParseStrictJson(text, error).has_value()) << text;
    EXPECT_FALSE(error.empty()) << text;
    EXPECT_EQ(error.find('\n'), std::string::npos) << error;
    return error;
}

Json::Value ValueOf(const std::string& text) {
    std::string error = "untouched";
    auto value = ParseStrictJson(text, error);
    EXPECT_TRUE(value.has_value()) << text << ": " << error;
    EXPECT_EQ(error, "untouched");
    return value.value_or(Json::Value("no value"));
}

TEST(StrictJsonTest, TakesAnyValueAtTheTop) {
    EXPECT_TRUE(ValueOf("null").isNull());
    EXPECT_EQ(ValueOf("true"), Json::Value(true));
    EXPECT_EQ(ValueOf(" false\r\n\t"), Json::Value(false));
    EXPECT_EQ(ValueOf("42"), Json::Value(42));
    EXPECT_EQ(ValueOf("\"text\""), Json::Value("text"));
    EXPECT_TRUE(ValueOf("[]").isArray());
    EXPECT_TRUE(ValueOf("{}").isObject());
}

TEST(StrictJsonTest, ReadsNumbersOfEveryForm) {
    EXPECT_EQ(ValueOf("-0").asInt(), 0);
    EXPECT_EQ(ValueOf("-7").asInt(), -7);
    EXPECT_EQ(ValueOf("1.5").asDouble(), 1.5);
    EXPECT_EQ(ValueOf("[2e3,2E+3,2000e-3]")[2].asDouble(), 2.0);
    EXPECT_EQ(ValueOf("9223372036854775807").asInt64(), INT64_MAX);
    EXPECT_EQ(ValueOf("18446744073709551615").asUInt64(), UINT64_MAX);
    EXPECT_TRUE(ValueOf("18446744073709551616").isDouble());
}

TEST(StrictJsonTest, ReadsTextsWithEscapesAndUtf8) {
    EXPECT_EQ(ValueOf(R"("\"\\\/\b\f\n\r\tA\u00e9")").asString(), "\"\\/\b\f\n\r\tAé");
    EXPECT_EQ(ValueOf(R"("\ud83d\ude00")").asString(), "\U0001F600");
    EXPECT_EQ(ValueOf("\"ごみ箱\"").asString(), "ごみ箱");
    EXPECT_EQ(ValueOf("{\"\":1}")[""].asInt(), 1);
    EXPECT_EQ(ValueOf("\"\x7F\"").asString(), "\x7F");
}

TEST(StrictJsonTest, RefusesWhatIsNoJson) {
    const std::vector<std::string> texts = {"",
                                            " ",
                                            "nul",
                                            "nullx",
                                            "True",
                                            "NaN",
                                            "Infinity",
                                            "-Infinity",
                                            "[1,]",
                                            "[,1]",
                                            "[1 2]",
                                            "[1",
                                            "]",
                                            "{",
                                            "{\"a\"}",
                                            "{\"a\":}",
                                            "{\"a\":1,}",
                                            "{,}",
                                            "{a:1}",
                                            "{'a':1}",
                                            "{1:2}",
                                            "{\"a\" 1}",
                                            "[1]]",
                                            "{\"a\":1}}",
                                            "// c\n1",
                                            "1 // c",
                                            "/* c */ 1",
                                            "[1,/**/2]",
                                            "'text'",
                                            "\"text",
                                            "\"a\nb\"",
                                            "\"a\tb\"",
                                            "\"\\x41\"",
                                            "\"\\u12\"",
                                            "\"\\u12g4\"",
                                            "\"\\",
                                            "[1}",
                                            "{\"a\":1]",
                                            "[\"a\":1]",
                                            "{\"a\",1}",
                                            "[:]",
                                            "truefalse",
                                            "[true1]",
                                            "[\"a\"\"b\"]",
                                            "[1,,2]",
                                            "{\"a\":1,,\"b\":2}",
                                            "[1;2]",
                                            "\v1",
                                            "[nullnull]",
                                            "[ttrue]"};
    for (const std::string& text : texts) {
        ErrorOf(text);
    }
}

TEST(StrictJsonTest, RefusesMalformedNumbers) {
    for (const char* text :
         {"01",    "-01", "00",    "-",     "+1",  ".5",    "1.", "1.e3", "1e",    "1e+",   "0x10",
          "1_000", "--1", "1.2.3", "1e2e3", "- 1", "[1-2]", "1a", "[-]",  "1e999", "-1e999"}) {
        ErrorOf(text);
    }
}

TEST(StrictJsonTest, RefusesAnythingAfterTheDocument) {
    ErrorOf("{} {}");
    ErrorOf("1 2");
    ErrorOf("{}x");
    ErrorOf("{}\0"s);
    ErrorOf("null,");
}

TEST(StrictJsonTest, RefusesAByteOrderMark) { ErrorOf("\xEF\xBB\xBF{}"); }

TEST(StrictJsonTest, RefusesANulInATextOrAName) {
    EXPECT_EQ(ErrorOf(R"(["a\u0000b"])"), "line 1, column 9: a NUL in a text");
    ErrorOf(R"({"a\u0000b":1})");
    ErrorOf("\"a\0b\""s);
}

TEST(StrictJsonTest, RefusesAMemberNamedTwice) {
    ErrorOf(R"({"a":1,"a":2})");
    ErrorOf(R"([{"b":{"a":1,"\u0061":1}}])");
    EXPECT_EQ(ValueOf(R"([{"a":1},{"a":2}])")[1]["a"].asInt(), 2);
}

TEST(StrictJsonTest, RefusesTextThatIsNotUtf8) {
    for (const char* text : {"\"\x80\"", "\"\xC3\"", "\"\xC0\xAF\"", "\"\xED\xA0\x80\"", "\"\xFF\"",
                             "\"\xF4\x90\x80\x80\"", "\"\xE0\x80\xAF\"", "\"\xF8\x88\x80\x80\x80\"",
                             "{\"\xC3\x28\":1}", "\xC3\xA9"}) {
        ErrorOf(text);
    }
    EXPECT_EQ(ErrorOf("[1,\n \"ab\xFF\"]"), "line 2, column 5: text that is not UTF-8");
}

TEST(StrictJsonTest, RefusesHalfOfASurrogatePair) {
    for (const char* text : {R"("\ud800")", R"("\udc00")", R"("\ud800\u0041")", R"("\ud800x")",
                             R"("\ud800\n")", R"("\ud83d\ud83d")", R"("\ud800\)"}) {
        ErrorOf(text);
    }
}

TEST(StrictJsonTest, TakesSixtyFourLevelsAndNoMore) {
    const auto arrays = [](std::size_t depth) {
        return std::string(depth, '[') + std::string(depth, ']');
    };
    EXPECT_TRUE(ValueOf(arrays(64)).isArray());
    EXPECT_EQ(ErrorOf(arrays(65)), "line 1, column 65: arrays and objects nested too deeply");
    std::string objects = "1";
    for (int i = 0; i < 64; ++i) {
        objects = "{\"a\":" + objects + "}";
    }
    EXPECT_TRUE(ValueOf(objects).isObject());
    ErrorOf("[" + objects + "]");
}

TEST(StrictJsonTest, CountsBracketsInTextsAsText) {
    EXPECT_EQ(ValueOf("\"" + std::string(1000, '[') + "\"").asString().size(), 1000U);
}

TEST(StrictJsonTest, RefusesADocumentOfAHundredThousandLevels) {
    ErrorOf(std::string(100000, '['));
    std::string objects;
    for (int i = 0; i < 100000; ++i) {
        objects += "{\"a\":";
    }
    ErrorOf(objects);
}

TEST(StrictJsonTest, SaysWhereTheFaultIs) {
    EXPECT_EQ(ErrorOf("{\n  \"a\": 01\n}"), "line 2, column 9: a malformed number");
    EXPECT_EQ(ErrorOf("[1, x]"), "line 1, column 5: an unexpected character");
    EXPECT_EQ(ErrorOf("{\"a\" 1}"), "line 1, column 6: missing ':' after object member name");
    EXPECT_EQ(ErrorOf("{\"a\":}"),
              "line 1, column 6: syntax error: value, object or array expected");
    EXPECT_EQ(ErrorOf(""), "line 1, column 1: syntax error: value, object or array expected");
    EXPECT_EQ(ErrorOf("{\"a\":1,\"a\":2}"), "line 1, column 8: duplicate key: 'a'");
    EXPECT_EQ(ErrorOf("1 2"), "line 1, column 3: extra non-whitespace after JSON value");
}

TEST(StrictJsonTest, NeverReadsBeyondATextWithoutAZero) {
    const std::string text = "[1,2]trailing";
    std::string error;
    const auto value = ParseStrictJson(std::string_view(text).substr(0, 5), error);
    ASSERT_TRUE(value.has_value());
    EXPECT_EQ(value->size(), 2U);
    const std::vector<char> bytes = {'1', '2'};
    EXPECT_EQ(ParseStrictJson({bytes.data(), bytes.size()}, error)->asInt(), 12);
}

TEST(StrictJsonTest, ChecksEveryStartOfADocumentWithoutHarm) {
    const std::string text = R"({"a":[1,-2.5e+3,"\ud83d\ude00\n",true,null],"ü":{"b":""}})";
    ValueOf(text);
    for (std::size_t length = 0; length < text.size(); ++length) {
        ErrorOf(text.substr(0, length));
    }
}

TEST(StrictJsonTest, TakesOnlyAnObjectWhereOneIsAskedFor) {
    std::string error = "untouched";
    const auto object = orva::ParseStrictObject(R"({"a":1})", error);
    ASSERT_TRUE(object.has_value());
    EXPECT_EQ((*object)["a"], 1);
    EXPECT_EQ(error, "untouched");
    EXPECT_FALSE(orva::ParseStrictObject("[]", error).has_value());
    EXPECT_EQ(error, "the document is no object");
    EXPECT_FALSE(orva::ParseStrictObject("{} x", error).has_value());
    EXPECT_EQ(error, "line 1, column 4: an unexpected character");
}

}  // namespace
