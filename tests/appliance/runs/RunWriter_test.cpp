#include "appliance/runs/RunWriter.h"

#include <gmock/gmock.h>

#include <chrono>
#include <string>

#include "appliance/store/Database.h"
#include "tests/appliance/runs/RunTest.h"

namespace {

using orva::RunReason;
using orva::RunState;
using orva::TaskStore;
using orva::WriteTransaction;
using testing::ElementsAre;
using testing::Field;
using testing::IsEmpty;

constexpr std::int64_t kNoon = 1'777'636'800;  // of 1 May 2026

class RunWriterTest : public RunTest {
  protected:
    // What `write(connection)` yields, in a transaction of its own.
    template <class Write>
    static auto InTransaction(Write write) {
        WriteTransaction transaction(TaskStore::Current()->UsedDatabase());
        auto result = write(*transaction);
        transaction.Commit();
        return result;
    }

    static std::optional<std::int64_t> Insert(const orva::ScheduledRun& run) {
        return InTransaction([&](orva::Connection& connection) {
            return orva::InsertRun(connection, run, absl::FromUnixMillis(kNoon * 1000 + 7));
        });
    }

    // How many starts of the task are known.
    static std::int64_t Known(int task) {
        return InTransaction([task](orva::Connection& connection) {
            orva::Query query =
                connection.Prepare("SELECT count(*) FROM recorded_start WHERE task = ?");
            query->bind(1, task);
            query->executeStep();
            return query->getColumn(0).getInt64();
        });
    }

    static std::vector<orva::QueuedRun> Queued(std::int64_t after, int most) {
        return InTransaction([&](orva::Connection& connection) {
            return orva::ReadQueuedRuns(connection, after, most);
        });
    }
};

TEST_F(RunWriterTest, AStartIsRecordedOnceForItsTaskAndInstant) {
    const std::optional<std::int64_t> first = Insert({1, "a", kNoon, RunReason::kSchedule, ""});
    EXPECT_EQ(Insert({1, "a", kNoon, RunReason::kMissed, ""}), std::nullopt);
    const std::optional<std::int64_t> later =
        Insert({1, "a", kNoon + 60, RunReason::kMissed, "overlap"});
    EXPECT_NE(Insert({2, "b", kNoon, RunReason::kSchedule, ""}), std::nullopt);
    ASSERT_TRUE(first && later);
    const orva::Run run = *Runs()->Find(*first);
    EXPECT_EQ(run.taskName, "a");
    EXPECT_EQ(run.occurrence, absl::FromUnixSeconds(kNoon));
    EXPECT_EQ(run.reason, RunReason::kSchedule);
    EXPECT_EQ(run.state, RunState::kQueued);
    EXPECT_EQ(run.queuedAt, absl::FromUnixMillis(kNoon * 1000 + 7));
    EXPECT_EQ(run.askedProgram, "");
    const orva::Run skipped = *Runs()->Find(*later);
    EXPECT_EQ(skipped.state, RunState::kSkipped);
    EXPECT_EQ(skipped.why, "overlap");
    EXPECT_EQ(skipped.reason, RunReason::kMissed);
}

TEST_F(RunWriterTest, OnlyASkippedStartCanStillBeMade) {
    ASSERT_TRUE(Insert({1, "a", kNoon, RunReason::kSchedule, "missed"}));
    EXPECT_EQ(Insert({1, "a", kNoon, RunReason::kSchedule, "overlap"}), std::nullopt);
    EXPECT_TRUE(Insert({1, "a", kNoon, RunReason::kSchedule, ""}));
    for (const char* state : {"queued", "running", "ended", "lost"}) {
        Execute("UPDATE run SET state = '" + std::string(state) + "'");
        EXPECT_EQ(Insert({1, "a", kNoon, RunReason::kSchedule, ""}), std::nullopt);
    }
    EXPECT_EQ(Runs()->List({}, 0, 0).total, 1);
}

TEST_F(RunWriterTest, AStartThatWasStoppedWhileItWaitedIsNotMadeAfterAll) {
    const std::optional<std::int64_t> run = Insert({1, "a", kNoon, RunReason::kSchedule, ""});
    ASSERT_TRUE(run && Runs()->Cancel(*run));
    EXPECT_EQ(Insert({1, "a", kNoon, RunReason::kSchedule, ""}), std::nullopt);
    ASSERT_TRUE(Runs()->Find(*run));
    EXPECT_EQ(Runs()->Find(*run)->why, "stopped");
}

TEST_F(RunWriterTest, AStartIsKnownWhenItsRunIsGone) {
    ASSERT_TRUE(Insert({1, "a", kNoon, RunReason::kSchedule, ""}));
    Execute("DELETE FROM run");
    EXPECT_EQ(Insert({1, "a", kNoon, RunReason::kSchedule, ""}), std::nullopt);
}

constexpr std::int64_t kDay = 86'400;

TEST_F(RunWriterTest, OfAThousandStartsTheOldestIsForgottenAfterNinetyDays) {
    Execute(
        "WITH RECURSIVE minute(n) AS (SELECT 0 UNION ALL SELECT n + 1 FROM minute WHERE n < 1000) "
        "INSERT INTO recorded_start SELECT 1, 1777636800 + n * 60 FROM minute");
    ASSERT_TRUE(Insert({2, "b", kNoon, RunReason::kSchedule, ""}));
    EXPECT_EQ(Known(1), 1001);
    ASSERT_TRUE(Insert({1, "a", kNoon + 90 * kDay, RunReason::kSchedule, ""}));
    EXPECT_EQ(Known(1), 1002);
    ASSERT_TRUE(Insert({1, "a", kNoon + 91 * kDay, RunReason::kSchedule, ""}));
    ASSERT_TRUE(Insert({1, "a", kNoon + 92 * kDay, RunReason::kSchedule, ""}));
    EXPECT_EQ(Known(1), 1002);
    EXPECT_EQ(Insert({1, "a", kNoon + 120, RunReason::kSchedule, ""}), std::nullopt);
    EXPECT_TRUE(Insert({1, "a", kNoon + 60, RunReason::kSchedule, ""}));
    EXPECT_EQ(Known(2), 1);
}

TEST_F(RunWriterTest, AThousandStartsAreKnownHoweverOld) {
    Execute(
        "WITH RECURSIVE minute(n) AS (SELECT 0 UNION ALL SELECT n + 1 FROM minute WHERE n < 998) "
        "INSERT INTO recorded_start SELECT 1, 1777636800 + n * 60 FROM minute");
    ASSERT_TRUE(Insert({1, "a", kNoon + 365 * kDay, RunReason::kSchedule, ""}));
    EXPECT_EQ(Known(1), 1000);
    ASSERT_TRUE(Insert({1, "a", kNoon + 366 * kDay, RunReason::kSchedule, ""}));
    EXPECT_EQ(Known(1), 1000);
}

TEST_F(RunWriterTest, WithATaskItsStartsAreForgotten) {
    const int task = TaskStore::Current()->Save(SampleTask("a"));
    ASSERT_TRUE(Insert({task, "a", kNoon, RunReason::kSchedule, "overlap"}));
    ASSERT_TRUE(Insert({task + 1, "b", kNoon, RunReason::kSchedule, "overlap"}));
    TaskStore::Current()->Remove(task);
    EXPECT_EQ(Known(task), 0);
    EXPECT_EQ(Known(task + 1), 1);
}

TEST_F(RunWriterTest, RunsByHandAreRecordedAsOftenAsTheyAreAskedFor) {
    AddRun("state, queued_at", "'queued', 1000");
    AddRun("state, queued_at", "'queued', 1000");
    EXPECT_THAT(Queued(0, 10),
                ElementsAre(Field(&orva::QueuedRun::id, 1), Field(&orva::QueuedRun::id, 2)));
}

TEST_F(RunWriterTest, WhatWaitsIsReadByIdWithItsDueTime) {
    AddRun("state, queued_at", "'queued', 2500");
    AddRun("state", "'running'");
    AddRun("state, occurrence, queued_at", "'queued', 3, 9000");
    AddRun("state, occurrence, queued_at", "'queued', 4, 9000");
    const std::vector<orva::QueuedRun> all = Queued(0, 10);
    ASSERT_EQ(all.size(), 3U);
    EXPECT_EQ(all[0].due, absl::FromUnixMillis(2500));
    EXPECT_EQ(all[0].since, absl::FromUnixMillis(2500));
    EXPECT_EQ(all[0].task, 1);
    EXPECT_EQ(all[1].due, absl::FromUnixSeconds(3));
    EXPECT_EQ(all[1].since, absl::FromUnixMillis(9000));
    EXPECT_THAT(Queued(1, 1), ElementsAre(Field(&orva::QueuedRun::id, 3)));
    EXPECT_THAT(Queued(4, 1), IsEmpty());
}

TEST_F(RunWriterTest, ARunGoesFromQueuedOverRunningToItsEnd) {
    const std::int64_t run = AddRun("state", "'queued'");
    orva::RunEnding ending;
    ending.started = orva::RunTime(std::chrono::milliseconds(5001));
    ending.ended = orva::RunTime(std::chrono::milliseconds(6002));
    ending.signal = 15;
    InTransaction([&](orva::Connection& connection) {
        orva::MarkRunning(connection, run, "boot", absl::FromUnixMillis(5000));
        return 0;
    });
    EXPECT_EQ(Runs()->Find(run)->state, RunState::kRunning);
    EXPECT_EQ(Runs()->Find(run)->startedAt, absl::FromUnixMillis(5000));
    InTransaction([&](orva::Connection& connection) {
        orva::MarkEnded(connection, run, ending, {std::string("a\0b", 3), "z", 2, 6});
        return 0;
    });
    const orva::Run ended = *Runs()->Find(run);
    EXPECT_EQ(ended.state, RunState::kEnded);
    EXPECT_EQ(ended.startedAt, absl::FromUnixMillis(5001));
    EXPECT_EQ(ended.endedAt, absl::FromUnixMillis(6002));
    EXPECT_EQ(ended.signal, 15);
    EXPECT_FALSE(ended.exitStatus);
    EXPECT_EQ(ended.outputBytes, 6U);
    EXPECT_EQ(Runs()->Output(run)->head, std::string("a\0b", 3));
    EXPECT_EQ(Runs()->Output(run)->tail, "z");
    EXPECT_EQ(Runs()->Output(run)->dropped, 2U);
}

TEST_F(RunWriterTest, ARunThatCouldNotBeStartedHasAReasonAndNoStart) {
    const std::int64_t run = AddRun("state, started_at", "'running', 5000");
    orva::RunEnding ending;
    ending.ended = orva::RunTime(std::chrono::milliseconds(6002));
    ending.why = "the owner is gone";
    InTransaction([&](orva::Connection& connection) {
        orva::MarkEnded(connection, run, ending, {});
        return 0;
    });
    const orva::Run ended = *Runs()->Find(run);
    EXPECT_FALSE(ended.startedAt);
    EXPECT_FALSE(ended.exitStatus || ended.signal);
    EXPECT_EQ(ended.why, "the owner is gone");
}

TEST_F(RunWriterTest, RunningRunsComeWithTheirApplicationAndBoot) {
    const int task = TaskStore::Current()->Save(SampleTask("a"));
    AddRun("task, state, boot_id", std::to_string(task) + ", 'running', 'boot'");
    AddRun("task, state", "77, 'running'");
    AddRun("task, state", "1, 'queued'");
    const auto running = InTransaction(
        [](orva::Connection& connection) { return orva::ReadRunningRuns(connection); });
    ASSERT_EQ(running.size(), 2U);
    EXPECT_EQ(running[0].app, "ORVA.ZUM.TaskScheduler.Script");
    EXPECT_EQ(running[0].bootId, "boot");
    EXPECT_EQ(running[1].task, 77);
    EXPECT_EQ(running[1].app, "");
}

TEST_F(RunWriterTest, TheNewestInstantIsTheLatestOneNotTheLast) {
    const auto newest = [] {
        return InTransaction(
            [](orva::Connection& connection) { return orva::NewestRecord(connection); });
    };
    EXPECT_EQ(newest(), absl::InfinitePast());
    AddRun("queued_at", "9000");
    AddRun("queued_at", "100");
    EXPECT_EQ(newest(), absl::FromUnixMillis(9000));
}

TEST_F(RunWriterTest, RunsFromBeforeTheClockWasSetDoNotMakeTheNewestInstant) {
    const auto set = [](std::int64_t millis) {
        InTransaction([&](orva::Connection& connection) {
            orva::RecordClockSet(connection, absl::FromUnixMillis(millis));
            return 0;
        });
    };
    const auto newest = [] {
        return InTransaction(
            [](orva::Connection& connection) { return orva::NewestRecord(connection); });
    };
    set(50);
    EXPECT_EQ(newest(), absl::FromUnixMillis(50));
    AddRun("queued_at", "9000");
    EXPECT_EQ(newest(), absl::FromUnixMillis(9000));
    set(100);
    EXPECT_EQ(newest(), absl::FromUnixMillis(100));
    AddRun("queued_at", "90");
    EXPECT_EQ(newest(), absl::FromUnixMillis(100));
    AddRun("queued_at", "200");
    AddRun("queued_at", "150");
    EXPECT_EQ(newest(), absl::FromUnixMillis(200));
}

TEST_F(RunWriterTest, OnlyWhatWaitsOrGoesOnIsGivenAnEnd) {
    orva::RunEnding ending;
    ending.exitStatus = 3;
    for (const char* state : {"ended", "skipped", "lost"}) {
        const std::int64_t run = AddRun("state", "'" + std::string(state) + "'");
        InTransaction([&](orva::Connection& connection) {
            orva::MarkEnded(connection, run, ending, {"printed", "", 0, 7});
            orva::MarkLost(connection, run, "gone", absl::FromUnixMillis(5), {"x", "", 0, 1});
            EXPECT_FALSE(orva::MarkSkipped(connection, run, "overlap"));
            return 0;
        });
        EXPECT_EQ(RunStateText(Runs()->Find(run)->state), state);
        EXPECT_EQ(Runs()->Find(run)->why, "");
        EXPECT_FALSE(Runs()->Find(run)->exitStatus);
        EXPECT_EQ(Runs()->Output(run)->head, "");
    }
}

}  // namespace
