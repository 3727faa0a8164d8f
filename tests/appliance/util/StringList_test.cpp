#include <gtest/gtest.h>

#include <climits>
#include <memory>
#include <string>

#include "platform/qlibc.h"
#include "tests/appliance/util/Memory.h"

namespace {

struct ListDeleter {
    void operator()(QLIBC_SZLIST* list) const { QLIBCSzListFree(list); }
};
using ListPtr = std::unique_ptr<QLIBC_SZLIST, ListDeleter>;

TEST(StringListTest, StartsEmpty) {
    const ListPtr list(QLIBCSzListAlloc(100));
    ASSERT_NE(list, nullptr);
    EXPECT_EQ(list->count, 0);
    EXPECT_EQ(QLIBCSzListGet(list.get(), 0), nullptr);
}

TEST(StringListTest, GivesTextsInTheOrderTheyCame) {
    const ListPtr list(QLIBCSzListAlloc(2));
    EXPECT_EQ(QLIBCSzListPush(list.get(), "photo"), 1);
    EXPECT_EQ(QLIBCSzListPush(list.get(), ""), 2);
    EXPECT_EQ(QLIBCSzListPush(list.get(), "homes"), 3);
    EXPECT_EQ(list->count, 3);
    EXPECT_STREQ(QLIBCSzListGet(list.get(), 0), "photo");
    EXPECT_STREQ(QLIBCSzListGet(list.get(), 1), "");
    EXPECT_STREQ(QLIBCSzListGet(list.get(), 2), "homes");
    EXPECT_EQ(QLIBCSzListGet(list.get(), 3), nullptr);
    EXPECT_EQ(QLIBCSzListGet(list.get(), -1), nullptr);
}

TEST(StringListTest, KeepsTextsInPlaceWhenItGrows) {
    const ListPtr list(QLIBCSzListAlloc(0));
    QLIBCSzListPush(list.get(), "first");
    const char* first = QLIBCSzListGet(list.get(), 0);
    for (int i = 0; i < 10000; ++i) {
        ASSERT_EQ(QLIBCSzListPush(list.get(), std::to_string(i).c_str()), i + 2);
    }
    EXPECT_EQ(QLIBCSzListGet(list.get(), 0), first);
    EXPECT_STREQ(first, "first");
    EXPECT_STREQ(QLIBCSzListGet(list.get(), 10000), "9999");
}

TEST(StringListTest, CopiesTexts) {
    const ListPtr list(QLIBCSzListAlloc(1));
    std::string text = "before";
    QLIBCSzListPush(list.get(), text.c_str());
    text = "after!";
    EXPECT_STREQ(QLIBCSzListGet(list.get(), 0), "before");
}

TEST(StringListTest, TakesAHugeCapacityAsAGuess) {
    const ListPtr list(QLIBCSzListAlloc(INT_MAX));
    ASSERT_NE(list, nullptr);
    EXPECT_EQ(QLIBCSzListPush(list.get(), "text"), 1);
}

TEST(StringListTest, RefusesBadArguments) {
    const ListPtr list(QLIBCSzListAlloc(1));
    QLIBCErrSetEx(0, "", 0);
    EXPECT_EQ(QLIBCSzListAlloc(-1), nullptr);
    EXPECT_EQ(QLIBCErrGet(), 0x0D00);
    EXPECT_LT(QLIBCSzListPush(nullptr, "text"), 0);
    EXPECT_LT(QLIBCSzListPush(list.get(), nullptr), 0);
    EXPECT_EQ(QLIBCSzListGet(nullptr, 0), nullptr);
    EXPECT_EQ(list->count, 0);
    QLIBCSzListFree(nullptr);
}

TEST(StringListTest, IsNotMadeWhenMemoryIsShort) {
    QLIBC_SZLIST* list = nullptr;
    for (int allowed = 0; allowed < 2; ++allowed) {
        QLIBCErrSetEx(0, "", 0);
        {
            const ShortMemory shortMemory(allowed);
            list = QLIBCSzListAlloc(10);
        }
        EXPECT_EQ(list, nullptr);
        EXPECT_EQ(QLIBCErrGet(), 0x0200);
    }
}

TEST(StringListTest, KeepsWhatItHasWhenMemoryIsShort) {
    const ListPtr list(QLIBCSzListAlloc(1));
    QLIBCSzListPush(list.get(), "kept");
    int results[2] = {};
    for (int allowed = 0; allowed < 2; ++allowed) {
        const ShortMemory shortMemory(allowed);
        results[allowed] = QLIBCSzListPush(list.get(), "lost");
    }
    EXPECT_LT(results[0], 0);
    EXPECT_LT(results[1], 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0200);
    EXPECT_EQ(list->count, 1);
    EXPECT_STREQ(QLIBCSzListGet(list.get(), 0), "kept");
    EXPECT_EQ(QLIBCSzListPush(list.get(), "next"), 2);
}

}  // namespace
