#include "appliance/store/Schema.h"

#include <array>
#include <cstdint>
#include <string>

#include "appliance/store/StoreFailure.h"

namespace orva {
namespace {

// Tells a task store from the other databases of the world: "ORVA" in ASCII.
constexpr std::int64_t kApplicationId = 0x4F525641;

// One script per version; the script at index n leads from version n to n + 1. What was released
// is never edited: a change of the schema is one more script.
constexpr std::array kMigrations = {
    R"sql(
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
        -- Seconds since 1970 UTC; null when the task will not start by itself.
        next_start INTEGER
    );
    CREATE INDEX task_due ON task(next_start) WHERE next_start IS NOT NULL;

    -- Which task changed or went, in order: whoever keeps tasks in memory reads on from the last
    -- number it has seen. Old rows are cut off; the newest is kept, so that no number comes twice.
    CREATE TABLE task_change (
        number INTEGER PRIMARY KEY,
        task INTEGER NOT NULL
    );

    -- Runs that were asked for. A start by the schedule is known by its task and its instant: the
    -- constraint is what keeps one from happening twice.
    CREATE TABLE run (
        id INTEGER PRIMARY KEY AUTOINCREMENT,
        task INTEGER NOT NULL,
        occurrence INTEGER,          -- seconds since 1970 UTC; null when asked for by hand
        reason TEXT NOT NULL,        -- 'hand', 'schedule', 'missed'
        state TEXT NOT NULL,         -- 'queued', ...
        queued_at INTEGER NOT NULL,  -- seconds since 1970 UTC
        asked_program TEXT NOT NULL,
        asked_account TEXT NOT NULL,
        UNIQUE (task, occurrence)
    );
    CREATE INDEX run_queued ON run(id) WHERE state = 'queued';
    )sql",
    R"sql(
    -- From a queue to a history. Instants are kept in milliseconds since 1970 UTC from here on, all
    -- but `occurrence`, which the schedule gives in seconds.
    -- States are 'queued', 'running', 'ended', 'skipped' and 'lost'.
    ALTER TABLE run ADD COLUMN task_name TEXT NOT NULL DEFAULT '';
    ALTER TABLE run ADD COLUMN why TEXT NOT NULL DEFAULT '';
    ALTER TABLE run ADD COLUMN started_at INTEGER;
    ALTER TABLE run ADD COLUMN ended_at INTEGER;
    ALTER TABLE run ADD COLUMN exit_status INTEGER;
    ALTER TABLE run ADD COLUMN signal INTEGER;
    ALTER TABLE run ADD COLUMN output_bytes INTEGER NOT NULL DEFAULT 0;
    -- The process that supervises the run: the machine's boot, the process id and, in clock ticks
    -- since that boot, its start. Together they name one process for ever.
    ALTER TABLE run ADD COLUMN boot_id TEXT NOT NULL DEFAULT '';
    ALTER TABLE run ADD COLUMN pid INTEGER;
    ALTER TABLE run ADD COLUMN pid_start INTEGER;
    UPDATE run SET queued_at = queued_at * 1000,
        task_name = coalesce((SELECT name FROM task WHERE task.id = run.task), '');
    CREATE INDEX run_of_task ON run(task, id);
    -- Finds what waits and what goes on, and counts what ended.
    CREATE INDEX run_in_state ON run(state, id);
    DROP INDEX run_queued;

    -- What a run printed: its first and last part, and how many bytes between them are gone. Apart
    -- from the runs, so that a list of those reads no output.
    CREATE TABLE run_output (
        run INTEGER PRIMARY KEY,
        head BLOB NOT NULL,
        tail BLOB NOT NULL,
        dropped INTEGER NOT NULL
    );

    -- One row, whose number grows with every change of a run.
    CREATE TABLE run_revision (number INTEGER NOT NULL);
    INSERT INTO run_revision VALUES (0);
    CREATE TRIGGER run_added AFTER INSERT ON run BEGIN
        UPDATE run_revision SET number = number + 1;
    END;
    CREATE TRIGGER run_changed AFTER UPDATE ON run BEGIN
        UPDATE run_revision SET number = number + 1;
    END;
    CREATE TRIGGER run_gone AFTER DELETE ON run BEGIN
        UPDATE run_revision SET number = number + 1;
        DELETE FROM run_output WHERE run = OLD.id;
    END;
    )sql",
    R"sql(
    -- The starts by the schedule that have been put on record. Apart from the runs, of which only
    -- the last ones of a task are kept: a clock that is put back brings an instant again whose run
    -- is long gone.
    CREATE TABLE recorded_start (
        task INTEGER NOT NULL,
        occurrence INTEGER NOT NULL,
        PRIMARY KEY (task, occurrence)
    ) WITHOUT ROWID;
    INSERT INTO recorded_start SELECT task, occurrence FROM run
        WHERE occurrence IS NOT NULL AND task IN (SELECT id FROM task);
    )sql",
    R"sql(
    -- Since when the task has had its schedule, or has been enabled: seconds since 1970 UTC, 0 for
    -- what it was created with. The schedule says nothing about starts before that.
    ALTER TABLE task ADD COLUMN schedule_since INTEGER NOT NULL DEFAULT 0;

    -- Of the last time that the clock was set: the newest run and what was set. The instants of
    -- runs up to that one may come from a clock that was wrong. One row at most.
    CREATE TABLE clock_set (
        run INTEGER NOT NULL,
        at INTEGER NOT NULL
    );
    )sql",
};

constexpr std::int64_t kVersion = static_cast<std::int64_t>(kMigrations.size());

std::int64_t ReadNumber(Connection& connection, const char* sql) {
    Query query = connection.Prepare(sql);
    query->executeStep();
    return query->getColumn(0).getInt64();
}

std::int64_t ReadVersion(Connection& connection) {
    const std::int64_t version = ReadNumber(connection, "PRAGMA user_version");
    if (version > kVersion) {
        throw StoreFailure(
            kErrDatabaseVersion,
            "schema version " + std::to_string(version) +
                " was written by a newer version of this program, which knows up to " +
                std::to_string(kVersion));
    }
    const bool ours = ReadNumber(connection, "PRAGMA application_id") == kApplicationId;
    const bool empty = ReadNumber(connection, "SELECT count(*) FROM sqlite_master") == 0;
    if (version < 0 || (!ours && !(version == 0 && empty))) {
        throw StoreFailure(kErrDatabaseCorrupt, "is a database of another program");
    }
    return version;
}

}  // namespace

bool IsSchemaCurrent(Connection& connection) { return ReadVersion(connection) == kVersion; }

void MigrateSchema(Connection& connection) {
    Transaction transaction(connection);
    // Another process may have done it while this one waited for the lock.
    std::int64_t version = ReadVersion(connection);
    if (version < kVersion) {
        for (; version < kVersion; ++version) {
            connection.Execute(kMigrations.at(static_cast<std::size_t>(version)));
        }
        connection.Execute("PRAGMA application_id = " + std::to_string(kApplicationId));
        connection.Execute("PRAGMA user_version = " + std::to_string(kVersion));
    }
    transaction.Commit();
}

}  // namespace orva
