#include "appliance/runs/RunStore.h"

#include <absl/time/time.h>
#include <gmock/gmock.h>

#include <functional>
#include <string>
#include <vector>

#include "appliance/store/StoreFailure.h"
#include "appliance/supervisor/OutputFile.h"
#include "appliance/supervisor/RunFolder.h"
#include "tests/appliance/runs/RunTest.h"

namespace {

using orva::RunReason;
using orva::RunState;
using orva::RunStore;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class RunStoreTest : public RunTest {
  protected:
    static std::vector<std::int64_t> Ids(const std::vector<orva::Run>& runs) {
        std::vector<std::int64_t> ids;
        for (const orva::Run& run : runs) {
            ids.push_back(run.id);
        }
        return ids;
    }
};

TEST_F(RunStoreTest, ARunComesBackWithAllThatIsStoredOfIt) {
    AddRun(
        "task, task_name, occurrence, reason, state, why, queued_at, asked_program, "
        "asked_account, started_at, ended_at, exit_status, output_bytes",
        "7, 'N\xc3\xa4htlich', 1800000000, 'missed', 'ended', 'late', 1800000001234, "
        "'orva-webapid', "
        "'anna', 1800000002000, 1800000003999, 3, 5000000000");
    const std::optional<orva::Run> run = Runs()->Find(1);
    ASSERT_TRUE(run);
    EXPECT_EQ(run->id, 1);
    EXPECT_EQ(run->task, 7);
    EXPECT_EQ(run->taskName, "N\xc3\xa4htlich");
    EXPECT_EQ(run->occurrence, absl::FromUnixSeconds(1800000000));
    EXPECT_EQ(run->reason, RunReason::kMissed);
    EXPECT_EQ(run->state, RunState::kEnded);
    EXPECT_EQ(run->why, "late");
    EXPECT_EQ(run->queuedAt, absl::FromUnixMillis(1800000001234));
    EXPECT_EQ(run->askedProgram, "orva-webapid");
    EXPECT_EQ(run->askedAccount, "anna");
    EXPECT_EQ(run->startedAt, absl::FromUnixMillis(1800000002000));
    EXPECT_EQ(run->endedAt, absl::FromUnixMillis(1800000003999));
    EXPECT_EQ(run->exitStatus, 3);
    EXPECT_EQ(run->signal, std::nullopt);
    EXPECT_EQ(run->outputBytes, 5000000000U);
}

TEST_F(RunStoreTest, WhatARunDoesNotHaveYetIsAbsent) {
    AddRun("reason, state", "'schedule', 'queued'");
    const std::optional<orva::Run> run = Runs()->Find(1);
    ASSERT_TRUE(run);
    EXPECT_EQ(run->reason, RunReason::kSchedule);
    EXPECT_EQ(run->state, RunState::kQueued);
    EXPECT_EQ(run->occurrence, std::nullopt);
    EXPECT_EQ(run->startedAt, std::nullopt);
    EXPECT_EQ(run->endedAt, std::nullopt);
    EXPECT_EQ(run->exitStatus, std::nullopt);
    EXPECT_EQ(run->signal, std::nullopt);
    EXPECT_EQ(run->outputBytes, 0U);
    EXPECT_EQ(Runs()->Find(2), std::nullopt);
}

TEST_F(RunStoreTest, ListsTheNewestFirstInPagesWithTheTotal) {
    for (int run = 1; run <= 5; ++run) {
        AddRun();
    }
    EXPECT_THAT(Ids(Runs()->List({}, 0, 50).runs), ElementsAre(5, 4, 3, 2, 1));
    const RunStore::Page page = Runs()->List({}, 1, 2);
    EXPECT_THAT(Ids(page.runs), ElementsAre(4, 3));
    EXPECT_EQ(page.total, 5);
    EXPECT_THAT(Runs()->List({}, 5, 10).runs, IsEmpty());
    EXPECT_EQ(Runs()->List({}, 5, 10).total, 5);
    EXPECT_THAT(Runs()->List({}, 0, 0).runs, IsEmpty());
}

TEST_F(RunStoreTest, AListMayBeOfOneTaskOfOneStateOrOfBoth) {
    AddRun("task, state", "1, 'ended'");
    AddRun("task, state", "2, 'ended'");
    AddRun("task, state", "1, 'skipped'");
    AddRun("task, state", "2, 'running'");
    AddRun("task, state", "1, 'ended'");
    const auto list = [](std::optional<int> task, std::optional<RunState> state) {
        RunStore::Page page = Runs()->List({task, state}, 0, 50);
        EXPECT_EQ(page.total, static_cast<std::int64_t>(page.runs.size()));
        return Ids(page.runs);
    };
    EXPECT_THAT(list(1, {}), ElementsAre(5, 3, 1));
    EXPECT_THAT(list({}, RunState::kEnded), ElementsAre(5, 2, 1));
    EXPECT_THAT(list(1, RunState::kEnded), ElementsAre(5, 1));
    EXPECT_THAT(list(2, RunState::kRunning), ElementsAre(4));
    EXPECT_THAT(list({}, RunState::kLost), IsEmpty());
    EXPECT_THAT(list(3, {}), IsEmpty());
}

TEST_F(RunStoreTest, TheLatestRunOfEachTaskComesInTheOrderOfTheTasks) {
    AddRun("task", "1");
    AddRun("task", "2");
    AddRun("task", "1");
    AddRun("task", "9");
    EXPECT_THAT(Ids(Runs()->Latest({2, 5, 1})), ElementsAre(2, 3));
    EXPECT_THAT(Runs()->Latest({}), IsEmpty());
}

TEST_F(RunStoreTest, TheRunThatGoesOnIsTheLatestWhateverWasSkippedForIt) {
    AddRun("task, state", "1, 'ended'");
    AddRun("task, state", "1, 'running'");
    AddRun("task, state", "1, 'skipped'");
    AddRun("task, state", "2, 'skipped'");
    EXPECT_THAT(Ids(Runs()->Latest({1, 2})), ElementsAre(2, 4));
}

TEST_F(RunStoreTest, OutputIsGivenByteForByte) {
    AddRun();
    AddRun();
    Execute("INSERT INTO run_output VALUES (1, x'00ff0a', x'6162', 123456789012)");
    const std::optional<orva::RunOutput> output = Runs()->Output(1);
    ASSERT_TRUE(output);
    EXPECT_EQ(output->head, std::string("\0\xff\n", 3));
    EXPECT_EQ(output->tail, "ab");
    EXPECT_EQ(output->dropped, 123456789012U);

    const std::optional<orva::RunOutput> silent = Runs()->Output(2);
    ASSERT_TRUE(silent);
    EXPECT_EQ(silent->head + silent->tail, "");
    EXPECT_EQ(silent->dropped, 0U);
    EXPECT_FALSE(Runs()->Output(3));
}

TEST_F(RunStoreTest, OutputOfARunningRunIsWhatItHasPrintedSoFar) {
    AddRun("state", "'running'");
    EXPECT_EQ(Runs()->Output(1)->head, "");
    std::string error;
    MakeDirectory("/usr/orva/var/runs");
    const orva::RunFolder folder(1);
    const std::optional<orva::FileDescriptor> process =
        orva::RunFolder(1).Create({1, 1, "root", "true", {}}, error);
    ASSERT_TRUE(process) << error;
    std::optional<orva::OutputWriter> writer =
        orva::OutputWriter::Create(folder.Path() + "/output");
    ASSERT_TRUE(writer);
    EXPECT_EQ(Runs()->Output(1)->head, "");
    writer->Append("so far");
    EXPECT_EQ(Runs()->Output(1)->head, "so far");
    writer->Append(std::string(200000, 'x'));
    EXPECT_EQ(Runs()->Output(1)->head.size(), 65536U);
    EXPECT_EQ(Runs()->Output(1)->tail, std::string(65536, 'x'));
    EXPECT_EQ(Runs()->Output(1)->dropped, 200006U - 2 * 65536U);

    // What counts once it has ended is the row.
    Execute("UPDATE run SET state = 'ended'");
    Execute("INSERT INTO run_output VALUES (1, x'61', x'', 0)");
    EXPECT_EQ(Runs()->Output(1)->head, "a");
}

TEST_F(RunStoreTest, ARunThatIsRemovedTakesItsOutputAlong) {
    AddRun();
    Execute("INSERT INTO run_output VALUES (1, x'61', x'', 0)");
    Execute("DELETE FROM run WHERE id = 1");
    AddRun();
    Execute("UPDATE run SET id = 1");
    EXPECT_EQ(Runs()->Output(1)->head, "");
}

TEST_F(RunStoreTest, TheRevisionGrowsWithEveryChangeOfTasksOrRuns) {
    std::int64_t revision = Runs()->Revision();
    const auto expectGrown = [&revision](const std::string& by) {
        const std::int64_t now = Runs()->Revision();
        EXPECT_GT(now, revision) << by;
        revision = now;
    };
    orva::TaskStore::Current()->Save(SampleTask("a"));
    expectGrown("a new task");
    OtherProcess()->Remove(1);
    expectGrown("a task that another process removed");
    AddRun();
    expectGrown("a new run");
    Execute("UPDATE run SET state = 'lost'");
    expectGrown("a changed run");
    Execute("DELETE FROM run");
    expectGrown("a removed run");
    EXPECT_EQ(Runs()->Revision(), revision);
}

TEST_F(RunStoreTest, OnlyARunThatWaitsCanBeCancelled) {
    const std::int64_t waiting = AddRun("state", "'queued'");
    EXPECT_TRUE(Runs()->Cancel(waiting));
    EXPECT_EQ(Runs()->Find(waiting)->state, orva::RunState::kSkipped);
    EXPECT_EQ(Runs()->Find(waiting)->why, "stopped");
    for (const char* state : {"running", "ended", "skipped", "lost"}) {
        const std::int64_t run = AddRun("state", "'" + std::string(state) + "'");
        EXPECT_FALSE(Runs()->Cancel(run));
        EXPECT_EQ(RunStateText(Runs()->Find(run)->state), state);
        EXPECT_EQ(Runs()->Find(run)->why, "");
    }
    EXPECT_FALSE(Runs()->Cancel(77));
}

TEST_F(RunStoreTest, ADamagedRowIsLeftOutOfListsAndNamedOnce) {
    const std::int64_t good = AddRun();
    TakeLog();
    for (const char* damage : {"task = 0", "task = 3000000000", "reason = 'whim'", "state = ''",
                               "exit_status = 99999999999", "signal = -99999999999"}) {
        const std::int64_t damaged = AddRun("task", "2");
        Execute("UPDATE run SET " + std::string(damage) + " WHERE id = " + std::to_string(damaged));
        EXPECT_THAT(Ids(Runs()->List({}, 0, 10).runs), ElementsAre(good)) << damage;
        EXPECT_EQ(Runs()->List({}, 0, 10).total, 2);
        EXPECT_THAT(Ids(Runs()->Latest({1, 2})), ElementsAre(good)) << damage;
        EXPECT_THAT(TakeLog(), ElementsAre(AllOf(
                                   HasSubstr(DatabasePath() + ": run " + std::to_string(damaged)),
                                   HasSubstr(": it is left out"))));
        orva::ErrorCode code{};
        try {
            Runs()->Find(damaged);
        } catch (const orva::StoreFailure& failure) {
            code = failure.Code();
        }
        EXPECT_EQ(code, orva::kErrDatabaseCorrupt) << damage;
        TakeLog();
        Execute("DELETE FROM run WHERE id = " + std::to_string(damaged));
    }
}

}  // namespace
