// How much of the history is kept.
#include <gtest/gtest.h>

#include <cstdint>
#include <memory>
#include <string>

#include "appliance/runs/RunStore.h"
#include "appliance/scheduler/Scheduler.h"
#include "tests/appliance/scheduler/SchedulerTest.h"

namespace {

constexpr std::uint16_t kTogether = orva::kCanRunAppSameTime | orva::kCanRunTaskSameTime;

class SchedulerHistoryTest : public SchedulerTest {};

TEST_F(SchedulerHistoryTest, AHundredRunsOfATaskAreKeptAndOfOthersAll) {
    const int busy = AddTask("busy", 12, 30, kTogether);
    const int other = AddTask("other", 18, 0, kTogether);
    std::string rows;
    for (int count = 0; count < 130; ++count) {
        rows +=
            "INSERT INTO run (task, task_name, reason, state, queued_at, asked_program, "
            "asked_account) VALUES (" +
            std::to_string(count == 3 ? other : busy) + ", 'old', 'hand', '" +
            (count == 5 ? "running" : "ended") + "', " + std::to_string(count) + ", '', '');";
    }
    Execute(rows + "INSERT INTO run_output VALUES (1, 'x', '', 0);");
    for (int day = 1; day <= 6; ++day) {
        SetNow("2026-05-0" + std::to_string(day) + " 12:30:00");
        Work();
        End(host.started.back().run);
        Work();
    }
    const std::shared_ptr<orva::RunStore> runs = orva::RunStore::Current();
    // One more: it goes on.
    EXPECT_EQ(runs->List({busy, {}}, 0, 0).total, 101);
    EXPECT_EQ(runs->List({busy, orva::RunState::kRunning}, 0, 0).total, 1);
    EXPECT_TRUE(runs->Find(4));
    EXPECT_FALSE(runs->Find(1));
    EXPECT_FALSE(runs->Output(1));
}

TEST_F(SchedulerHistoryTest, ATaskThatIsAskedForAgainAndAgainKeepsAHundredRuns) {
    const int id = AddTask("a", 12, 30);
    SetNow("2026-05-01 12:30:00");
    Work();
    std::string rows;
    for (int count = 0; count < 150; ++count) {
        rows +=
            "INSERT INTO run (task, task_name, reason, state, queued_at, asked_program, "
            "asked_account) VALUES (" +
            std::to_string(id) + ", 'a', 'hand', 'queued', 1777638600000, 'tester', 'root');";
    }
    Execute(rows);
    Work();
    const std::shared_ptr<orva::RunStore> runs = orva::RunStore::Current();
    EXPECT_EQ(runs->List({id, orva::RunState::kSkipped}, 0, 0).total, 100);
    // The one that goes on comes on top.
    EXPECT_EQ(runs->List({id, {}}, 0, 0).total, 101);
}

TEST_F(SchedulerHistoryTest, RunsOlderThanNinetyDaysAreRemovedAFewAtATime) {
    const int id = AddTask("a", 12, 30);
    // 31 January and 2 February of 2026.
    std::string rows;
    for (int count = 0; count < 50; ++count) {
        rows +=
            "INSERT INTO run (task, task_name, reason, state, queued_at, asked_program, "
            "asked_account) VALUES (" +
            std::to_string(id) + ", 'old', 'hand', '" + (count == 7 ? "running" : "ended") + "', " +
            (count < 45 ? "1769860800000" : "1770033600000") + ", '', '');";
    }
    Execute(rows);
    SetNow("2026-05-02 00:00:00");
    EXPECT_TRUE(scheduler->RemoveOldRuns());
    EXPECT_EQ(orva::RunStore::Current()->List({}, 0, 0).total, 30);
    while (scheduler->RemoveOldRuns()) {
    }
    EXPECT_EQ(orva::RunStore::Current()->List({}, 0, 0).total, 6);
    EXPECT_TRUE(Find(8));
}

}  // namespace
