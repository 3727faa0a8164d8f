#include "appliance/scheduler/WaitingRuns.h"

#include <gtest/gtest.h>

#include "tests/appliance/scheduler/Instants.h"

namespace {

using orva::QueuedRun;
using orva::WaitingRuns;

QueuedRun Queued(std::int64_t id, int task, const std::string& due, const std::string& since) {
    return {id, task, Utc("2026-05-01 " + due), Utc("2026-05-01 " + since)};
}

TEST(WaitingRunsTest, WhoIsDueFirstComesFirstThenWhoWasRecordedFirst) {
    WaitingRuns waiting;
    waiting.Add(Queued(1, 11, "12:05:00", "12:05:00"));
    waiting.Add(Queued(3, 13, "12:00:00", "12:05:01"));
    waiting.Add(Queued(2, 12, "12:05:00", "12:05:00"));
    EXPECT_EQ(waiting.LastAdded(), 3);
    EXPECT_EQ(waiting.TakeFirst(), 3);
    EXPECT_EQ(waiting.TakeFirst(), 1);
    EXPECT_EQ(waiting.TakeFirst(), 2);
    EXPECT_TRUE(waiting.Empty());
    EXPECT_EQ(waiting.LastAdded(), 3);
}

TEST(WaitingRunsTest, WhoWasRecordedFirstHasWaitedLongest) {
    WaitingRuns waiting;
    EXPECT_EQ(waiting.OldestSince(), absl::InfiniteFuture());
    // Made up for, hours after its time.
    waiting.Add(Queued(1, 11, "06:00:00", "12:01:00"));
    waiting.Add(Queued(2, 12, "12:00:00", "12:00:00"));
    EXPECT_EQ(waiting.OldestSince(), Utc("2026-05-01 12:00:00"));
    EXPECT_EQ(waiting.TakeOldest(), 2);
    EXPECT_EQ(waiting.OldestSince(), Utc("2026-05-01 12:01:00"));
    EXPECT_EQ(waiting.TakeFirst(), 1);
    EXPECT_EQ(waiting.OldestSince(), absl::InfiniteFuture());
}

TEST(WaitingRunsTest, ATaskWaitsAsLongAsOneOfItsRunsDoes) {
    WaitingRuns waiting;
    waiting.Add(Queued(1, 11, "12:00:00", "12:00:00"));
    waiting.Add(Queued(2, 11, "12:01:00", "12:01:00"));
    waiting.Add(Queued(2, 11, "12:01:00", "12:01:00"));
    EXPECT_TRUE(waiting.HasOf(11));
    EXPECT_FALSE(waiting.HasOf(1));
    waiting.TakeFirst();
    EXPECT_TRUE(waiting.HasOf(11));
    waiting.TakeFirst();
    EXPECT_FALSE(waiting.HasOf(11));
}

}  // namespace
