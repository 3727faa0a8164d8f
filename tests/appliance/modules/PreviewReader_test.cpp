#include "appliance/modules/PreviewReader.h"

#include <gtest/gtest.h>

#include <string>
#include <string_view>

#include "appliance/webapi/JsonWriter.h"

namespace orva {
namespace {

std::string Answer(const PreviewReader& reader) { return WriteJson(reader.Answer()); }

void Take(PreviewReader& reader, std::string_view text) {
    while (!text.empty()) {
        const std::size_t end = text.find('\n');
        reader.TakeLine(text.substr(0, end));
        text.remove_prefix(end == std::string_view::npos ? text.size() : end + 1);
    }
}

TEST(PreviewReader, AWholeDocumentIsComplete) {
    PreviewReader reader;
    Take(reader, R"({"dry_run":true,"at":"2027-01-31T12:00:00Z","bins":[
{"share":"photo","remove":[
{"path":"holiday/beach.jpg","kind":"file","bytes":6,"since":"2026-11-21T10:01:48Z","age_days":71.08},
{"path":"holiday/","kind":"folder","bytes":0}],
"keep":[
{"path":"contract.PDF","kind":"file","bytes":5,"since":"2026-11-21T10:01:49Z","age_days":71.08,"reason":"extension"}],
"failures":[],
"totals":{"removed_files":1,"removed_bytes":6,"removed_folders":1,"kept_files":1,"kept_bytes":5,"failures":0,"over_limit_bytes":0}},
{"share":"me\"dia","remove":[],
"keep":[],
"failures":[],
"totals":{"removed_files":0,"removed_bytes":0,"removed_folders":0,"kept_files":0,"kept_bytes":0,"failures":0,"over_limit_bytes":0}}],
"notes":[{"share":"music","message":"there is no recycle bin"}],
"problems":[]}
)");
    EXPECT_EQ(Answer(reader),
              R"({"complete":true,"keep":{"bytes":5,"count":1},"kept":[)"
              R"({"bytes":5,"path":"contract.PDF","rule":"extension","share":"photo",)"
              R"("since":"2026-11-21T10:01:49Z"}],"problems":[],"remove":{"bytes":6,"count":1},)"
              R"("removed":[{"bytes":6,"path":"holiday/beach.jpg","share":"photo",)"
              R"("since":"2026-11-21T10:01:48Z"}]})");
}

TEST(PreviewReader, ADocumentThatWasCutShortIsIncompleteButCounts) {
    PreviewReader reader;
    EXPECT_EQ(Answer(reader),
              R"({"complete":false,"keep":{"bytes":0,"count":0},"kept":[],"problems":[],)"
              R"("remove":{"bytes":0,"count":0},"removed":[]})");
    Take(reader,
         "{\"share\":\"photo\",\"remove\":[\n"
         "{\"path\":\"a\",\"kind\":\"file\",\"bytes\":6,\"since\":\"x\"},\n"
         "{\"path\":\"cut");
    EXPECT_EQ(Answer(reader),
              R"({"complete":false,"keep":{"bytes":0,"count":0},"kept":[],)"
              R"("problems":["the preview could not be read"],"remove":{"bytes":6,"count":1},)"
              R"("removed":[{"bytes":6,"path":"a","share":"photo","since":"x"}]})");
}

TEST(PreviewReader, OnlyTheFirstThousandAreListedAndAllAreCounted) {
    PreviewReader reader;
    Take(reader, "{\"share\":\"photo\",\"remove\":[\n");
    for (int file = 0; file < 1500; ++file) {
        reader.TakeLine(
            R"({"path":"a","kind":"file","bytes":3000000000,"since":"x","age_days":0.00},)");
    }
    EXPECT_EQ(reader.Answer()["removed"].size(), 1000U);
    EXPECT_EQ(WriteJson(reader.Answer()["remove"]), R"({"bytes":4500000000000,"count":1500})");
}

TEST(PreviewReader, APathThatLooksLikeTheDocumentIsAPath) {
    PreviewReader reader;
    Take(reader,
         "{\"share\":\"photo\",\"remove\":[\n"
         R"({"path":"\",\"bytes\":9,\"kind\":\"folder\"}],","kind":"file","bytes":1,"since":"x"}],)"
         "\n");
    EXPECT_EQ(WriteJson(reader.Answer()["removed"]),
              R"([{"bytes":1,"path":"\",\"bytes\":9,\"kind\":\"folder\"}],","share":"photo",)"
              R"("since":"x"}])");
}

TEST(PreviewReader, WhatCouldNotBeReadIsAProblem) {
    PreviewReader reader;
    Take(reader, R"({"share":"photo","remove":[],
"keep":[],
"failures":[
{"path":"secret","action":"open","message":"Permission denied"}],
"totals":{"removed_files":0,"removed_bytes":0,"removed_folders":0,"kept_files":0,"kept_bytes":0,"failures":1,"over_limit_bytes":0}}],
"notes":[],
"problems":[{"share":"nope","message":"there is no such share"}]}
)");
    EXPECT_EQ(Answer(reader),
              R"({"complete":false,"keep":{"bytes":0,"count":0},"kept":[],"problems":[)"
              R"("photo: cannot open secret: Permission denied","nope: there is no such share"],)"
              R"("remove":{"bytes":0,"count":0},"removed":[]})");
}

}  // namespace
}  // namespace orva
