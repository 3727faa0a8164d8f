#include "appliance/recycle/CleanRules.h"

#include <gtest/gtest.h>

#include <limits>

namespace orva {
namespace {

constexpr FileTime kDay = 86'400'000'000'000;
constexpr FileTime kNow = 20'000 * kDay + 12'345;

KeepReason KeepForAge(std::uint64_t days, FileTime age, FileTime now = kNow) {
    CleanRules rules;
    rules.days = days;
    return CleanJudge(rules, now).Keep("x", 1, now - age);
}

TEST(CleanRulesTest, RemovesEverythingWithoutRules) {
    EXPECT_EQ(CleanJudge({}, kNow).Keep("x", 0, kNow + kDay), KeepReason::kNone);
}

TEST(CleanRulesTest, RemovesWhatIsInTheBinForMoreThanTheDays) {
    EXPECT_EQ(KeepForAge(30, 30 * kDay + 1), KeepReason::kNone);
    EXPECT_EQ(KeepForAge(30, 30 * kDay), KeepReason::kAge);
    EXPECT_EQ(KeepForAge(30, 29 * kDay), KeepReason::kAge);
    EXPECT_EQ(KeepForAge(0, 1), KeepReason::kNone);
    EXPECT_EQ(KeepForAge(0, 0), KeepReason::kAge);
    EXPECT_EQ(KeepForAge(0, -kDay), KeepReason::kAge);
}

TEST(CleanRulesTest, KeepsEverythingForMoreDaysThanTimeHas) {
    for (const std::uint64_t days : {std::uint64_t{127'000}, std::uint64_t{213'504},
                                     std::uint64_t{1} << 63, ~std::uint64_t{0}}) {
        EXPECT_EQ(KeepForAge(days, 20'000 * kDay), KeepReason::kAge) << days;
    }
}

TEST(CleanRulesTest, KeepsByExtensionInAnyCase) {
    CleanRules rules;
    rules.keepExtensions = {"doc", "gz"};
    const CleanJudge judge(rules, kNow);
    for (const char* name : {"a.doc", "a.DOC", "a.tar.Gz", ".doc", "a b.dOc"}) {
        EXPECT_EQ(judge.Keep(name, 1, 0), KeepReason::kExtension) << name;
    }
    for (const char* name : {"doc", "a.docx", "a.doc.pdf", "a.", "a.doc ", "gz", "a.xdoc"}) {
        EXPECT_EQ(judge.Keep(name, 1, 0), KeepReason::kNone) << name;
    }
}

TEST(CleanRulesTest, KeepsLargerAndSmallerThanTheSizes) {
    CleanRules rules;
    rules.keepLarger = 100;
    rules.keepSmaller = 10;
    const CleanJudge judge(rules, kNow);
    EXPECT_EQ(judge.Keep("x", 101, 0), KeepReason::kLarger);
    EXPECT_EQ(judge.Keep("x", 100, 0), KeepReason::kNone);
    EXPECT_EQ(judge.Keep("x", 10, 0), KeepReason::kNone);
    EXPECT_EQ(judge.Keep("x", 9, 0), KeepReason::kSmaller);
}

TEST(CleanRulesTest, KeepsNothingForBeingSmallerThanNothing) {
    CleanRules rules;
    rules.keepSmaller = 0;
    EXPECT_EQ(CleanJudge(rules, kNow).Keep("x", 0, 0), KeepReason::kNone);
}

TEST(CleanRulesTest, KeepsTimesThatCannotBeNamedAtTheNearest) {
    EXPECT_EQ(ToFileTime(17'000'000'000, 5), std::numeric_limits<FileTime>::max());
    EXPECT_EQ(ToFileTime(-17'000'000'000, 5), std::numeric_limits<FileTime>::min());
    EXPECT_EQ(ToFileTime(-1, 999'999'999), -1);
}

}  // namespace
}  // namespace orva
