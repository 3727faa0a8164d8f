#include "appliance/recycle/CleanReport.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <string>

#include "appliance/util/StrictJson.h"

namespace orva {
namespace {

constexpr FileTime kDay = 86'400'000'000'000;
constexpr FileTime kNow = 20'000 * kDay;

// What a report writes to one stream.
class Output {
  public:
    Output() : stream(::open_memstream(&data, &size)) {}
    ~Output() {
        std::fclose(stream);
        std::free(data);
    }
    Output(const Output&) = delete;
    Output& operator=(const Output&) = delete;

    std::FILE* Stream() const { return stream; }
    std::string Text() const {
        std::fflush(stream);
        return {data, size};
    }

  private:
    char* data = nullptr;
    std::size_t size = 0;
    std::FILE* stream;
};

CleanTotals SomeTotals() {
    CleanTotals totals;
    totals.AddRemoved(5);
    totals.removedDirectories = 2;
    totals.AddKept(10);
    totals.AddKept(20);
    return totals;
}

TEST(CleanReportTest, ListsAPreviewLineByLine) {
    Output out;
    Output err;
    const auto report = MakeTextReport(out.Stream(), err.Stream(), true, kNow);
    report->BeginBin("my photos");
    report->Goes({"a\nb", FileKind::kFile, 5, kNow - kDay * 5 / 4});
    report->Goes({"c/", FileKind::kDirectory, 0, 0});
    report->Stays({"d.doc", FileKind::kFile, 1, kNow}, KeepReason::kExtension);
    report->EndBin(SomeTotals());
    EXPECT_TRUE(report->Finish());
    EXPECT_EQ(out.Text(), R"('my photos': remove $'a\x0ab' (5 bytes, 1.25 days)
'my photos': remove 'c/'
'my photos': keep   'd.doc' (1 byte, 0.00 days): extension to keep
'my photos': would remove 1 file (5 bytes) and 2 folders, kept 2 files (30 bytes)
)");
    EXPECT_EQ(err.Text(), "");
}

TEST(CleanReportTest, NamesWhatFailed) {
    Output out;
    Output err;
    const auto report = MakeTextReport(out.Stream(), err.Stream(), false, kNow);
    report->Problem("nope", "there is no such share");
    report->BeginBin("photo");
    report->Failed("a/b", "remove", EROFS);
    CleanTotals totals = SomeTotals();
    totals.failures = 1;
    totals.overLimit = 7;
    report->EndBin(totals);
    EXPECT_EQ(err.Text(),
              "orvarecycle: nope: there is no such share\n"
              "orvarecycle: photo: cannot remove 'a/b': Read-only file system\n");
    EXPECT_EQ(out.Text(),
              "photo: removed 1 file (5 bytes) and 2 folders, kept 2 files (30 bytes), failed 1; "
              "still 7 bytes over the limit\n");
}

TEST(CleanReportTest, WritesOneDocument) {
    Output out;
    Output err;
    const auto report = MakeJsonReport(out.Stream(), err.Stream(), true, kNow);
    report->Note("music", "there is no recycle bin");
    report->BeginBin("photo");
    report->Goes({"a", FileKind::kFile, 5, kNow - kDay / 2});
    report->Stays({"b\xff", FileKind::kLink, 3, kNow}, KeepReason::kAge);
    report->Goes({"c/", FileKind::kDirectory, 0, 0});
    report->Failed("d", "read", EACCES);
    report->EndBin(SomeTotals());
    report->BeginBin("empty");
    report->EndBin({});
    report->Problem("nope", "there is no such share");
    EXPECT_TRUE(report->Finish());
    EXPECT_EQ(err.Text(), "");

    std::string error;
    const auto document = ParseStrictJson(out.Text(), error);
    ASSERT_TRUE(document.has_value()) << error;
    const auto expected = ParseStrictJson(R"({"dry_run": true, "at": "2024-10-04T00:00:00Z",
        "bins": [
            {"share": "photo",
             "remove": [{"path": "a", "kind": "file", "bytes": 5,
                         "since": "2024-10-03T12:00:00Z", "age_days": 0.5},
                        {"path": "c/", "kind": "folder", "bytes": 0}],
             "keep": [{"path": "b)"
                                          "\xEF\xBF\xBD"
                                          R"(", "path_base64": "Yv8=", "kind": "link", "bytes": 3,
                       "since": "2024-10-04T00:00:00Z", "age_days": 0.0, "reason": "age"}],
             "failures": [{"path": "d", "action": "read", "message": "Permission denied"}],
             "totals": {"removed_files": 1, "removed_bytes": 5, "removed_folders": 2,
                        "kept_files": 2, "kept_bytes": 30, "failures": 0, "over_limit_bytes": 0}},
            {"share": "empty", "remove": [], "keep": [], "failures": [],
             "totals": {"removed_files": 0, "removed_bytes": 0, "removed_folders": 0,
                        "kept_files": 0, "kept_bytes": 0, "failures": 0, "over_limit_bytes": 0}}],
        "notes": [{"share": "music", "message": "there is no recycle bin"}],
        "problems": [{"share": "nope", "message": "there is no such share"}]})",
                                          error);
    ASSERT_TRUE(expected.has_value()) << error;
    EXPECT_EQ(*document, *expected);
}

TEST(CleanReportTest, KeepsADocumentWholeThatIsLargerThanItsMemory) {
    Output out;
    Output err;
    const auto report = MakeJsonReport(out.Stream(), err.Stream(), true, kNow);
    report->BeginBin("photo");
    constexpr int kEntries = 30'000;
    for (int at = 0; at < kEntries; ++at) {
        report->Stays({"some/folder/name" + std::to_string(at), FileKind::kFile, 1, kNow},
                      KeepReason::kLarger);
    }
    report->EndBin({});
    EXPECT_TRUE(report->Finish());
    std::string error;
    const auto document = ParseStrictJson(out.Text(), error);
    ASSERT_TRUE(document.has_value()) << error;
    const Json::Value& kept = (*document)["bins"][0]["keep"];
    ASSERT_EQ(kept.size(), 30'000U);
    EXPECT_EQ(kept[29'999]["path"], "some/folder/name29999");
}

TEST(CleanReportTest, SaysWhenItCannotBeWritten) {
    std::FILE* full = std::fopen("/dev/full", "w");
    ASSERT_NE(full, nullptr);
    const auto report = MakeJsonReport(full, stderr, true, kNow);
    EXPECT_FALSE(report->Finish());
    std::fclose(full);
}

TEST(CleanReportTest, CutsDaysAfterTwoDecimals) {
    EXPECT_EQ(DaysBetween(0, kDay * 30 + kDay / 100 - 1), "30.00");
    EXPECT_EQ(DaysBetween(0, kDay * 30 + kDay / 100), "30.01");
    EXPECT_EQ(DaysBetween(kDay, 0), "-1.00");
    EXPECT_EQ(DaysBetween(1, 0), "0.00");
}

TEST(CleanReportTest, StopsCountingBytesAtTheLargestCount) {
    CleanTotals totals;
    totals.AddRemoved(~std::uint64_t{0});
    totals.AddRemoved(2);
    EXPECT_EQ(totals.removedBytes, ~std::uint64_t{0});
    EXPECT_EQ(totals.removedFiles, 2U);
}

}  // namespace
}  // namespace orva
