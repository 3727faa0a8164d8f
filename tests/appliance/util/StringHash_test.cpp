#include <gtest/gtest.h>

#include <climits>
#include <memory>
#include <string>

#include "platform/qlibc.h"
#include "tests/appliance/util/Memory.h"

namespace {

// Frees what the pointer says at the end: the table may have moved.
class Table {
  public:
    explicit Table(int size) : hash(QLIBCSzHashAlloc(size)) {}
    ~Table() { QLIBCSzHashFree(hash); }
    Table(const Table&) = delete;
    Table& operator=(const Table&) = delete;

    QLIBC_SZHASH* hash;
};

TEST(StringHashTest, HoldsNothingAtFirst) {
    const Table table(128);
    ASSERT_NE(table.hash, nullptr);
    EXPECT_EQ(QLIBCSzHashGetValue(table.hash, "key"), nullptr);
}

TEST(StringHashTest, GivesBackTheLastValueOfAKey) {
    Table table(1);
    EXPECT_EQ(QLIBCSzHashSetValue(&table.hash, "mail", "i"), 0);
    EXPECT_EQ(QLIBCSzHashSetValue(&table.hash, "", "empty key"), 0);
    EXPECT_STREQ(QLIBCSzHashGetValue(table.hash, "mail"), "i");
    EXPECT_EQ(QLIBCSzHashSetValue(&table.hash, "mail", "-1"), 0);
    EXPECT_STREQ(QLIBCSzHashGetValue(table.hash, "mail"), "-1");
    EXPECT_STREQ(QLIBCSzHashGetValue(table.hash, ""), "empty key");
    EXPECT_EQ(QLIBCSzHashGetValue(table.hash, "Mail"), nullptr);
}

TEST(StringHashTest, KeepsEveryEntryWhenItGrows) {
    Table table(1);
    for (int i = 0; i < 5000; ++i) {
        const std::string key = "key" + std::to_string(i);
        ASSERT_EQ(QLIBCSzHashSetValue(&table.hash, key.c_str(), std::to_string(i).c_str()), 0);
    }
    for (int i = 0; i < 5000; ++i) {
        const std::string key = "key" + std::to_string(i);
        ASSERT_EQ(std::string(QLIBCSzHashGetValue(table.hash, key.c_str())), std::to_string(i));
    }
}

TEST(StringHashTest, CopiesKeysAndValues) {
    Table table(8);
    std::string key = "key";
    std::string value = "value";
    QLIBCSzHashSetValue(&table.hash, key.c_str(), value.c_str());
    key = "xxx";
    value = "xxxxx";
    EXPECT_STREQ(QLIBCSzHashGetValue(table.hash, "key"), "value");
}

TEST(StringHashTest, TakesAHugeSizeAsAGuess) {
    Table table(INT_MAX);
    ASSERT_NE(table.hash, nullptr);
    EXPECT_EQ(QLIBCSzHashSetValue(&table.hash, "key", "value"), 0);
}

TEST(StringHashTest, RefusesBadArguments) {
    Table table(8);
    QLIBC_SZHASH* none = nullptr;
    EXPECT_EQ(QLIBCSzHashAlloc(0), nullptr);
    EXPECT_EQ(QLIBCSzHashAlloc(-5), nullptr);
    EXPECT_EQ(QLIBCErrGet(), 0x0D00);
    EXPECT_LT(QLIBCSzHashSetValue(nullptr, "k", "v"), 0);
    EXPECT_LT(QLIBCSzHashSetValue(&none, "k", "v"), 0);
    EXPECT_LT(QLIBCSzHashSetValue(&table.hash, nullptr, "v"), 0);
    EXPECT_LT(QLIBCSzHashSetValue(&table.hash, "k", nullptr), 0);
    EXPECT_EQ(QLIBCSzHashGetValue(nullptr, "k"), nullptr);
    EXPECT_EQ(QLIBCSzHashGetValue(table.hash, nullptr), nullptr);
    QLIBCSzHashFree(nullptr);
}

TEST(StringHashTest, IsNotMadeWhenMemoryIsShort) {
    QLIBC_SZHASH* hash = nullptr;
    for (int allowed = 0; allowed < 2; ++allowed) {
        QLIBCErrSetEx(0, "", 0);
        {
            const ShortMemory shortMemory(allowed);
            hash = QLIBCSzHashAlloc(128);
        }
        EXPECT_EQ(hash, nullptr);
        EXPECT_EQ(QLIBCErrGet(), 0x0200);
    }
}

TEST(StringHashTest, KeepsWhatItHasWhenMemoryIsShort) {
    Table table(8);
    QLIBCSzHashSetValue(&table.hash, "kept", "value");
    int result = 0;
    {
        const ShortMemory shortMemory(0);
        result = QLIBCSzHashSetValue(&table.hash, "a key too long to stay inside a small string",
                                     "value");
    }
    EXPECT_LT(result, 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0200);
    EXPECT_STREQ(QLIBCSzHashGetValue(table.hash, "kept"), "value");
}

}  // namespace
