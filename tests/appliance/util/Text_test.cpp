#include "appliance/util/Text.h"

#include <gtest/gtest.h>

#include <cerrno>

namespace {

TEST(TextTest, KnowsTheTenDigits) {
    for (int byte = 0; byte < 256; ++byte) {
        EXPECT_EQ(orva::IsDigit(static_cast<char>(byte)), byte >= 0x30 && byte <= 0x39) << byte;
    }
}

TEST(TextTest, TrimsSpacesAndTabsAtTheEndsOnly) {
    EXPECT_EQ(orva::TrimBlanks(" \ta b\t "), "a b");
    EXPECT_EQ(orva::TrimBlanks("a"), "a");
    EXPECT_EQ(orva::TrimBlanks("\n a\r"), "\n a\r");
    EXPECT_EQ(orva::TrimBlanks(" \t"), "");
    EXPECT_EQ(orva::TrimBlanks(""), "");
}

TEST(TextTest, NamesTheLastErrorOfTheSystem) {
    errno = ENOENT;
    EXPECT_EQ(orva::ErrnoText(), "No such file or directory");
}

}  // namespace
