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

std::string OrdinaryText(const Json::Value& value) { return Json::FastWriter().write(value); }

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
                             "[\"\\u007f\\u0080\\u07ff\\u0800\"]",
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
    EXPECT_FALSE(Plain("{\"a\":" + nested(31) + ",\"b\":" + nested(32) + "}"));
    ExpectSameAsOrdinary("{\"a\":" + nested(31) + "}");
    EXPECT_FALSE(Plain(std::string(32, '[') + "{}" + std::string(32, ']')));
    EXPECT_FALSE(Plain(std::string(1'000'000, '[')));
}

TEST(PlainJsonTest, FrequentNamesMakeNoDifferenceToTheResult) {
    constexpr std::array<std::string_view, 2> names = {"name", "enabled"};
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

Json::Value Leaf(std::mt19937& random) {
    constexpr std::string_view kBytes = "abc /~ XYZ019{}[]:,'";
    switch (random() % 6) {
        case 0:
            return static_cast<int>(random());
        case 1:
            return static_cast<Json::Value::UInt64>(random()) << (random() % 32);
        case 2:
            return random() % 2 == 0;
        case 3:
            return {};
        default: {
            std::string text(random() % 12, ' ');
            for (char& byte : text) {
                byte = random() % 40 == 0 ? static_cast<char>(random())
                                          : kBytes[random() % kBytes.size()];
            }
            return text;
        }
    }
}

Json::Value Tree(std::mt19937& random, int levels) {
    if (levels == 0 || random() % 3 == 0) {
        return Leaf(random);
    }
    Json::Value tree(random() % 2 == 0 ? Json::arrayValue : Json::objectValue);
    for (auto count = random() % 5; count-- > 0;) {
        if (tree.isArray()) {
            tree.append(Tree(random, levels - 1));
        } else {
            const std::string end = random() % 50 == 0 ? "\n" : "";
            tree["name" + end + std::to_string(random() % 9)] = Tree(random, levels - 1);
        }
    }
    return tree;
}

TEST(PlainJsonTest, WritesASection) {
    Json::Value section;
    section["beep_duration"] = 30;
    section["b"]["shares"].append("home");
    section["b"]["shares"].append("a b");
    section["b"]["none"] = Json::arrayValue;
    section["b"]["empty"] = Json::objectValue;
    section["all"] = true;
    section["not"] = false;
    section["null"] = Json::nullValue;
    section["text"] = "";
    section["slash"] = "/usr/~'";
    EXPECT_EQ(WritePlainJson(section),
              "{\"all\":true,\"b\":{\"empty\":{},\"none\":[],\"shares\":[\"home\",\"a b\"]},"
              "\"beep_duration\":30,\"not\":false,\"null\":null,\"slash\":\"/usr/~'\","
              "\"text\":\"\"}\n");
}

TEST(PlainJsonTest, WritesTheOutermostIntegers) {
    EXPECT_EQ(WritePlainJson(Json::Value::minLargestInt), "-9223372036854775808\n");
    EXPECT_EQ(WritePlainJson(Json::Value::maxLargestUInt), "18446744073709551615\n");
}

TEST(PlainJsonTest, LeavesOtherValuesToTheOrdinaryWriter) {
    Json::Value hole(Json::arrayValue);
    hole[1] = 1;
    Json::Value name(Json::objectValue);
    name["\""] = 1;
    for (const Json::Value& value :
         {Json::Value(1.5), Json::Value("\""), Json::Value("\\"), Json::Value("\n"),
          Json::Value("\x7F"), Json::Value("\xC3\xA4"), Json::Value(std::string("\0", 1)), hole,
          name}) {
        EXPECT_EQ(WritePlainJson(value), std::nullopt) << value;
    }
}

TEST(PlainJsonTest, WritesThirtyTwoLevels) {
    Json::Value nested = 1;
    for (int level = 0; level < 32; ++level) {
        Json::Value outer(Json::arrayValue);
        outer.append(nested);
        nested = outer;
    }
    EXPECT_EQ(WritePlainJson(nested), OrdinaryText(nested));
    Json::Value object(Json::objectValue);
    object["a"] = nested;
    EXPECT_EQ(WritePlainJson(object), std::nullopt);
    Json::Value array(Json::arrayValue);
    array.append(nested);
    EXPECT_EQ(WritePlainJson(array), std::nullopt);
    nested = Json::Value(Json::objectValue);
    for (int level = 0; level < 32; ++level) {
        Json::Value outer(Json::arrayValue);
        outer.append(nested);
        nested = outer;
    }
    EXPECT_EQ(WritePlainJson(nested), std::nullopt);
}

TEST(PlainJsonTest, WritesWhatTheOrdinaryWriterWrites) {
    std::mt19937 random(20261121);
    std::size_t taken = 0;
    for (int round = 0; round < 10'000; ++round) {
        const Json::Value tree = Tree(random, 4);
        if (const std::optional<std::string> text = WritePlainJson(tree)) {
            ++taken;
            EXPECT_EQ(*text, OrdinaryText(tree));
        }
    }
    EXPECT_GT(taken, 4'000U);
}

}  // namespace
