#include "appliance/store/Schema.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "appliance/root/Root.h"
#include "appliance/store/TaskStore.h"
#include "tests/appliance/store/StoreTest.h"

namespace {

using orva::TaskStore;
using testing::ElementsAre;

// What the first released version wrote, to the letter: a change of the program must not reach
// here.
constexpr const char* kFirstVersion = R"sql(
    CREATE TABLE task (
        id INTEGER PRIMARY KEY AUTOINCREMENT,
        flags INTEGER NOT NULL,
        name TEXT NOT NULL,
        owner TEXT NOT NULL,
        app TEXT NOT NULL,
        app_name TEXT NOT NULL,
        app_args TEXT NOT NULL,
        action TEXT NOT NULL,
        command TEXT NOT NULL,
        edit_form TEXT NOT NULL,
        mode INTEGER NOT NULL,
        repeat INTEGER NOT NULL,
        week_days INTEGER NOT NULL,
        date TEXT,
        first_minute INTEGER NOT NULL,
        interval_minutes INTEGER NOT NULL,
        last_minute INTEGER NOT NULL,
        run_missed INTEGER NOT NULL,
        next_start INTEGER
    );
    CREATE INDEX task_due ON task(next_start) WHERE next_start IS NOT NULL;
    CREATE TABLE task_change (
        number INTEGER PRIMARY KEY,
        task INTEGER NOT NULL
    );
    CREATE TABLE run (
        id INTEGER PRIMARY KEY AUTOINCREMENT,
        task INTEGER NOT NULL,
        occurrence INTEGER,
        reason TEXT NOT NULL,
        state TEXT NOT NULL,
        queued_at INTEGER NOT NULL,
        asked_program TEXT NOT NULL,
        asked_account TEXT NOT NULL,
        UNIQUE (task, occurrence)
    );
    CREATE INDEX run_queued ON run(id) WHERE state = 'queued';
    PRAGMA application_id = 1330796097;
    PRAGMA user_version = 1;

    INSERT INTO task VALUES (3, 999, 'nightly', 'root', 'ORVA.ZUM.TaskScheduler.Script', '', '', '',
        'true', '', 0, 0, 127, NULL, 390, 0, 1439, 0, 1777703400);
    INSERT INTO task_change (task) VALUES (1), (3);
    INSERT INTO run (task, occurrence, reason, state, queued_at, asked_program, asked_account)
        VALUES (3, NULL, 'hand', 'queued', 1777636800, 'orva-webapid', 'root'),
               (8, 1777636800, 'schedule', 'queued', 1777636801, '', '');
    DELETE FROM run WHERE id = 2;
    INSERT INTO run (id, task, reason, state, queued_at, asked_program, asked_account)
        VALUES (5, 8, 'hand', 'queued', 1777636802, '', '');
)sql";

class SchemaTest : public StoreTest {
  protected:
    void WriteFirstVersion() const {
        MakeDirectory("/usr/orva/var");
        SQLite::Database(DatabasePath(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE)
            .exec(kFirstVersion);
    }

    std::vector<std::string> Rows(const std::string& sql) const {
        SQLite::Database database(DatabasePath());
        SQLite::Statement query(database, sql);
        std::vector<std::string> rows;
        while (query.executeStep()) {
            rows.push_back(query.getColumn(0).getString());
        }
        return rows;
    }
};

TEST_F(SchemaTest, AFileOfTheFirstVersionKeepsItsTasksAndQueuedRuns) {
    WriteFirstVersion();
    const orva::SharedTask task = TaskStore::Current()->Find(3);
    ASSERT_NE(task, nullptr);
    EXPECT_EQ(task->name, "nightly");
    EXPECT_THAT(Rows("PRAGMA user_version"), ElementsAre("4"));
    EXPECT_THAT(
        Rows("SELECT id || ' ' || task || ' ' || task_name || ' ' || reason || ' ' || state "
             "|| ' ' || queued_at || ' ' || asked_program FROM run ORDER BY id"),
        ElementsAre("1 3 nightly hand queued 1777636800000 orva-webapid",
                    "5 8  hand queued 1777636802000 "));
    EXPECT_THAT(Rows("PRAGMA integrity_check"), ElementsAre("ok"));
}

TEST_F(SchemaTest, StartsThatAnOlderFileHasOnRecordAreKnown) {
    WriteFirstVersion();
    SQLite::Database(DatabasePath(), SQLite::OPEN_READWRITE)
        .exec(
            "INSERT INTO run (task, occurrence, reason, state, queued_at, asked_program, "
            "asked_account) VALUES (3, 1777617000, 'schedule', 'queued', 1777617000, '', ''), "
            "(8, 1777617000, 'schedule', 'queued', 1777617000, '', '')");
    TaskStore::Current()->CurrentSnapshot();
    // Task 8 is gone.
    EXPECT_THAT(Rows("SELECT task || ' ' || occurrence FROM recorded_start"),
                ElementsAre("3 1777617000"));
}

TEST_F(SchemaTest, IdsOfTheFirstVersionAreNotGivenAgain) {
    WriteFirstVersion();
    EXPECT_EQ(TaskStore::Current()->Save(SampleTask("new")), 4);
    SQLite::Database database(DatabasePath(), SQLite::OPEN_READWRITE);
    database.exec("DELETE FROM run");
    database.exec(
        "INSERT INTO run (task, reason, state, queued_at, asked_program, asked_account) "
        "VALUES (3, 'hand', 'queued', 0, '', '')");
    EXPECT_EQ(database.getLastInsertRowid(), 6);
}

TEST_F(SchemaTest, AnOlderFileEndsWithTheSameSchemaAsANewOne) {
    const std::string layout =
        "SELECT type || ' ' || name || ' ' || (SELECT group_concat(name || ' ' || type || ' ' || "
        "\"notnull\") FROM pragma_table_info(sqlite_master.name)) FROM sqlite_master "
        "WHERE type = 'table' ORDER BY 1";
    const std::string others =
        "SELECT type || ' ' || sql FROM sqlite_master WHERE type <> 'table' AND sql IS NOT NULL "
        "ORDER BY 1";
    TaskStore::Current()->CurrentSnapshot();
    const std::vector<std::string> newLayout = Rows(layout);
    const std::vector<std::string> newOthers = Rows(others);
    ASSERT_FALSE(newOthers.empty());

    MakeDirectory("/older");
    orva::SetRoot(RootPath() + "/older");
    const std::string file = RootPath() + "/older/usr/orva/var/tasks.db";
    MakeDirectory("/older/usr/orva/var");
    SQLite::Database(file, SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE).exec(kFirstVersion);
    TaskStore::Current()->CurrentSnapshot();
    SQLite::Database older(file);
    const auto rows = [&older](const std::string& sql) {
        SQLite::Statement query(older, sql);
        std::vector<std::string> found;
        while (query.executeStep()) {
            found.push_back(query.getColumn(0).getString());
        }
        return found;
    };
    EXPECT_EQ(rows(layout), newLayout);
    EXPECT_EQ(rows(others), newOthers);
}

}  // namespace
