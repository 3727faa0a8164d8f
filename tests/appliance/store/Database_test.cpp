#include "appliance/store/Database.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <chrono>
#include <filesystem>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "appliance/root/Root.h"
#include "appliance/store/DatabaseFile.h"
#include "appliance/store/TaskTable.h"
#include "tests/appliance/store/DatabaseTest.h"

namespace {

using orva::TaskStore;
using testing::HasSubstr;

TEST_F(DatabaseTest, AMissingDatabaseIsCreatedWithItsDirectoryForItsGroup) {
    const mode_t mask = ::umask(077);
    EXPECT_EQ(Count(), 0U);
    ::umask(mask);
    EXPECT_EQ(ModeOf(RootPath() + "/usr/orva/var"), 0770);
    EXPECT_EQ(ModeOf(DatabasePath()), 0660);
    EXPECT_EQ(ModeOf(DatabasePath() + "-wal"), 0660);
}

TEST_F(DatabaseTest, ARootThatDoesNotExistIsNotGrown) {
    orva::SetRoot(RootPath() + "/mistyped");
    const Failed failed = Listing();
    EXPECT_EQ(failed.code, orva::kErrDatabase);
    EXPECT_THAT(failed.log, HasSubstr("/mistyped: No such file or directory"));
    EXPECT_FALSE(std::filesystem::exists(RootPath() + "/mistyped"));
}

TEST_F(DatabaseTest, KeepsAWriteAheadLogAndSyncsEveryCommit) {
    TaskStore::Current()->Save(SampleTask("a"));
    orva::Database database(DatabasePath(), std::chrono::seconds(5));
    orva::Database::Lease lease(database);
    orva::Query mode = (*lease).Prepare("PRAGMA journal_mode");
    mode->executeStep();
    EXPECT_EQ(mode->getColumn(0).getString(), "wal");
    orva::Query synchronous = (*lease).Prepare("PRAGMA synchronous");
    synchronous->executeStep();
    EXPECT_EQ(synchronous->getColumn(0).getInt(), 2);
}

TEST_F(DatabaseTest, ADatabaseThatLostItsWriteAheadLogModeGetsItBack) {
    TaskStore::Current()->Save(SampleTask("a"));
    TaskStore::Configure({});
    {
        SQLite::Database database(DatabasePath(), SQLite::OPEN_READWRITE);
        EXPECT_EQ(database.execAndGet("PRAGMA journal_mode = DELETE").getString(), "delete");
    }
    Reopen();
    EXPECT_EQ(Count(), 1U);
    SQLite::Database database(DatabasePath());
    EXPECT_EQ(database.execAndGet("PRAGMA journal_mode").getString(), "wal");
}

TEST_F(DatabaseTest, AFileThatIsNoDatabaseIsLeftAlone) {
    Write("/usr/orva/var/tasks.db", "these are the shopping lists of the last ten years\n");
    ExpectRefused(orva::kErrDatabaseCorrupt, "file is not a database");
    Write("/usr/orva/var/tasks.db", std::string(100000, 'x'));
    ExpectRefused(orva::kErrDatabaseCorrupt, "file is not a database");
}

TEST_F(DatabaseTest, ATruncatedDatabaseIsLeftAlone) {
    TaskStore::Current()->SaveAll(std::vector(200, SampleTask("a")));
    TaskStore::Configure({});
    const auto size = std::filesystem::file_size(DatabasePath());
    std::filesystem::resize_file(DatabasePath(), size / 2);
    Reopen();
    ExpectRefused(orva::kErrDatabaseCorrupt, "malformed");
    std::filesystem::resize_file(DatabasePath(), 50);
    Reopen();
    ExpectRefused(orva::kErrDatabaseCorrupt, "malformed");
}

TEST_F(DatabaseTest, ADatabaseOfANewerVersionIsLeftAlone) {
    TaskStore::Current()->Save(SampleTask("a"));
    TaskStore::Configure({});
    SQLite::Database(DatabasePath(), SQLite::OPEN_READWRITE).exec("PRAGMA user_version = 99");
    Reopen();
    ExpectRefused(orva::kErrDatabaseVersion,
                  "schema version 99 was written by a newer version of this program");
}

TEST_F(DatabaseTest, ADatabaseOfAnotherProgramIsLeftAlone) {
    MakeDirectory("/usr/orva/var");
    SQLite::Database(DatabasePath(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE)
        .exec("CREATE TABLE recipe (name TEXT)");
    ExpectRefused(orva::kErrDatabaseCorrupt, "is a database of another program");
    SQLite::Database(DatabasePath(), SQLite::OPEN_READWRITE).exec("PRAGMA user_version = 1");
    ExpectRefused(orva::kErrDatabaseCorrupt, "is a database of another program");
}

TEST_F(DatabaseTest, ADirectoryInPlaceOfTheFileIsReported) {
    MakeDirectory("/usr/orva/var/tasks.db");
    const Failed failed = Listing();
    EXPECT_EQ(failed.code, orva::kErrDatabase);
    EXPECT_THAT(failed.log, HasSubstr("is no regular file"));
}

TEST_F(DatabaseTest, ACreationThatWasCutShortIsFinished) {
    Write("/usr/orva/var/tasks.db", "");
    EXPECT_EQ(Count(), 0U);
    EXPECT_EQ(TaskStore::Current()->Save(SampleTask("a")), 1);
}

TEST_F(DatabaseTest, ADatabaseLockedForLongerThanThePatienceIsBusyAndWorksAgainAfterwards) {
    TaskStore::Current()->Save(SampleTask("a"));
    Reopen(std::chrono::milliseconds(30));
    {
        SQLite::Database other(DatabasePath(), SQLite::OPEN_READWRITE);
        other.exec("BEGIN IMMEDIATE");
        const Failed failed = Saving();
        EXPECT_EQ(failed.code, orva::kErrDatabaseBusy);
        EXPECT_THAT(failed.log, HasSubstr(DatabasePath() + ": database is locked"));
        // Who only reads need not wait.
        EXPECT_EQ(Count(), 1U);
    }
    EXPECT_EQ(TaskStore::Current()->Save(SampleTask("b")), 2);
}

TEST_F(DatabaseTest, WhoWaitsToWriteIsTheNextWhateverTheOtherProcessDoes) {
    TaskStore::Current()->Save(SampleTask("a"));
    orva::Database& mine = TaskStore::Current()->UsedDatabase();
    const std::unique_ptr<TaskStore> other = OtherProcess();
    for (int round = 0; round < 20; ++round) {
        const std::string name = "other " + std::to_string(round);
        std::jthread waiting;
        {
            orva::WriteTransaction first(mine);
            waiting = std::jthread([&other, &name] { other->Save(SampleTask(name)); });
            // The one that waits has the right to be the next from now on.
            ASSERT_TRUE(BecomesTrue([this] { return !CanLockDirectory(); }));
            first.Commit();
        }
        {
            orva::WriteTransaction second(mine);
            EXPECT_EQ(orva::ReadTask(*second, round + 2)->name, name);
        }
        waiting.join();
    }
}

TEST_F(DatabaseTest, AQueueThatDoesNotMoveForLongerThanThePatienceIsBusyAndWorksAgainAfterwards) {
    TaskStore::Current()->Save(SampleTask("a"));
    Reopen(std::chrono::milliseconds(30));
    Count();
    {
        const orva::FileDescriptor lock =
            orva::LockDatabaseDirectory(DatabasePath(), std::chrono::milliseconds(0));
        const Failed failed = Saving();
        EXPECT_EQ(failed.code, orva::kErrDatabaseBusy);
        EXPECT_THAT(failed.log, HasSubstr("changes by other processes take too long"));
        EXPECT_EQ(Count(), 1U);
    }
    EXPECT_EQ(TaskStore::Current()->Save(SampleTask("b")), 2);
}

TEST_F(DatabaseTest, WhoGaveUpWaitingKeepsNobodyElseFromWriting) {
    TaskStore::Current()->Save(SampleTask("a"));
    Reopen(std::chrono::milliseconds(30));
    {
        SQLite::Database holder(DatabasePath(), SQLite::OPEN_READWRITE);
        holder.exec("BEGIN IMMEDIATE");
        EXPECT_EQ(Saving().code, orva::kErrDatabaseBusy);
        EXPECT_TRUE(CanLockDirectory());
    }
    EXPECT_EQ(OtherProcess()->Save(SampleTask("b")), 2);
}

TEST_F(DatabaseTest, ADatabaseThatIsRemovedWhileInUseStartsEmpty) {
    TaskStore::Current()->Save(SampleTask("a"));
    EXPECT_EQ(Count(), 1U);
    std::filesystem::remove(DatabasePath());
    EXPECT_EQ(Count(), 0U);
    EXPECT_EQ(TaskStore::Current()->Save(SampleTask("b")), 1);
    EXPECT_EQ(TaskStore::Current()->Find(1)->name, "b");
    std::filesystem::remove_all(RootPath() + "/usr");
    EXPECT_EQ(TaskStore::Current()->Find(1), nullptr);
    EXPECT_EQ(TaskStore::Current()->Save(SampleTask("c")), 1);
}

TEST_F(DatabaseTest, ADatabaseThatIsReplacedWhileInUseIsReadFromThenOn) {
    MakeDirectory("/backup/usr/orva/var");
    {
        TaskStore backup(RootPath() + "/backup/usr/orva/var/tasks.db",
                         {std::chrono::seconds(5), {}});
        backup.SaveAll({SampleTask("saved 1"), SampleTask("saved 2")});
    }
    TaskStore& store = *TaskStore::Current();
    store.SaveAll({SampleTask("a"), SampleTask("b"), SampleTask("c")});
    store.Find(1);
    EXPECT_EQ(Count(), 3U);
    std::filesystem::rename(RootPath() + "/backup/usr/orva/var/tasks.db", DatabasePath());
    EXPECT_EQ(Count(), 2U);
    EXPECT_EQ(store.Find(2)->name, "saved 2");
    EXPECT_EQ(store.Save(SampleTask("new")), 3);
    // The log of the former file must not have been taken for that of the new one.
    TaskStore::Configure({});
    SQLite::Database database(DatabasePath());
    EXPECT_EQ(database.execAndGet("PRAGMA integrity_check").getString(), "ok");
    EXPECT_EQ(database.execAndGet("SELECT group_concat(name) FROM task").getString(),
              "saved 1,saved 2,new");
}

TEST_F(DatabaseTest, ADatabaseThatAppearsAfterAFailureIsUsed) {
    Write("/usr/orva/var", "a file where the directory should be");
    EXPECT_EQ(Listing().code, orva::kErrDatabase);
    std::filesystem::remove(RootPath() + "/usr/orva/var");
    EXPECT_EQ(Count(), 0U);
}

TEST_F(DatabaseTest, ADamageThatIsRepairedIsForgotten) {
    TaskStore::Current()->Save(SampleTask("a"));
    TaskStore::Configure({});
    const std::string good = Read("/usr/orva/var/tasks.db");
    Write("/usr/orva/var/tasks.db", std::string(4096, 'x'));
    Reopen();
    EXPECT_EQ(Listing().code, orva::kErrDatabaseCorrupt);
    Write("/usr/orva/var/tasks.db", good);
    EXPECT_EQ(Count(), 1U);
}

}  // namespace
