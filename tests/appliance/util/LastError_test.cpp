#include <gtest/gtest.h>

#include <string>
#include <thread>

#include "appliance/util/Error.h"
#include "platform/qlibc.h"

namespace {

TEST(LastErrorTest, IsZeroAndEmptyOnAThreadWhereNothingFailed) {
    std::thread([] {
        EXPECT_EQ(QLIBCErrGet(), 0);
        EXPECT_STREQ(QLIBCErrorGetFile(), "");
        EXPECT_EQ(QLIBCErrorGetLine(), 0);
    }).join();
}

TEST(LastErrorTest, KeepsCodeFileAndLineOfTheLastFailure) {
    QLIBCErrSetEx(0x0300, "First.cpp", 11);
    QLIBCErrSetEx(0x0D00, "Second.cpp", 22);
    EXPECT_EQ(QLIBCErrGet(), 0x0D00);
    EXPECT_STREQ(QLIBCErrorGetFile(), "Second.cpp");
    EXPECT_EQ(QLIBCErrorGetLine(), 22);
    EXPECT_STREQ(QLIBCErrorGetFile(0x0D00), "Second.cpp");
    EXPECT_EQ(QLIBCErrorGetLine(0x0D00), 22);
}

TEST(LastErrorTest, CopiesTheFileName) {
    std::string file = "Gone.cpp";
    QLIBCErrSetEx(1, file.c_str(), 1);
    file = "xxxxxxxx";
    EXPECT_STREQ(QLIBCErrorGetFile(), "Gone.cpp");
}

TEST(LastErrorTest, CutsTheFileNameTo255Bytes) {
    QLIBCErrSetEx(1, std::string(300, 'f').c_str(), 1);
    EXPECT_EQ(std::string(QLIBCErrorGetFile()), std::string(255, 'f'));
}

TEST(LastErrorTest, TakesNoFileAsAnEmptyName) {
    QLIBCErrSetEx(1, "Before.cpp", 1);
    QLIBCErrSetEx(7, nullptr, 9);
    EXPECT_EQ(QLIBCErrGet(), 7);
    EXPECT_STREQ(QLIBCErrorGetFile(), "");
    EXPECT_EQ(QLIBCErrorGetLine(), 9);
}

TEST(LastErrorTest, TakesBackTheNameItGaveOut) {
    QLIBCErrSetEx(1, "Same.cpp", 1);
    QLIBCErrSetEx(2, QLIBCErrorGetFile(), 2);
    EXPECT_STREQ(QLIBCErrorGetFile(), "Same.cpp");
}

TEST(LastErrorTest, BelongsToItsThread) {
    QLIBCErrSetEx(5, "Mine.cpp", 50);
    std::thread([] { QLIBCErrSetEx(6, "Other.cpp", 60); }).join();
    EXPECT_EQ(QLIBCErrGet(), 5);
    EXPECT_STREQ(QLIBCErrorGetFile(), "Mine.cpp");
    EXPECT_EQ(QLIBCErrorGetLine(), 50);
}

TEST(LastErrorTest, IsSetByFailWithTheCallersFileWithoutDirectories) {
    EXPECT_EQ(orva::Fail(orva::kErrTooLong, "/a/b/Caller.cpp", 77), -1);
    EXPECT_EQ(QLIBCErrGet(), 0x0E00);
    EXPECT_STREQ(QLIBCErrorGetFile(), "Caller.cpp");
    EXPECT_EQ(QLIBCErrorGetLine(), 77);
}

}  // namespace
