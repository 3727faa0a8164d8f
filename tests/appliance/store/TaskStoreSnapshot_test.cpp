// What the store shows of all tasks, and when it reads them again.
#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>

#include <memory>
#include <string>
#include <vector>

#include "appliance/store/TaskStore.h"
#include "tests/appliance/store/StoreTest.h"

namespace {

using orva::TaskData;
using orva::TaskStore;
using testing::ElementsAre;
using testing::IsEmpty;

class TaskStoreSnapshotTest : public StoreTest {
  protected:
    static std::string Start(int id) {
        const auto snapshot = TaskStore::Current()->CurrentSnapshot();
        return orva::FormatNextStart(snapshot->NextStart(*snapshot->Find(id)), snapshot->Zone());
    }
};

TEST_F(TaskStoreSnapshotTest, AnUnchangedStoreIsNotReadAgain) {
    TaskStore& store = *TaskStore::Current();
    store.Save(SampleTask("a"));
    const auto first = store.CurrentSnapshot();
    EXPECT_EQ(store.CurrentSnapshot(), first);
    store.Find(1);
    EXPECT_EQ(store.CurrentSnapshot(), first);
}

TEST_F(TaskStoreSnapshotTest, ChangesByThisAndByOtherProcessesAreSeenAtOnce) {
    TaskStore& store = *TaskStore::Current();
    const auto other = OtherProcess();
    EXPECT_THAT(Ids(*store.CurrentSnapshot()), IsEmpty());
    other->Save(SampleTask("a"));
    EXPECT_THAT(Ids(*store.CurrentSnapshot()), ElementsAre(1));
    store.Save(SampleTask("b"));
    EXPECT_THAT(Ids(*store.CurrentSnapshot()), ElementsAre(1, 2));
    EXPECT_THAT(Ids(*other->CurrentSnapshot()), ElementsAre(1, 2));
    other->Remove(1);
    store.Save(SampleTask("c"));
    EXPECT_THAT(Ids(*store.CurrentSnapshot()), ElementsAre(2, 3));
    TaskData task = *other->Find(2);
    task.name = "B";
    other->Save(task);
    EXPECT_EQ(store.CurrentSnapshot()->Task(0).name, "B");
}

TEST_F(TaskStoreSnapshotTest, OnlyWhatChangedIsReadAgain) {
    TaskStore& store = *TaskStore::Current();
    store.SaveAll({SampleTask("a"), SampleTask("b"), SampleTask("c"), SampleTask("d")});
    const auto former = store.CurrentSnapshot();
    const auto other = OtherProcess();
    TaskData changed = *other->Find(2);
    changed.name = "B";
    other->Save(changed);
    other->Remove(3);
    other->Save(SampleTask("e"));
    const auto current = store.CurrentSnapshot();
    EXPECT_THAT(Ids(*current), ElementsAre(1, 2, 4, 5));
    EXPECT_EQ(current->Task(1).name, "B");
    EXPECT_EQ(current->Tasks()[0], former->Tasks()[0]);
    EXPECT_EQ(current->Tasks()[2], former->Tasks()[3]);
    EXPECT_EQ(former->Task(1).name, "b");
}

TEST_F(TaskStoreSnapshotTest, ManyChangesAtOnceAreAllSeen) {
    TaskStore& store = *TaskStore::Current();
    store.SaveAll({SampleTask("a")});
    store.CurrentSnapshot();
    OtherProcess()->SaveAll(std::vector<TaskData>(3000, SampleTask("many")));
    EXPECT_EQ(store.CurrentSnapshot()->Count(), 3001U);
    OtherProcess()->SaveAll(std::vector<TaskData>(12000, SampleTask("more")));
    EXPECT_EQ(store.CurrentSnapshot()->Count(), 15001U);
    EXPECT_EQ(Stored("SELECT count(*) BETWEEN 10000 AND 10256 FROM task_change"), "1");
}

TEST_F(TaskStoreSnapshotTest, ANextStartThatHasPassedIsComputedAnew) {
    TaskStore& store = *TaskStore::Current();
    store.Save(SampleTask("a"));
    EXPECT_EQ(Start(1), "2026-05-02 06:30");
    SetNow("2026-05-02 06:29:59");
    const auto before = store.CurrentSnapshot();
    EXPECT_EQ(Start(1), "2026-05-02 06:30");
    EXPECT_EQ(store.CurrentSnapshot(), before);
    SetNow("2026-05-02 06:30:00");
    EXPECT_EQ(Start(1), "2026-05-03 06:30");
    // The tasks themselves are not read again for that.
    EXPECT_EQ(store.CurrentSnapshot()->Tasks()[0], before->Tasks()[0]);
}

TEST_F(TaskStoreSnapshotTest, AClockThatIsPutBackBringsBackEarlierStarts) {
    TaskStore::Current()->Save(SampleTask("a"));
    SetNow("2026-05-10 12:00:00");
    EXPECT_EQ(Start(1), "2026-05-11 06:30");
    SetNow("2026-05-01 00:00:00");
    EXPECT_EQ(Start(1), "2026-05-01 06:30");
}

TEST_F(TaskStoreSnapshotTest, AChangedTimeZoneChangesTheNextStarts) {
    TaskStore& store = *TaskStore::Current();
    store.Save(SampleTask("a"));
    EXPECT_EQ(store.CurrentSnapshot()->NextStart(0), 1777703400);
    ::setenv("TZ", "Asia/Kolkata", 1);
    EXPECT_EQ(store.CurrentSnapshot()->NextStart(0), 1777703400 - 19800);
    EXPECT_EQ(Start(1), "2026-05-02 06:30");
}

TEST_F(TaskStoreSnapshotTest, ARunThatChangesLeavesTheSnapshotOfTheTasksAsItIs) {
    TaskStore& store = *TaskStore::Current();
    store.Save(SampleTask("a"));
    const auto before = store.CurrentSnapshot();
    SQLite::Database(DatabasePath(), SQLite::OPEN_READWRITE)
        .exec(
            "INSERT INTO run (task, reason, state, queued_at, asked_program, asked_account) "
            "VALUES (1, 'hand', 'queued', 0, '', '')");
    EXPECT_EQ(store.CurrentSnapshot(), before);
    OtherProcess()->Save(SampleTask("b"));
    EXPECT_THAT(Ids(*store.CurrentSnapshot()), ElementsAre(1, 2));
    // 06:30 of the next day has passed: its start is another one now.
    SetNow("2026-05-02 12:00:00");
    EXPECT_EQ(Start(1), "2026-05-03 06:30");
}

TEST_F(TaskStoreSnapshotTest, ADamagedRowIsLeftOutOfTheSnapshotAndNamedOnce) {
    const auto damageAndTouch = [this](const std::string& set) {
        SQLite::Database database(DatabasePath(), SQLite::OPEN_READWRITE);
        database.exec("UPDATE task SET " + set + " WHERE id = 2");
        database.exec("INSERT INTO task_change (task) VALUES (2)");
    };
    const std::shared_ptr<TaskStore> store = TaskStore::Current();
    for (const char* name : {"a", "b", "c"}) {
        store->Save(SampleTask(name));
    }
    EXPECT_THAT(Ids(*store->CurrentSnapshot()), ElementsAre(1, 2, 3));
    TakeLog();
    const std::string problem =
        "task store " + DatabasePath() + ": task 2: column mode holds 7: it is left out";
    damageAndTouch("mode = 7");
    EXPECT_THAT(Ids(*store->CurrentSnapshot()), ElementsAre(1, 3));
    store->Remove(1);
    EXPECT_THAT(Ids(*store->CurrentSnapshot()), ElementsAre(3));
    ASSERT_EQ(store->CurrentSnapshot()->Damaged().size(), 1U);
    EXPECT_EQ(store->CurrentSnapshot()->Damaged()[0].id, 2);
    EXPECT_THAT(TakeLog(), ElementsAre(problem));

    // Another process reads all rows at once.
    Reopen();
    EXPECT_THAT(Ids(*TaskStore::Current()->CurrentSnapshot()), ElementsAre(3));
    EXPECT_THAT(TakeLog(), ElementsAre(problem));

    damageAndTouch("mode = 0");
    EXPECT_THAT(Ids(*TaskStore::Current()->CurrentSnapshot()), ElementsAre(2, 3));
    EXPECT_THAT(TaskStore::Current()->CurrentSnapshot()->Damaged(), IsEmpty());
    EXPECT_THAT(TakeLog(), IsEmpty());
}

}  // namespace
