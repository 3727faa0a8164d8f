#include "appliance/store/TaskStore.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <errno.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <unistd.h>

#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "appliance/root/Root.h"
#include "appliance/store/StoreFailure.h"
#include "appliance/util/CallScope.h"
#include "appliance/util/FileDescriptor.h"
#include "tests/appliance/store/StoreTest.h"

namespace {

using orva::TaskData;
using orva::TaskStore;
using testing::ElementsAre;
using testing::IsEmpty;

class TaskStoreTest : public StoreTest {
  protected:
    static orva::ErrorCode CodeOf(const std::function<void()>& operation) {
        try {
            operation();
        } catch (const orva::StoreFailure& failure) {
            return failure.Code();
        }
        return orva::ErrorCode{};
    }
};

TEST_F(TaskStoreTest, ACallSeesOneStateOfATaskFromItsFirstLookToItsEnd) {
    TaskStore& store = *TaskStore::Current();
    TaskData task = SampleTask("a");
    task.id = store.Save(task);
    const auto other = OtherProcess();
    const auto rename = [&](const char* name) {
        task.name = name;
        std::thread([&] { other->Save(task); }).join();
    };
    {
        const orva::CallScope call;
        EXPECT_EQ(store.Find(task.id)->name, "a");
        rename("b");
        EXPECT_EQ(store.Find(task.id)->name, "a");
        EXPECT_EQ(other->Find(task.id)->name, "b");
    }
    EXPECT_EQ(store.Find(task.id)->name, "b");
    rename("c");
    EXPECT_EQ(store.Find(task.id)->name, "c");
    const orva::CallScope call;
    EXPECT_EQ(store.Find(task.id)->name, "c");
}

TEST_F(TaskStoreTest, AChangeComputesTheNextStartAnewWhenItIsOneOfTheSchedule) {
    TaskStore& store = *TaskStore::Current();
    TaskData task = SampleTask("a");
    task.id = store.Save(task);
    const std::string computed = Stored("SELECT next_start FROM task");
    // As the scheduler may have set it, by a clock or a zone that is another one now.
    const std::string other = std::to_string(std::stoll(computed) + 60);
    SQLite::Database(DatabasePath(), SQLite::OPEN_READWRITE)
        .exec("UPDATE task SET next_start = " + other);
    TaskData changed = task;
    changed.name = "b";
    changed.command = "true";
    store.Change(task, changed);
    EXPECT_EQ(Stored("SELECT next_start FROM task"), other);
    changed = task;
    changed.Set(orva::kEnabled, false);
    store.Change(task, changed);
    EXPECT_EQ(Stored("SELECT count(*) FROM task WHERE next_start IS NULL"), "1");
    store.Change(changed, task);
    EXPECT_EQ(Stored("SELECT next_start FROM task"), computed);
    changed = task;
    changed.schedule.firstMinute += 1;
    store.Change(task, changed);
    EXPECT_EQ(Stored("SELECT next_start FROM task"), other);
}

TEST_F(TaskStoreTest, ACallSeesWhatItHasChangedItself) {
    TaskStore& store = *TaskStore::Current();
    TaskData task = SampleTask("a");
    task.id = store.Save(task);
    const orva::CallScope call;
    const orva::SharedTask before = store.Find(task.id);
    task.name = "b";
    EXPECT_EQ(store.Change(*before, task)->name, "b");
    EXPECT_EQ(store.Find(task.id)->name, "b");
    task.name = "c";
    store.Save(task);
    EXPECT_EQ(store.Find(task.id)->name, "c");
    task.name = "d";
    store.SaveAll({task});
    EXPECT_EQ(store.Find(task.id)->name, "d");
    store.Remove(task.id);
    EXPECT_EQ(store.Find(task.id), nullptr);
}

TEST_F(TaskStoreTest, EverythingOfATaskComesBackAsItWasStored) {
    TaskData task = SampleTask("N\xc3\xa4htlich \"1\"");
    task.flags = orva::kListable | orva::kCanEditOwner | orva::kCanRunAppSameTime;
    task.appName = "#script:script_title#";
    task.appArgs = "{\"script\":\"x\"}\n";
    task.action = "runs";
    task.command = "echo 'a\nb'";
    task.editForm = "Form";
    task.schedule.mode = orva::Schedule::Mode::kDate;
    task.schedule.repeat = orva::Schedule::Repeat::kHalfYearly;
    task.schedule.weekDays = 0b101;
    task.schedule.date = absl::CivilDay(2028, 2, 29);
    task.schedule.intervalMinutes = 15;
    task.schedule.lastMinute = 700;
    task.schedule.runMissed = true;
    task.id = TaskStore::Current()->Save(task);
    EXPECT_EQ(task.id, 1);
    EXPECT_EQ(*TaskStore::Current()->Find(1), task);
    Reopen();
    EXPECT_EQ(*TaskStore::Current()->Find(1), task);
    EXPECT_EQ(TaskStore::Current()->CurrentSnapshot()->Task(0), task);
}

TEST_F(TaskStoreTest, SavingAgainReplacesTheTask) {
    TaskData task = SampleTask("one");
    task.id = TaskStore::Current()->Save(task);
    task.name = "two";
    EXPECT_EQ(TaskStore::Current()->Save(task), 1);
    EXPECT_EQ(TaskStore::Current()->Find(1)->name, "two");
    EXPECT_THAT(Ids(*TaskStore::Current()->CurrentSnapshot()), ElementsAre(1));
}

TEST_F(TaskStoreTest, AnIdIsNeverGivenTwice) {
    TaskStore& store = *TaskStore::Current();
    EXPECT_EQ(store.Save(SampleTask("a")), 1);
    EXPECT_EQ(store.Save(SampleTask("b")), 2);
    store.Remove(2);
    EXPECT_EQ(store.Save(SampleTask("c")), 3);
    store.Remove(3);
    Reopen();
    EXPECT_EQ(TaskStore::Current()->Save(SampleTask("d")), 4);
}

TEST_F(TaskStoreTest, ATaskThatIsGoneCanBeNeitherSavedNorRemovedNorFound) {
    TaskStore& store = *TaskStore::Current();
    TaskData task = SampleTask("a");
    task.id = store.Save(task);
    store.Remove(task.id);
    EXPECT_EQ(CodeOf([&] { store.Save(task); }), orva::kErrNotFound);
    EXPECT_EQ(CodeOf([&] { store.Remove(task.id); }), orva::kErrNotFound);
    EXPECT_EQ(store.Find(task.id), nullptr);
    EXPECT_THAT(Ids(*store.CurrentSnapshot()), IsEmpty());
}

TEST_F(TaskStoreTest, AChangeLeavesEverythingElseAsOthersHaveStoredIt) {
    TaskStore& store = *TaskStore::Current();
    const auto other = OtherProcess();
    TaskData base = SampleTask("a");
    base.id = store.Save(base);
    TaskData theirs = base;
    theirs.name = "b";
    theirs.schedule.firstMinute = 60;
    theirs.Set(orva::kListable, false);
    other->Save(theirs);
    TaskData ours = base;
    ours.command = "false";
    ours.Set(orva::kCanEditOwner, true);
    const orva::SharedTask stored = store.Change(base, ours);
    TaskData expected = theirs;
    expected.command = "false";
    expected.Set(orva::kCanEditOwner, true);
    EXPECT_EQ(*stored, expected);
    EXPECT_EQ(*other->Find(base.id), expected);
    // The start belongs to the schedule that is stored, not to the one that was read.
    EXPECT_EQ(Stored("SELECT datetime(next_start, 'unixepoch') FROM task"), "2026-05-02 01:00:00");
    other->Remove(base.id);
    EXPECT_EQ(CodeOf([&] { store.Change(base, ours); }), orva::kErrNotFound);
    EXPECT_EQ(store.Find(base.id), nullptr);
}

TEST_F(TaskStoreTest, TheNextStartIsStoredWhereTheSchedulerFindsIt) {
    TaskStore& store = *TaskStore::Current();
    TaskData task = SampleTask("a");
    task.id = store.Save(task);
    EXPECT_EQ(Stored("SELECT datetime(next_start, 'unixepoch') FROM task"), "2026-05-02 06:30:00");
    task.Set(orva::kEnabled, false);
    store.Save(task);
    EXPECT_EQ(Stored("SELECT next_start IS NULL FROM task"), "1");
}

TEST_F(TaskStoreTest, SaveAllStoresAllOrNothing) {
    TaskStore& store = *TaskStore::Current();
    TaskData withId = SampleTask("a");
    withId.id = 5;
    EXPECT_THROW(store.SaveAll({withId, withId}), orva::StoreFailure);
    EXPECT_THAT(Ids(*store.CurrentSnapshot()), IsEmpty());
}

TEST_F(TaskStoreTest, SaveAllKeepsIdsThatWereNeverGivenAndReplacesStoredTasks) {
    TaskStore& store = *TaskStore::Current();
    TaskData seven = SampleTask("seven");
    seven.id = 7;
    TaskData three = SampleTask("three");
    three.id = 3;
    store.SaveAll({SampleTask("new"), seven, three});
    EXPECT_THAT(Ids(*store.CurrentSnapshot()), ElementsAre(3, 7, 8));
    EXPECT_EQ(store.Find(8)->name, "new");

    store.Remove(3);
    seven.name = "SEVEN";
    store.SaveAll({three, seven});
    EXPECT_THAT(Ids(*store.CurrentSnapshot()), ElementsAre(7, 8, 9));
    EXPECT_EQ(store.Find(7)->name, "SEVEN");
    EXPECT_EQ(store.Find(9)->name, "three");
}

TEST_F(TaskStoreTest, WhenAllIdsAreUsedUpNothingIsStored) {
    TaskStore& store = *TaskStore::Current();
    TaskData last = SampleTask("last");
    last.id = 2147483647;
    store.SaveAll({last});
    EXPECT_EQ(CodeOf([&] { store.Save(SampleTask("one more")); }), orva::kErrDatabaseFull);
    EXPECT_THAT(Ids(*store.CurrentSnapshot()), ElementsAre(2147483647));
}

TEST_F(TaskStoreTest, ARunIsQueuedOnlyWhileASchedulerIsAlive) {
    TaskStore& store = *TaskStore::Current();
    store.Save(SampleTask("a"));
    TaskData idle = SampleTask("no command");
    idle.command.clear();
    store.Save(idle);
    EXPECT_EQ(CodeOf([&] { store.QueueRun(1); }), orva::kErrNoScheduler);
    EXPECT_EQ(CodeOf([&] { store.QueueRun(2); }), orva::kErrNotAllowed);
    EXPECT_EQ(CodeOf([&] { store.QueueRun(3); }), orva::kErrNotFound);
    EXPECT_EQ(Stored("SELECT count(*) FROM run"), "0");

    MakeDirectory("/run/orva");
    const orva::FileDescriptor lock(
        ::open((RootPath() + "/run/orva/schedd.lock").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600));
    ASSERT_EQ(::flock(lock.Get(), LOCK_EX), 0);
    store.QueueRun(1);
    store.QueueRun(1);
    EXPECT_EQ(CodeOf([&] { store.QueueRun(2); }), orva::kErrNotAllowed);
    EXPECT_EQ(Stored("SELECT group_concat(task || ' ' || reason || ' ' || state || ' ' || "
                     "datetime(queued_at / 1000, 'unixepoch'), ', ') FROM run"),
              "1 hand queued 2026-05-01 12:00:00, 1 hand queued 2026-05-01 12:00:00");
    EXPECT_EQ(Stored("SELECT asked_program FROM run"), program_invocation_short_name);
    EXPECT_EQ(Stored("SELECT task_name FROM run"), "a");
}

TEST_F(TaskStoreTest, TheQueuedRunsOfARemovedTaskAreSkipped) {
    TaskStore& store = *TaskStore::Current();
    store.Save(SampleTask("a"));
    {
        SQLite::Database database(DatabasePath(), SQLite::OPEN_READWRITE);
        database.exec(
            "INSERT INTO run (task, reason, state, queued_at, asked_program, "
            "asked_account) VALUES (1, 'hand', 'queued', 0, '', ''), "
            "(1, 'hand', 'ended', 0, '', '')");
    }
    store.Remove(1);
    EXPECT_EQ(Stored("SELECT group_concat(state || ' ' || why, ',') FROM run"),
              "skipped deleted,ended ");
}

TEST_F(TaskStoreTest, AStartOfTheScheduleCanBeRecordedOnlyOnce) {
    TaskStore::Current()->CurrentSnapshot();
    SQLite::Database database(DatabasePath(), SQLite::OPEN_READWRITE);
    const char* insert =
        "INSERT INTO run (task, occurrence, reason, state, queued_at, "
        "asked_program, asked_account) VALUES (1, 1800000000, 'schedule', "
        "'queued', 0, '', '')";
    EXPECT_EQ(database.exec(insert), 1);
    EXPECT_THROW(database.exec(insert), SQLite::Exception);
}

TEST_F(TaskStoreTest, ADifferentRootIsADifferentStore) {
    TaskStore::Current()->Save(SampleTask("a"));
    const std::string first = RootPath();
    MakeDirectory("/second");
    orva::SetRoot(first + "/second");
    EXPECT_THAT(Ids(*TaskStore::Current()->CurrentSnapshot()), IsEmpty());
    orva::SetRoot(first);
    EXPECT_THAT(Ids(*TaskStore::Current()->CurrentSnapshot()), ElementsAre(1));
}

TEST_F(TaskStoreTest, ARowThatNoVersionCouldHaveWrittenIsCorruption) {
    TaskStore::Current()->Save(SampleTask("a"));
    for (const char* damage : {"mode = 7", "repeat = -1", "first_minute = 1440", "week_days = 128",
                               "date = 'soon'", "run_missed = 2"}) {
        {
            SQLite::Database database(DatabasePath(), SQLite::OPEN_READWRITE);
            database.exec(std::string("UPDATE task SET ") + damage);
        }
        Reopen();
        TakeLog();
        EXPECT_EQ(CodeOf([] { TaskStore::Current()->Find(1); }), orva::kErrDatabaseCorrupt)
            << damage;
        const std::vector<std::string> log = TakeLog();
        ASSERT_EQ(log.size(), 1U);
        EXPECT_THAT(log[0], testing::HasSubstr(DatabasePath() + ": task 1: column "));
        SQLite::Database database(DatabasePath(), SQLite::OPEN_READWRITE);
        database.exec(
            "UPDATE task SET mode = 0, repeat = 0, first_minute = 0, week_days = 127, "
            "date = NULL, run_missed = 0");
    }
}

}  // namespace
