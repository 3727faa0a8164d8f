#include "appliance/tools/ComingStarts.h"

#include <gtest/gtest.h>

#include <string>

#include "tests/appliance/store/StoreTest.h"

namespace {

using orva::ComingStartsRequest;

class ComingStartsTest : public StoreTest {
  protected:
    struct Shown {
        int status;
        std::string out;
        std::string err;
    };

    static Shown Show(const ComingStartsRequest& request) {
        testing::internal::CaptureStdout();
        testing::internal::CaptureStderr();
        const int status = orva::ShowComingStarts(request);
        const std::string out = testing::internal::GetCapturedStdout();
        return {status, out, testing::internal::GetCapturedStderr()};
    }

    // Task 1 starts daily at 02:30.
    static ComingStartsRequest Stored(int count) {
        orva::TaskData task = SampleTask("a");
        task.schedule.firstMinute = 150;
        orva::TaskStore::Current()->Save(task);
        ComingStartsRequest request;
        request.count = count;
        request.task = 1;
        return request;
    }
};

TEST_F(ComingStartsTest, ShowsTheStartsAfterNowInTheMachinesZone) {
    const Shown shown = Show(Stored(2));
    EXPECT_EQ(shown.status, 0);
    EXPECT_EQ(shown.out,
              "2026-05-02 02:30 +00:00  2026-05-02T02:30:00Z\n"
              "2026-05-03 02:30 +00:00  2026-05-03T02:30:00Z\n");
    EXPECT_EQ(shown.err, "");
}

TEST_F(ComingStartsTest, JsonHasANoteWhereAClockChangeMatters) {
    ComingStartsRequest request = Stored(3);
    request.from = "2026-03-28T00:00:00Z";
    request.zone = "Europe/Berlin";
    request.json = true;
    EXPECT_EQ(Show(request).out,
              R"([
 {"local":"2026-03-28T02:30:00+01:00","utc":"2026-03-28T01:30:00Z"},
 {"local":"2026-03-29T03:00:00+02:00","note":"moved: the clock skips this time","utc":"2026-03-29T01:00:00Z"},
 {"local":"2026-03-30T02:30:00+02:00","utc":"2026-03-30T00:30:00Z"}
]
)");
    request.json = false;
    request.count = 1;
    request.from = "2026-10-24T12:00:00Z";
    EXPECT_EQ(Show(request).out,
              "2026-10-25 02:30 +02:00  2026-10-25T00:30:00Z  "
              "the clock shows this time twice: the first of them\n");
}

TEST_F(ComingStartsTest, AStartAtTheGivenInstantIsNotComing) {
    ComingStartsRequest request = Stored(1);
    request.from = "2026-05-02T02:30:00Z";
    EXPECT_EQ(Show(request).out, "2026-05-03 02:30 +00:00  2026-05-03T02:30:00Z\n");
    request.from = "2026-05-02T02:29:59.999Z";
    EXPECT_EQ(Show(request).out, "2026-05-02 02:30 +00:00  2026-05-02T02:30:00Z\n");
}

TEST_F(ComingStartsTest, ATaskThatWillNotStartHasNoStarts) {
    ComingStartsRequest request = Stored(5);
    orva::TaskData over = SampleTask("over");
    over.schedule.mode = orva::Schedule::Mode::kDate;
    over.schedule.date = absl::CivilDay(2020, 1, 1);
    orva::TaskStore::Current()->Save(over);
    orva::TaskData disabled = SampleTask("off");
    disabled.Set(orva::kEnabled, false);
    orva::TaskStore::Current()->Save(disabled);
    request.json = true;
    request.task = 2;
    EXPECT_EQ(Show(request).out, "[]\n");
    EXPECT_EQ(Show(request).err, "");
    request.task = 3;
    EXPECT_EQ(Show(request).out, "[]\n");
    EXPECT_EQ(Show(request).err, "orvaschedtool: task 3 is disabled\n");
    EXPECT_EQ(Show(request).status, 0);
}

TEST_F(ComingStartsTest, WhatCannotBeAnsweredIsNamed) {
    ComingStartsRequest request = Stored(10'001);
    EXPECT_EQ(Show(request).status, 2);
    EXPECT_EQ(Show(request).err,
              "orvaschedtool: --next shows 1 to 10000 starts (see orvaschedtool --help)\n");
    request.count = 1;
    request.from = "tomorrow";
    EXPECT_EQ(Show(request).status, 2);
    EXPECT_EQ(Show(request).err,
              "orvaschedtool: --from needs a UTC instant such as 2027-01-31T12:00:00Z "
              "(see orvaschedtool --help)\n");
    request.from.clear();
    request.zone = "Europe/Atlantis";
    EXPECT_EQ(Show(request).status, 2);
    EXPECT_EQ(
        Show(request).err,
        "orvaschedtool: --zone: no time zone \"Europe/Atlantis\" (see orvaschedtool --help)\n");
    request.zone.clear();
    request.task = 2;
    EXPECT_EQ(Show(request).status, 1);
    EXPECT_EQ(Show(request).err, "orvaschedtool: there is no task 2\n");
    EXPECT_EQ(Show(request).out, "");
}

}  // namespace
