#include "appliance/recycle/ByteText.h"

#include <gtest/gtest.h>

#include <string>

namespace orva {
namespace {

TEST(ByteTextTest, QuotesPlainNamesPlainly) {
    EXPECT_EQ(QuoteForTerminal("a b.txt"), "'a b.txt'");
    EXPECT_EQ(QuoteForTerminal("Gr\xC3\xBC\xC3\x9F"
                               "e"),
              "'Gr\xC3\xBC\xC3\x9F"
              "e'");
    EXPECT_EQ(QuoteForTerminal(""), "''");
}

TEST(ByteTextTest, EscapesWhatWouldDisturbATerminal) {
    EXPECT_EQ(QuoteForTerminal("it's"), "$'it\\'s'");
    EXPECT_EQ(QuoteForTerminal("a\\b"), "$'a\\\\b'");
    EXPECT_EQ(QuoteForTerminal("a\nb\x1b[2J"), "$'a\\x0ab\\x1b[2J'");
    EXPECT_EQ(QuoteForTerminal("\x7f"), "$'\\x7f'");
    EXPECT_EQ(QuoteForTerminal("\xC2\x9b"
                               "2J"),
              "$'\\xc2\\x9b2J'");
    EXPECT_EQ(QuoteForTerminal("a\xE2\x80\xAEgpj.exe"), "$'a\\xe2\\x80\\xaegpj.exe'");
    EXPECT_EQ(QuoteForTerminal("\xff\xfe"), "$'\\xff\\xfe'");
}

TEST(ByteTextTest, TellsUtf8FromOtherBytes) {
    EXPECT_TRUE(IsUtf8(""));
    EXPECT_TRUE(IsUtf8("a\xC3\xA4\xE2\x82\xAC\xF0\x9F\x98\x80"));
    for (const char* bytes : {"\x80", "\xC3", "\xC0\x80", "\xE0\x80\x80", "\xED\xA0\x80",
                              "\xF4\x90\x80\x80", "\xF8\x88\x80\x80\x80", "a\xFF"}) {
        EXPECT_FALSE(IsUtf8(bytes));
    }
}

TEST(ByteTextTest, WritesJsonStrings) {
    EXPECT_EQ(QuoteForJson("a\"b\\c\n\xC3\xA4"), "\"a\\\"b\\\\c\\u000a\xC3\xA4\"");
    EXPECT_EQ(QuoteForJson("a\xFF"), "\"a\xEF\xBF\xBD\"");
}

TEST(ByteTextTest, WritesBase64) {
    EXPECT_EQ(Base64(""), "");
    EXPECT_EQ(Base64("f"), "Zg==");
    EXPECT_EQ(Base64("fo"), "Zm8=");
    EXPECT_EQ(Base64("foo"), "Zm9v");
    EXPECT_EQ(Base64("\xff\xfe\xfd\xfc"), "//79/A==");
}

TEST(ByteTextTest, QuotesWhereItIsNeeded) {
    EXPECT_EQ(QuoteIfNeeded("photo"), "photo");
    EXPECT_EQ(QuoteIfNeeded("a b"), "'a b'");
    EXPECT_EQ(QuoteIfNeeded("a:b"), "'a:b'");
    EXPECT_EQ(QuoteIfNeeded(""), "''");
    EXPECT_EQ(QuoteIfNeeded("a\n"), "$'a\\x0a'");
}

TEST(ByteTextTest, WritesSizesForPeople) {
    EXPECT_EQ(HumanBytes(0), "0 bytes");
    EXPECT_EQ(HumanBytes(1), "1 byte");
    EXPECT_EQ(HumanBytes(1023), "1023 bytes");
    EXPECT_EQ(HumanBytes(1536), "1.5 KB");
    EXPECT_EQ(HumanBytes(~0ULL), "16.0 EB");
}

}  // namespace
}  // namespace orva
