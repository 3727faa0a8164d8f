#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "platform/qlibc.h"

namespace {

struct Replaced {
    int result;
    std::string text;
};

Replaced Replace(const std::string& text, const char* from, const char* to, int size,
                 int flags = 0) {
    std::string buffer(4096, '\x7F');
    std::memcpy(buffer.data(), text.c_str(), text.size() + 1);
    const int result = QLIBCStrReplace(buffer.data(), from, to, flags, size);
    EXPECT_EQ(buffer[static_cast<std::size_t>(size > 0 ? size : 4095)], '\x7F')
        << "written beyond the buffer";
    return {result, buffer.c_str()};
}

TEST(StringReplaceTest, ReplacesEveryOccurrence) {
    const Replaced replaced = Replace("FTP, FTP and FTP", "FTP", "#tree:leaf_ftp#", 100);
    EXPECT_EQ(replaced.result, 3);
    EXPECT_EQ(replaced.text, "#tree:leaf_ftp#, #tree:leaf_ftp# and #tree:leaf_ftp#");
}

TEST(StringReplaceTest, LeavesATextWithoutAnOccurrence) {
    const Replaced replaced = Replace("Samba", "FTP", "x", 100);
    EXPECT_EQ(replaced.result, 0);
    EXPECT_EQ(replaced.text, "Samba");
}

TEST(StringReplaceTest, RemovesWithAnEmptyReplacement) {
    EXPECT_EQ(Replace("a-b-c", "-", "", 6).text, "abc");
}

TEST(StringReplaceTest, DoesNotSearchWhatItPutIn) {
    const Replaced replaced = Replace("aa", "a", "aa", 100);
    EXPECT_EQ(replaced.result, 2);
    EXPECT_EQ(replaced.text, "aaaa");
}

TEST(StringReplaceTest, TakesOverlappingOccurrencesFromTheLeft) {
    const Replaced replaced = Replace("aaa", "aa", "b", 100);
    EXPECT_EQ(replaced.result, 1);
    EXPECT_EQ(replaced.text, "ba");
}

TEST(StringReplaceTest, FillsTheBufferToItsLastByte) {
    const Replaced replaced = Replace("xy", "x", "1234", 6);
    EXPECT_EQ(replaced.result, 1);
    EXPECT_EQ(replaced.text, "1234y");
}

TEST(StringReplaceTest, LeavesTheBufferWhenTheResultDoesNotFit) {
    const Replaced replaced = Replace("xy", "x", "12345", 6);
    EXPECT_LT(replaced.result, 0);
    EXPECT_EQ(replaced.text, "xy");
    EXPECT_EQ(QLIBCErrGet(), 0x0E00);
    EXPECT_STREQ(QLIBCErrorGetFile(), "StringReplace.cpp");
}

TEST(StringReplaceTest, LeavesTheBufferWhenOnlyTheRestDoesNotFit) {
    const Replaced replaced = Replace("xyyyy", "x", "12", 6);
    EXPECT_LT(replaced.result, 0);
    EXPECT_EQ(replaced.text, "xyyyy");
}

TEST(StringReplaceTest, RefusesBadArguments) {
    char text[8] = "a";
    EXPECT_LT(QLIBCStrReplace(nullptr, "a", "b", 0, 8), 0);
    EXPECT_LT(QLIBCStrReplace(text, nullptr, "b", 0, 8), 0);
    EXPECT_LT(QLIBCStrReplace(text, "a", nullptr, 0, 8), 0);
    EXPECT_LT(QLIBCStrReplace(text, "", "b", 0, 8), 0);
    EXPECT_LT(QLIBCStrReplace(text, "a", "b", 1, 8), 0);
    EXPECT_LT(QLIBCStrReplace(text, "a", "b", 0, 0), 0);
    EXPECT_LT(QLIBCStrReplace(text, "a", "b", 0, -1), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0D00);
    EXPECT_STREQ(text, "a");
}

TEST(StringReplaceTest, RefusesATextThatHasNoEndInTheBuffer) {
    char text[3] = {'a', 'b', 'c'};
    EXPECT_LT(QLIBCStrReplace(text, "a", "b", 0, 3), 0);
    EXPECT_EQ(text[0], 'a');
}

}  // namespace
