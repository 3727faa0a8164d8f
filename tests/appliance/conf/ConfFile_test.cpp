#include "appliance/conf/ConfFile.h"

#include <gmock/gmock.h>

#include <string>

namespace {

using orva::ConfFile;
using orva::ParseConf;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;
using testing::UnorderedElementsAre;
using namespace std::string_literals;

TEST(ConfFileTest, ReadsKeysAndValues) {
    const ConfFile file = ParseConf("supportNFS=\"yes\"\nsupportweb=\"no\"\n");
    EXPECT_THAT(file.values,
                UnorderedElementsAre(Pair("supportNFS", "yes"), Pair("supportweb", "no")));
    EXPECT_THAT(file.damagedLines, IsEmpty());
}

TEST(ConfFileTest, SkipsEmptyLinesAndComments) {
    const ConfFile file = ParseConf("\n# a=\"1\"\n   \t\n  # b=\"2\"\nc=\"3\"");
    EXPECT_THAT(file.values, UnorderedElementsAre(Pair("c", "3")));
    EXPECT_THAT(file.damagedLines, IsEmpty());
}

TEST(ConfFileTest, TakesBlanksAroundEverything) {
    const ConfFile file = ParseConf(" \ta \t=  \" kept \"  \t\nb=\"2\" # why\nc=\"3\"#why\n");
    EXPECT_THAT(file.values,
                UnorderedElementsAre(Pair("a", " kept "), Pair("b", "2"), Pair("c", "3")));
    EXPECT_THAT(file.damagedLines, IsEmpty());
}

TEST(ConfFileTest, TakesTheLineEndsOfOtherSystems) {
    const ConfFile file = ParseConf(
        "\xEF\xBB\xBF"
        "a=\"1\"\r\n\r\n# c\r\nb=\"2\"\r\n");
    EXPECT_THAT(file.values, UnorderedElementsAre(Pair("a", "1"), Pair("b", "2")));
    EXPECT_THAT(file.damagedLines, IsEmpty());
}

TEST(ConfFileTest, LetsTheLastLineOfAKeyWin) {
    EXPECT_THAT(ParseConf("a=\"1\"\na=\"2\"\n").values, UnorderedElementsAre(Pair("a", "2")));
    EXPECT_THAT(ParseConf("a=\"1\"\na=2\n").values, UnorderedElementsAre(Pair("a", "1")));
}

TEST(ConfFileTest, TellsCapitalsInKeysApart) {
    EXPECT_THAT(ParseConf("a=\"1\"\nA=\"2\"\n").values,
                UnorderedElementsAre(Pair("a", "1"), Pair("A", "2")));
}

TEST(ConfFileTest, ReadsQuotesAndBackslashesInValues) {
    const ConfFile file = ParseConf("a=\"say \\\"yes\\\"\"\nb=\"c:\\\\d\"\nc=\"\"\nd=\"a=b#c\"\n");
    EXPECT_THAT(file.values, UnorderedElementsAre(Pair("a", "say \"yes\""), Pair("b", "c:\\d"),
                                                  Pair("c", ""), Pair("d", "a=b#c")));
    EXPECT_THAT(file.damagedLines, IsEmpty());
}

TEST(ConfFileTest, CountsDamagedLinesAsAbsent) {
    const ConfFile file = ParseConf(
        "a=\"1\"\n"
        "no equals sign\n"
        "b=2\n"
        "c=\"open\n"
        "=\"no key\"\n"
        "a key=\"x\"\n"
        "d=\"1\" \"2\"\n"
        "e=\"a\\nb\"\n"
        "f='1'\n"
        "g=\"\xFF\"\n"
        "h=\"a\0b\"\n"
        "i=\n"
        "j=\"end\\\n"
        "z=\"26\"\n"s);
    EXPECT_THAT(file.values, UnorderedElementsAre(Pair("a", "1"), Pair("z", "26")));
    EXPECT_THAT(file.damagedLines, ElementsAre(2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13));
}

TEST(ConfFileTest, FindsNothingInAnEmptyFile) {
    EXPECT_THAT(ParseConf("").values, IsEmpty());
    EXPECT_THAT(ParseConf("\n").damagedLines, IsEmpty());
}

}  // namespace
