#include "appliance/runs/RunWriter.h"

#include <chrono>
#include <limits>

#include "appliance/store/TaskTable.h"

namespace orva {
namespace {

// A run's removal takes its output along, up to 128 KiB.
constexpr int kMostTrimmedAtOnce = 8;
// Ids grow with time: the newest instant is among the last ones, also when some of these were
// recorded by a clock that was wrong.
constexpr int kRecordsLookedAt = 1000;

std::int64_t MillisOf(RunTime time) {
    return std::chrono::duration_cast<std::chrono::milliseconds>(time.time_since_epoch()).count();
}

void BindText(Query& query, int parameter, std::string_view text) {
    query->bind(parameter, std::string(text));
}

void InsertOutput(Connection& connection, std::int64_t run, const StoredOutput& output) {
    if (output.bytes == 0) {
        return;
    }
    Query query = connection.Prepare(
        "INSERT OR REPLACE INTO run_output (run, head, tail, dropped) VALUES (?, ?, ?, ?)");
    query->bind(1, run);
    query->bindNoCopy(2, output.head.data(), static_cast<int>(output.head.size()));
    query->bindNoCopy(3, output.tail.data(), static_cast<int>(output.tail.size()));
    query->bind(4, static_cast<std::int64_t>(output.dropped));
    query->exec();
}

// False when it is on record already.
bool RecordStart(Connection& connection, int task, std::int64_t occurrence) {
    Query query = connection.Prepare(
        "INSERT INTO recorded_start (task, occurrence) VALUES (?, ?) ON CONFLICT DO NOTHING");
    query->bind(1, task);
    query->bind(2, occurrence);
    return query->exec() > 0;
}

// Whether the start was skipped: nothing has been started then. One that somebody has stopped stays
// that.
bool RemoveSkipped(Connection& connection, int task, std::int64_t occurrence) {
    Query query = connection.Prepare(
        "DELETE FROM run WHERE task = ? AND occurrence = ? AND state = 'skipped' AND why != ?");
    query->bind(1, task);
    query->bind(2, occurrence);
    query->bind(3, kWhyStopped);
    return query->exec() > 0;
}

// The oldest of them, if it is too old: one goes for each one that comes. So a clock that is wrong
// by years for a while does not wipe out what belongs to the right time.
void ForgetOldStart(Connection& connection, int task, std::int64_t newest) {
    std::int64_t oldest = 0;
    {
        Query query =
            connection.Prepare("SELECT min(occurrence) FROM recorded_start WHERE task = ?");
        query->bind(1, task);
        query->executeStep();
        oldest = query->getColumn(0).getInt64();
    }
    if (oldest >= newest - absl::ToInt64Seconds(kStartsKnownFor)) {
        return;
    }
    Query query = connection.Prepare(
        "DELETE FROM recorded_start WHERE task = ?1 AND occurrence = ?2 AND EXISTS "
        "(SELECT 1 FROM recorded_start WHERE task = ?1 LIMIT 1 OFFSET ?3)");
    query->bind(1, task);
    query->bind(2, oldest);
    query->bind(3, kStartsAlwaysKnown);
    query->exec();
}

}  // namespace

std::optional<std::int64_t> InsertRun(Connection& connection, const ScheduledRun& run,
                                      absl::Time now) {
    if (!RecordStart(connection, run.task, run.occurrence) &&
        !(run.why.empty() && RemoveSkipped(connection, run.task, run.occurrence))) {
        return std::nullopt;
    }
    ForgetOldStart(connection, run.task, run.occurrence);
    Query query = connection.Prepare(
        "INSERT INTO run (task, task_name, occurrence, reason, state, why, queued_at, "
        "asked_program, asked_account) VALUES (?, ?, ?, ?, ?, ?, ?, '', '') "
        "ON CONFLICT (task, occurrence) DO NOTHING");
    query->bind(1, run.task);
    query->bindNoCopy(2, run.taskName);
    query->bind(3, run.occurrence);
    BindText(query, 4, RunReasonText(run.reason));
    BindText(query, 5, RunStateText(run.why.empty() ? RunState::kQueued : RunState::kSkipped));
    BindText(query, 6, run.why);
    query->bind(7, absl::ToUnixMillis(now));
    if (query->exec() == 0) {
        return std::nullopt;
    }
    return connection.LastInsertId();
}

std::vector<QueuedRun> ReadQueuedRuns(Connection& connection, std::int64_t after, int most) {
    Query query = connection.Prepare(
        "SELECT id, task, coalesce(occurrence * 1000, queued_at), queued_at FROM run "
        "WHERE state = 'queued' AND id > ? ORDER BY id LIMIT ?");
    query->bind(1, after);
    query->bind(2, most);
    std::vector<QueuedRun> runs;
    while (query->executeStep()) {
        runs.push_back({query->getColumn(0).getInt64(), query->getColumn(1).getInt(),
                        absl::FromUnixMillis(query->getColumn(2).getInt64()),
                        absl::FromUnixMillis(query->getColumn(3).getInt64())});
    }
    return runs;
}

bool HasQueuedRun(Connection& connection, int task) {
    // A task has fewer runs than there may be in the queue.
    Query query =
        connection.Prepare("SELECT 1 FROM run WHERE task = ? AND +state = 'queued' LIMIT 1");
    query->bind(1, task);
    return query->executeStep();
}

std::optional<TaskOfRun> ReadTaskOfQueued(Connection& connection, std::int64_t run) {
    int id = 0;
    std::optional<RunReason> reason;
    {
        Query query =
            connection.Prepare("SELECT task, reason FROM run WHERE id = ? AND state = 'queued'");
        query->bind(1, run);
        if (!query->executeStep()) {
            return std::nullopt;
        }
        id = query->getColumn(0).getInt();
        reason = ParseRunReason(query->getColumn(1).getText());
    }
    std::optional<TaskData> task = ReadTask(connection, id);
    if (!task) {
        return std::nullopt;
    }
    return TaskOfRun{*std::move(task), reason};
}

std::vector<RunningRun> ReadRunningRuns(Connection& connection) {
    Query query = connection.Prepare(
        "SELECT run.id, run.task, coalesce(task.app, ''), run.boot_id FROM run "
        "LEFT JOIN task ON task.id = run.task WHERE run.state = 'running' ORDER BY run.id");
    std::vector<RunningRun> runs;
    while (query->executeStep()) {
        runs.push_back({query->getColumn(0).getInt64(), query->getColumn(1).getInt(),
                        query->getColumn(2).getString(), query->getColumn(3).getString()});
    }
    return runs;
}

void MarkRunning(Connection& connection, std::int64_t run, const std::string& bootId,
                 absl::Time now) {
    Query query = connection.Prepare(
        "UPDATE run SET state = 'running', started_at = ?2, boot_id = ?3 WHERE id = ?1");
    query->bind(1, run);
    query->bind(2, absl::ToUnixMillis(now));
    query->bindNoCopy(3, bootId);
    query->exec();
}

void MarkQueued(Connection& connection, std::int64_t run) {
    Query query = connection.Prepare(
        "UPDATE run SET state = 'queued', started_at = NULL, boot_id = '' WHERE id = ?");
    query->bind(1, run);
    query->exec();
}

bool MarkSkipped(Connection& connection, std::int64_t run, std::string_view why) {
    Query query = connection.Prepare(
        "UPDATE run SET state = 'skipped', why = ?2 WHERE id = ?1 AND state = 'queued'");
    query->bind(1, run);
    BindText(query, 2, why);
    return query->exec() > 0;
}

bool CancelQueued(Connection& connection, std::int64_t run) {
    return MarkSkipped(connection, run, kWhyStopped);
}

void MarkEnded(Connection& connection, std::int64_t run, const RunEnding& ending,
               const StoredOutput& output) {
    Query query = connection.Prepare(
        "UPDATE run SET state = 'ended', started_at = ?2, ended_at = ?3, exit_status = ?4, "
        "signal = ?5, why = ?6, output_bytes = ?7 "
        "WHERE id = ?1 AND state IN ('running', 'queued')");
    query->bind(1, run);
    query->bind(2);
    if (ending.started) {
        query->bind(2, MillisOf(*ending.started));
    }
    query->bind(3, MillisOf(ending.ended));
    query->bind(4);
    if (ending.exitStatus) {
        query->bind(4, *ending.exitStatus);
    }
    query->bind(5);
    if (ending.signal) {
        query->bind(5, *ending.signal);
    }
    query->bindNoCopy(6, ending.why);
    query->bind(7, static_cast<std::int64_t>(output.bytes));
    if (query->exec() > 0) {
        InsertOutput(connection, run, output);
    }
}

void MarkLost(Connection& connection, std::int64_t run, std::string_view why, absl::Time now,
              const StoredOutput& output) {
    Query query = connection.Prepare(
        "UPDATE run SET state = 'lost', why = ?2, ended_at = ?3, output_bytes = ?4 "
        "WHERE id = ?1 AND state = 'running'");
    query->bind(1, run);
    BindText(query, 2, why);
    query->bind(3, absl::ToUnixMillis(now));
    query->bind(4, static_cast<std::int64_t>(output.bytes));
    if (query->exec() > 0) {
        InsertOutput(connection, run, output);
    }
}

void RecordClockSet(Connection& connection, absl::Time now) {
    {
        Query query = connection.Prepare("DELETE FROM clock_set");
        query->exec();
    }
    Query query =
        connection.Prepare("INSERT INTO clock_set SELECT coalesce(max(id), 0), ? FROM run");
    query->bind(1, absl::ToUnixMillis(now));
    query->exec();
}

absl::Time NewestRecord(Connection& connection) {
    Query query = connection.Prepare(
        "SELECT max(at) FROM (SELECT at FROM clock_set UNION ALL SELECT * FROM "
        "(SELECT queued_at FROM run WHERE id > coalesce((SELECT run FROM clock_set), 0) "
        "ORDER BY id DESC LIMIT ?))");
    query->bind(1, kRecordsLookedAt);
    if (!query->executeStep() || query->getColumn(0).isNull()) {
        return absl::InfinitePast();
    }
    return absl::FromUnixMillis(query->getColumn(0).getInt64());
}

void TrimRunsOfTask(Connection& connection, int task) {
    std::int64_t newestSurplus = 0;
    {
        Query query = connection.Prepare(
            "SELECT id FROM run WHERE task = ? ORDER BY id DESC LIMIT 1 OFFSET ?");
        query->bind(1, task);
        query->bind(2, kRunsKeptOfTask);
        if (!query->executeStep()) {
            return;
        }
        newestSurplus = query->getColumn(0).getInt64();
    }
    Query query = connection.Prepare(
        "DELETE FROM run WHERE id IN (SELECT id FROM run WHERE task = ?1 AND id <= ?2 "
        "AND +state NOT IN ('queued', 'running') ORDER BY id LIMIT ?3)");
    query->bind(1, task);
    query->bind(2, newestSurplus);
    query->bind(3, kMostTrimmedAtOnce);
    query->exec();
}

std::optional<int> NextTaskWithRuns(Connection& connection, int after) {
    // What a damaged row has there may be no number, or none of a task: whoever goes on from what
    // that reads as would come by for ever.
    Query query = connection.Prepare(
        "SELECT task FROM run WHERE task > ? AND task <= ? ORDER BY task LIMIT 1");
    query->bind(1, after);
    query->bind(2, std::numeric_limits<int>::max());
    if (!query->executeStep()) {
        return std::nullopt;
    }
    return query->getColumn(0).getInt();
}

int RemoveOldRuns(Connection& connection, int task, absl::Time time, int most) {
    Query query = connection.Prepare(
        "DELETE FROM run WHERE id IN (SELECT id FROM run WHERE task = ?1 AND queued_at < ?2 "
        "AND +state NOT IN ('queued', 'running') ORDER BY id LIMIT ?3)");
    query->bind(1, task);
    query->bind(2, absl::ToUnixMillis(time));
    query->bind(3, most);
    return query->exec();
}

bool HasOldRuns(Connection& connection, int task, absl::Time time) {
    Query query = connection.Prepare(
        "SELECT 1 FROM run WHERE task = ?1 AND queued_at < ?2 "
        "AND +state NOT IN ('queued', 'running') ORDER BY id LIMIT 1");
    query->bind(1, task);
    query->bind(2, absl::ToUnixMillis(time));
    return query->executeStep();
}

}  // namespace orva
