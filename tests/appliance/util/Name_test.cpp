#include "appliance/util/Name.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using orva::IsSafeName;
using namespace std::string_literals;

TEST(NameTest, TakesWhatPeopleCallTheirShares) {
    EXPECT_TRUE(IsSafeName("photo"));
    EXPECT_TRUE(IsSafeName("Urlaub 2025 – Süden"));
    EXPECT_TRUE(IsSafeName("it's $HOME; \"quoted\""));
    EXPECT_TRUE(IsSafeName("写真"));
    EXPECT_TRUE(IsSafeName(".hidden"));
    EXPECT_TRUE(IsSafeName("a-b"));
    EXPECT_TRUE(IsSafeName("two\nlines"));
    EXPECT_TRUE(IsSafeName(std::string(255, 'n')));
}

TEST(NameTest, RefusesWhatAToolWouldReadAsASwitchOrAPath) {
    EXPECT_FALSE(IsSafeName(""));
    EXPECT_FALSE(IsSafeName("-rf"));
    EXPECT_FALSE(IsSafeName("."));
    EXPECT_FALSE(IsSafeName(".."));
    EXPECT_FALSE(IsSafeName("a/b"));
    EXPECT_FALSE(IsSafeName("/"));
    EXPECT_FALSE(IsSafeName("a\0b"s));
    EXPECT_FALSE(IsSafeName("\xFF"));
    EXPECT_FALSE(IsSafeName(std::string(256, 'n')));
}

}  // namespace
