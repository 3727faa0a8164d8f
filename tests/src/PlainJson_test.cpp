#include "include/PlainJson.h"

#include <gtest/gtest.h>
#include <json/reader.h>
#include <json/writer.h>

#include <array>
#include <cstddef>
#include <optional>
#include <random>
#include <string>
#include <string_view>

namespace {

std::optional<Json::Value> Plain(std::string_view text) {
    Json::Value value;
    return ReadPlainJson(text, {}, value) ? std::optional(value) : std::nullopt;
}

#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

std::optional<Json::Value> Ordinary(const std::string& text) {
    Json::Value value;
    return Json::Reader().parse(text, value) ? std::optional(value) : std::nullopt;
}

// Tells 1 from 1U, too, which compare equal.
bool HaveSameTypes(const Json::Value& left, const Json::Value& right) {
    if (left.type() != right.type() || left.size() != right.size()) {
        return false;
    }
    auto other = right.begin();
    for (const Json::Value& member : left) {
        if (!HaveSameTypes(member, *other++)) {
            return false;
        }
    }
    return true;
}

void ExpectSameAsOrdinary(const std::string& text) {
    const std::optional<Json::Value> plain = Plain(text);
    ASSERT_TRUE(plain) << text;
    const std::optional<Json::Value> ordinary = Ordinary(text);
    ASSERT_TRUE(ordinary) << text;
    EXPECT_EQ(*plain, *ordinary) << text;
    EXPECT_TRUE(HaveSameTypes(*plain, *ordinary)) << text;
    EXPECT_EQ(Json::FastWriter().write(*plain), Json::FastWriter().write(*ordinary)) << text;
}

#pragma GCC diagnostic pop

TEST(PlainJsonTest, ReadsAStoredSection) {
    const std::optional<Json::Value> section = Plain(
        "{\"service_action\":\"1\",\"service_store\":[{\"display_name\":\"\",\"enabled\":true,"
        "\"name\":\"Samba\",\"service_type\":1}]}\n");
    ASSERT_TRUE(section);
    EXPECT_EQ((*section)["service_action"], "1");
    const Json::Value& service = (*section)["service_store"][0];
    EXPECT_EQ(service["display_name"], "");
    EXPECT_EQ(service["enabled"], true);
    EXPECT_EQ(service["name"], "Samba");
    EXPECT_EQ(service["service_type"], 1);
    EXPECT_EQ(service.size(), 4U);
}

TEST(PlainJsonTest, YieldsWhatTheOrdinaryReaderYields) {
    for (const char* text : {"{}",
                             "[]",
                             " {\t} \r\n",
                             "[ ]",
                             "[1]",
                             "{\"a\":null}",
                             "[true,false,null]",
                             "[0,-0,7,-7,007,999999999,-999999999]",
                             "{ \"a\" : [ 1 , \"x\" ] , \"b\" : { } }",
                             "{\"b\":1,\"a\":2}",
                             "{\"a\":1,\"a\":{\"b\":2}}",
                             "{\"a\":{\"b\":2},\"a\":{}}",
                             "{\"a\":[1,2],\"a\":[3]}",
                             "[\"\",\"\\\"\\\\\\/\\b\\f\\n\\r\\t\"]",
                             "[\"\\u0041\\u00e4\\u00DF\\u20ac\\uffff\"]",
                             "[\"a\\u0000b\"]",
                             "{\"\\u00e4\\n\":\"x\"}",
                             "[\"\xC3\xA4\"]",
                             "[\"\xFF\"]",
                             "[\"a\nb\tc\"]"}) {
        ExpectSameAsOrdinary(text);
    }
}

TEST(PlainJsonTest, LeavesEverythingElseToTheOrdinaryReader) {
    for (const std::string& text : {std::string(),
                                    std::string(" "),
                                    std::string("1"),
                                    std::string("\"x\""),
                                    std::string("null"),
                                    std::string("{"),
                                    std::string("["),
                                    std::string("[1,]"),
                                    std::string("[,1]"),
                                    std::string("{,}"),
                                    std::string("{\"a\"}"),
                                    std::string("{\"a\":}"),
                                    std::string("{\"a\":1,}"),
                                    std::string("{a:1}"),
                                    std::string("{1:2}"),
                                    std::string("{\"\":1}"),
                                    std::string("[1}"),
                                    std::string("{\"a\":1]"),
                                    std::string("[1] x"),
                                    std::string("[1]]"),
                                    std::string("// a\n[1]"),
                                    std::string("[1/**/]"),
                                    std::string("[1] // a"),
                                    std::string("[1.0]"),
                                    std::string("[1e3]"),
                                    std::string("[1234567890]"),
                                    std::string("[-]"),
                                    std::string("[+1]"),
                                    std::string("[--1]"),
                                    std::string("[truely]"),
                                    std::string("[tru"),
                                    std::string("[\"a]"),
                                    std::string("[\"\\"),
                                    std::string("[\"\\x\"]"),
                                    std::string("[\"\\u12\"]"),
                                    std::string("[\"\\u12"),
                                    std::string("[\"\\u12g4\"]"),
                                    std::string("[\"\\ud83d\\ude00\"]"),
                                    std::string("[\"\\udc00\"]"),
                                    std::string("[\0]", 3),
                                    std::string("[1]\0", 4),
                                    std::string("\xEF\xBB\xBF[1]")}) {
        Json::Value value = "before";
        EXPECT_FALSE(ReadPlainJson(text, {}, value)) << text;
        EXPECT_EQ(value, "before") << text;
    }
}

TEST(PlainJsonTest, ReadsThirtyTwoLevels) {
    const auto nested = [](std::size_t levels) {
        return std::string(levels, '[') + std::string(levels, ']');
    };
    ExpectSameAsOrdinary(nested(32));
    EXPECT_FALSE(Plain(nested(33)));
    EXPECT_FALSE(Plain(std::string(1'000'000, '[')));
}

TEST(PlainJsonTest, FrequentNamesMakeNoDifferenceToTheResult) {
    const std::array names = {Json::StaticString("name"), Json::StaticString("enabled")};
    const std::string text = R"([{"enabled":true,"name":"a","names":1},{"nam":2,"name":"b"}])";
    Json::Value value;
    ASSERT_TRUE(ReadPlainJson(text, names, value));
    EXPECT_EQ(value, Plain(text));
    EXPECT_TRUE(value[0].isMember("name"));
    EXPECT_EQ(value[1]["name"], "b");
}

TEST(PlainJsonTest, AgreesWithTheOrdinaryReaderOnWhateverItTakes) {
    const std::array<std::string, 4> seeds = {
        R"({"service_action":"0","service_store":[{"display_name":"The \"one\"","enabled":false,)"
        R"("name":"x","service_type":2},{"display_name":"\u00e4","enabled":true,"name":"y"}]})",
        R"({"script":"find / -name 'a\\b' \n # x","list":[1,-20,300,{"deep":[[],{},null]}]})",
        R"([true,false,null,"\u20ac",{"a":{"b":{"c":"d"}}}, 12, 0])",
        R"({ "beep_duration" : 30 , "b" : "30" })"};
    constexpr std::string_view kBytes = "{}[]\",:\\u0019-+.eEtfn /*\n\xC3\xA4";
    std::mt19937 random(20260501);
    std::size_t taken = 0;
    for (int round = 0; round < 40'000; ++round) {
        std::string text = seeds.at(random() % seeds.size());
        for (auto change = random() % 3; change-- > 0;) {
            const std::size_t at = random() % text.size();
            switch (random() % 3) {
                case 0:
                    text[at] = kBytes[random() % kBytes.size()];
                    break;
                case 1:
                    text.erase(at, random() % 4);
                    break;
                default:
                    text.insert(at, 1, kBytes[random() % kBytes.size()]);
            }
        }
        if (Plain(text)) {
            ++taken;
            ExpectSameAsOrdinary(text);
        }
    }
    EXPECT_GT(taken, 10'000U);
}

}  // namespace
