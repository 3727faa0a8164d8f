// What a scheduler makes of what it finds: at its start, and when another database takes the place
// of the former one.
#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>

#include <chrono>
#include <filesystem>
#include <string>
#include <utility>

#include "appliance/store/StoreFailure.h"
#include "tests/appliance/scheduler/Instants.h"
#include "tests/appliance/scheduler/SchedulerTest.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

namespace fs = std::filesystem;

constexpr std::uint16_t kTogether = orva::kCanRunAppSameTime | orva::kCanRunTaskSameTime;

class SchedulerTakeOverTest : public SchedulerTest {
  protected:
    // Keeps the database as it is now.
    void BackUp() const { fs::copy_file(Folded(), DatabasePath() + ".kept"); }
    // Puts what was kept in the place of the database.
    void PutBack() const {
        for (const char* log : {"-wal", "-shm"}) {
            fs::remove(DatabasePath() + log);
        }
        fs::rename(DatabasePath() + ".kept", DatabasePath());
    }

  private:
    // With its log folded in.
    std::string Folded() const {
        SQLite::Database(DatabasePath(), SQLite::OPEN_READWRITE)
            .exec("PRAGMA wal_checkpoint(TRUNCATE)");
        return DatabasePath();
    }
};

TEST_F(SchedulerTakeOverTest, ARunThatEndsWhileItIsLookedAtIsInNobodysWay) {
    options.mostRuns = 1;
    AddTask("a", 12, 30);
    SetNow("2026-05-01 12:30:00");
    Work();
    host.onLook = [&](std::int64_t run) { End(run, 4); };
    RestartAndRecover();
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule running -"));
    Work();
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule ended -"));
    EXPECT_EQ(Find(1)->exitStatus, 4);
    EXPECT_EQ(scheduler->RunsGoingOn(), 0U);
    SetNow("2026-05-02 12:30:00");
    Work();
    EXPECT_THAT(Started(), ElementsAre("a", "a"));
}

TEST_F(SchedulerTakeOverTest, ARunOfWhichThereIsNoTraceIsLostAndNotStartedAgain) {
    AddTask("a", 12, 30);
    SetNow("2026-05-01 12:30:00");
    Work();
    // Somebody has removed its folder.
    host.Remove(1);
    RestartAndRecover();
    Work();
    EXPECT_THAT(Started(), ElementsAre("a"));
    EXPECT_THAT(History(),
                ElementsAre("a 05-01 12:30 schedule lost its supervisor has left no ending"));
}

TEST_F(SchedulerTakeOverTest, ThereIsATraceOfARunBeforeItsRowSaysThatItGoesOn) {
    AddTask("a", 12, 30);
    SetNow("2026-05-01 12:30:00");
    std::vector<std::string> before;
    host.onPrepare = [&] { before = History(); };
    host.beforeStart = [&] { EXPECT_THAT(host.folders, ElementsAre(1)); };
    Work();
    EXPECT_THAT(before, IsEmpty());
    EXPECT_THAT(Started(), ElementsAre("a"));
}

TEST_F(SchedulerTakeOverTest, AStepThatCannotBeStoredLeavesNoTraceOfItsRuns) {
    AddTask("a", 12, 30, kTogether);
    AddTask("b", 12, 30, kTogether);
    Reopen(std::chrono::milliseconds(10));
    scheduler = std::make_unique<orva::Scheduler>(*orva::TaskStore::Current(), host, options);
    SetNow("2026-05-01 12:30:00");
    Execute(
        "CREATE TRIGGER broken BEFORE UPDATE ON run WHEN NEW.id = 2 BEGIN "
        "SELECT raise(FAIL, 'broken'); END");
    EXPECT_THROW(Work(), orva::StoreFailure);
    EXPECT_THAT(Started(), IsEmpty());
    EXPECT_THAT(History(), IsEmpty());
    EXPECT_THAT(host.folders, IsEmpty());
    Execute("DROP TRIGGER broken");
    Work();
    EXPECT_THAT(Started(), ElementsAre("a", "b"));
}

TEST_F(SchedulerTakeOverTest, ARunThatHasNoRoomEndsWithTheReason) {
    AddTask("a", 12, 30);
    host.noRoom = "no space for output";
    SetNow("2026-05-01 12:30:00");
    Work();
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule ended no space for output"));
    EXPECT_FALSE(Find(1)->startedAt);
    EXPECT_EQ(Find(1)->endedAt, Utc("2026-05-01 12:30:00"));
    EXPECT_EQ(scheduler->RunsGoingOn(), 0U);
    EXPECT_THAT(host.folders, IsEmpty());
}

TEST_F(SchedulerTakeOverTest, AStopThatComesTooEarlyIsToldThat) {
    AddTask("a", 12, 30);
    SetNow("2026-05-01 12:30:00");
    Work();
    Reopen(std::chrono::milliseconds(10));
    scheduler = std::make_unique<orva::Scheduler>(*orva::TaskStore::Current(), host, options);
    {
        SQLite::Database other(DatabasePath(), SQLite::OPEN_READWRITE);
        other.exec("BEGIN IMMEDIATE");
        EXPECT_THROW(scheduler->Recover(), orva::StoreFailure);
        EXPECT_EQ(scheduler->Stop(1), "the scheduler is only just starting; try again");
        other.exec("ROLLBACK");
    }
    EXPECT_THAT(host.stopped, IsEmpty());
    scheduler->Recover();
    EXPECT_EQ(scheduler->Stop(1), std::nullopt);
    EXPECT_THAT(host.stopped, ElementsAre(1));
}

TEST_F(SchedulerTakeOverTest, ADatabaseThatIsPutBackIsTakenOver) {
    options.mostRuns = 1;
    RestartAndRecover();
    const int id = AddTask("a", 12, 30, kTogether);
    AddTask("b", 18, 0, kTogether);
    BackUp();
    for (const char* day : {"2026-05-01", "2026-05-02", "2026-05-03"}) {
        SetNow(std::string(day) + " 12:30:00");
        Work();
        End(host.started.back().run);
        Work();
    }
    SetNow("2026-05-03 17:59:00");
    Work();
    PutBack();
    // Asked for before the scheduler has noticed; with an id that the former database has given.
    orva::TaskStore::Current()->CurrentSnapshot();
    Execute(
        "INSERT INTO run (task, task_name, reason, state, queued_at, asked_program, "
        "asked_account) VALUES (" +
        std::to_string(id) + ", 'a', 'hand', 'queued', 1777831140000, 'tester', 'root')");
    EXPECT_EQ(Work(), Utc("2026-05-03 18:00:00"));
    End(1, 5);
    Work();
    EXPECT_THAT(History(), ElementsAre("a - hand ended -", "a 05-03 12:30 schedule skipped missed",
                                       "b 05-02 18:00 schedule skipped missed"));
    EXPECT_EQ(Find(1)->exitStatus, 5);
}

TEST_F(SchedulerTakeOverTest, WhatTheFormerDatabaseHadGoingOnIsStoredInNoRowOfTheNewOne) {
    const int id = AddTask("a", 12, 30, kTogether);
    BackUp();
    SetNow("2026-05-01 12:30:00");
    Work();
    EXPECT_THAT(host.goingOn, ElementsAre(1));
    PutBack();
    orva::TaskStore::Current()->CurrentSnapshot();
    Execute(
        "INSERT INTO run (task, task_name, reason, state, queued_at, asked_program, "
        "asked_account) VALUES (" +
        std::to_string(id) + ", 'other', 'hand', 'ended', 1777636800000, '', '');" +
        "UPDATE task SET next_start = NULL");
    EXPECT_EQ(scheduler->Stop(1), "the scheduler is only just starting; try again");
    host.outputs[1] = {"of a stranger", "", 0, 13};
    End(1, 9);
    Work();
    EXPECT_THAT(History(), ElementsAre("other - hand ended -"));
    EXPECT_FALSE(Find(1)->exitStatus);
    EXPECT_EQ(orva::RunStore::Current()->Output(1)->head, "");
    EXPECT_THAT(host.folders, IsEmpty());
    EXPECT_EQ(scheduler->RunsGoingOn(), 0U);
}

TEST_F(SchedulerTakeOverTest, ADatabaseThatIsReplacedDuringAStepIsNotWrittenTo) {
    AddTask("a", 12, 30, kTogether);
    BackUp();
    SetNow("2026-05-01 12:30:00");
    Work();
    End(1, 3);
    bool putsBack = false;
    // Asked after the scheduler has seen that it is still the same one.
    options.clockSynchronised = [&] {
        if (std::exchange(putsBack, false)) {
            PutBack();
        }
        return true;
    };
    RestartAndRecover();
    putsBack = true;
    Work();
    EXPECT_THAT(Started(), ElementsAre("a", "a"));
    EXPECT_THAT(History(), ElementsAre("a 05-01 12:30 schedule running -"));
}

}  // namespace
