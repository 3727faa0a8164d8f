#include "appliance/util/Utf8.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace {

using orva::ValidUtf8Length;
using namespace std::string_literals;

TEST(ValidUtf8LengthTest, EndsBeforeTheFirstBadByte) {
    EXPECT_EQ(ValidUtf8Length(""), 0U);
    EXPECT_EQ(ValidUtf8Length("abc"), 3U);
    EXPECT_EQ(ValidUtf8Length("é€\U0001F600"), 9U);
    EXPECT_EQ(ValidUtf8Length("a\x80"), 1U);
    EXPECT_EQ(ValidUtf8Length("ab\xE2\x82"), 2U);
    EXPECT_EQ(ValidUtf8Length("a\0b"s), 3U);
    EXPECT_EQ(ValidUtf8Length("\xF4\x8F\xBF\xBF"), 4U);
    EXPECT_EQ(ValidUtf8Length("\xEF\xBF\xBF"), 3U);
}

TEST(ValidUtf8LengthTest, TakesNoSurrogateNoOverLongFormAndNothingBeyondTheLastCharacter) {
    EXPECT_EQ(ValidUtf8Length("\xED\x9F\xBF"), 3U);
    EXPECT_EQ(ValidUtf8Length("\xED\xA0\x80"), 0U);
    EXPECT_EQ(ValidUtf8Length("\xC1\xBF"), 0U);
    EXPECT_EQ(ValidUtf8Length("\xE0\x9F\xBF"), 0U);
    EXPECT_EQ(ValidUtf8Length("\xF0\x8F\xBF\xBF"), 0U);
    EXPECT_EQ(ValidUtf8Length("\xF4\x90\x80\x80"), 0U);
    EXPECT_EQ(ValidUtf8Length("\xF5\x80\x80\x80"), 0U);
}

TEST(TakeCharacterTest, YieldsTheCharactersOfATextInTheirOrder) {
    std::string_view text =
        "a\x7F\xC2\x80\xDF\xBF\xE0\xA0\x80\xEF\xBF\xBF\xF0\x90\x80\x80\xF4\x8F\xBF\xBF";
    std::vector<std::uint32_t> characters;
    while (!text.empty()) {
        characters.push_back(orva::TakeCharacter(text));
    }
    EXPECT_EQ(characters, (std::vector<std::uint32_t>{0x61, 0x7F, 0x80, 0x7FF, 0x800, 0xFFFF,
                                                      0x10000, 0x10FFFF}));
}

}  // namespace
