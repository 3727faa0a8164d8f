#include "appliance/store/Database.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "appliance/root/Root.h"
#include "appliance/store/DatabaseFile.h"
#include "appliance/store/StoreFailure.h"
#include "appliance/store/TaskTable.h"
#include "platform/qlibc.h"
#include "tests/appliance/store/StoreTest.h"

namespace {

using orva::TaskStore;
using testing::HasSubstr;

class DatabaseTest : public StoreTest {
  protected:
    static std::size_t Count() { return TaskStore::Current()->CurrentSnapshot()->Count(); }

    // What an operation on the store fails with, and the one line that it logs.
    struct Failed {
        int code = 0;
        std::string log;
    };
    static Failed Saving() {
        return Trying([] { TaskStore::Current()->Save(SampleTask("x")); });
    }
    static Failed Listing() {
        return Trying([] { TaskStore::Current()->CurrentSnapshot(); });
    }
    template <class Operation>
    static Failed Trying(Operation operation) {
        TakeLog();
        Failed failed;
        try {
            operation();
        } catch (const orva::StoreFailure& failure) {
            failed.code = failure.Code();
        }
        const std::vector<std::string> log = TakeLog();
        failed.log = log.size() == 1 ? log[0] : std::to_string(log.size()) + " log lines";
        return failed;
    }

    // Whether nobody sets the database up or waits for his turn to write.
    bool CanLockDirectory() const {
        try {
            return orva::LockDatabaseDirectory(DatabasePath(), std::chrono::milliseconds(0))
                .IsOpen();
        } catch (const orva::StoreFailure&) {
            return false;
        }
    }

    template <class Condition>
    static bool BecomesTrue(Condition condition) {
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(60);
        while (!condition()) {
            if (std::chrono::steady_clock::now() > deadline) {
                return false;
            }
            std::this_thread::yield();
        }
        return true;
    }

    // Both kinds of use fail in the same way, and the file keeps its bytes.
    void ExpectRefused(int code, const std::string& reason) const {
        const std::string before = Read("/usr/orva/var/tasks.db");
        for (const Failed& failed : {Listing(), Saving()}) {
            EXPECT_EQ(failed.code, code);
            EXPECT_THAT(failed.log, HasSubstr("task store " + DatabasePath() + ": "));
            EXPECT_THAT(failed.log, HasSubstr(reason));
        }
        EXPECT_EQ(Read("/usr/orva/var/tasks.db"), before);
    }

    static int ModeOf(const std::string& path) {
        struct stat status {};
        return ::stat(path.c_str(), &status) == 0 ? static_cast<int>(status.st_mode & 07777) : -1;
    }
};

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

TEST_F(DatabaseTest, AReadOnlyFileSystemIsReportedAsThat) {
    TaskStore::Current()->Save(SampleTask("a"));
    TaskStore::Configure({});
    EXPECT_EQ(
        InOwnMounts([this]() -> std::string {
            const std::string directory = RootPath() + "/usr/orva/var";
            // Root writes through mode bits, but not through a mount.
            if (::mount(directory.c_str(), directory.c_str(), nullptr, MS_BIND, nullptr) != 0 ||
                ::mount("none", directory.c_str(), nullptr, MS_BIND | MS_REMOUNT | MS_RDONLY,
                        nullptr) != 0) {
                return "cannot mount";
            }
            const Failed failed = Saving();
            if (failed.code != orva::kErrDatabaseFull) {
                return "code " + std::to_string(failed.code);
            }
            const std::string expected =
                "task store " + DatabasePath() + ": cannot be written to: Read-only file system";
            return failed.log == expected ? "" : failed.log;
        }),
        "");
    EXPECT_EQ(Count(), 1U);
}

TEST_F(DatabaseTest, ADatabaseThatCannotBeCreatedOnAReadOnlyFileSystemSaysSo) {
    EXPECT_EQ(InOwnMounts([this]() -> std::string {
                  if (::mount("none", RootPath().c_str(), "tmpfs", MS_RDONLY, nullptr) != 0) {
                      return "cannot mount";
                  }
                  const Failed failed = Listing();
                  return failed.code == orva::kErrDatabaseFull ? "" : failed.log;
              }),
              "");
}

TEST_F(DatabaseTest, AFullDiskLosesNothingThatWasAcknowledged) {
    EXPECT_EQ(InOwnMounts([this]() -> std::string {
                  if (::mount("none", RootPath().c_str(), "tmpfs", 0, "size=2m") != 0) {
                      return "cannot mount";
                  }
                  orva::TaskData task = SampleTask("a");
                  task.appArgs = std::string(20000, 'x');
                  std::size_t saved = 0;
                  Failed failed;
                  while (failed.code == 0 && saved < 1000) {
                      failed = Trying([&task] { TaskStore::Current()->Save(task); });
                      saved += failed.code == 0 ? 1 : 0;
                  }
                  if (failed.code != orva::kErrDatabaseFull) {
                      return "code " + std::to_string(failed.code) + ": " + failed.log;
                  }
                  if (failed.log != "task store " + DatabasePath() + ": database or disk is full") {
                      return failed.log;
                  }
                  Reopen();
                  if (saved == 0 || Count() != saved) {
                      return "stored " + std::to_string(Count()) + " of " + std::to_string(saved);
                  }
                  TaskStore::Configure({});
                  SQLite::Database database(DatabasePath(), SQLite::OPEN_READWRITE);
                  return database.execAndGet("PRAGMA integrity_check").getString() == "ok"
                             ? ""
                             : "not intact";
              }),
              "");
}

TEST_F(DatabaseTest, AFullDiskFromTheStartIsReportedAsThat) {
    EXPECT_EQ(InOwnMounts([this]() -> std::string {
                  if (::mount("none", RootPath().c_str(), "tmpfs", 0, "size=64k") != 0) {
                      return "cannot mount";
                  }
                  std::ofstream filler(RootPath() + "/filler");
                  while (filler.put('x').flush()) {
                  }
                  const Failed failed = Listing();
                  return failed.code == orva::kErrDatabaseFull
                             ? ""
                             : std::to_string(failed.code) + " " + failed.log;
              }),
              "");
}

}  // namespace
