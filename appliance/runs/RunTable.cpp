#include "appliance/runs/RunTable.h"

#include <limits>
#include <string>

#include "appliance/store/StoreFailure.h"
#include "appliance/store/TaskTable.h"

namespace orva {
namespace {

// The order of the columns in both statements below.
enum Column : int {
    kId,
    kTask,
    kTaskName,
    kOccurrence,
    kReason,
    kState,
    kWhy,
    kQueuedAt,
    kAskedProgram,
    kAskedAccount,
    kStartedAt,
    kEndedAt,
    kExitStatus,
    kSignal,
    kOutputBytes,
};

constexpr const char* kSelectOne =
    "SELECT id, task, task_name, occurrence, reason, state, why, queued_at, asked_program, "
    "asked_account, started_at, ended_at, exit_status, signal, output_bytes "
    "FROM run WHERE id = ?";
constexpr const char* kSelectLatest =
    "SELECT id, task, task_name, occurrence, reason, state, why, queued_at, asked_program, "
    "asked_account, started_at, ended_at, exit_status, signal, output_bytes "
    "FROM run WHERE id = coalesce("
    "(SELECT max(id) FROM run INDEXED BY run_in_state WHERE state = 'running' AND task = ?1), "
    "(SELECT max(id) FROM run WHERE task = ?1))";

std::string BytesOf(SQLite::Statement& row, int column) {
    const SQLite::Column value = row.getColumn(column);
    const void* bytes = value.getBlob();
    return bytes == nullptr ? std::string()
                            : std::string(static_cast<const char*>(bytes),
                                          static_cast<std::size_t>(value.getBytes()));
}

[[noreturn]] void ThrowCorrupt(SQLite::Statement& row, int column) {
    throw StoreFailure(kErrDatabaseCorrupt, "run " + BytesOf(row, kId) + ": column " +
                                                row.getColumnName(column) + " holds \"" +
                                                BytesOf(row, column) + "\"");
}

std::optional<int> IntegerOf(SQLite::Statement& row, int column) {
    if (row.getColumn(column).isNull()) {
        return std::nullopt;
    }
    const std::int64_t value = row.getColumn(column).getInt64();
    if (value < std::numeric_limits<int>::min() || value > std::numeric_limits<int>::max()) {
        ThrowCorrupt(row, column);
    }
    return static_cast<int>(value);
}

std::optional<absl::Time> InstantOf(SQLite::Statement& row, int column) {
    if (row.getColumn(column).isNull()) {
        return std::nullopt;
    }
    return absl::FromUnixMillis(row.getColumn(column).getInt64());
}

Run RunOf(SQLite::Statement& row) {
    const std::optional<int> task = IntegerOf(row, kTask);
    const std::optional<RunReason> reason = ParseRunReason(BytesOf(row, kReason));
    const std::optional<RunState> state = ParseRunState(BytesOf(row, kState));
    if (!task || *task < 1) {
        ThrowCorrupt(row, kTask);
    }
    if (!reason) {
        ThrowCorrupt(row, kReason);
    }
    if (!state) {
        ThrowCorrupt(row, kState);
    }
    Run run;
    run.id = row.getColumn(kId).getInt64();
    run.task = *task;
    run.taskName = BytesOf(row, kTaskName);
    if (!row.getColumn(kOccurrence).isNull()) {
        run.occurrence = absl::FromUnixSeconds(row.getColumn(kOccurrence).getInt64());
    }
    run.reason = *reason;
    run.state = *state;
    run.why = BytesOf(row, kWhy);
    run.queuedAt = absl::FromUnixMillis(row.getColumn(kQueuedAt).getInt64());
    run.askedProgram = BytesOf(row, kAskedProgram);
    run.askedAccount = BytesOf(row, kAskedAccount);
    run.startedAt = InstantOf(row, kStartedAt);
    run.endedAt = InstantOf(row, kEndedAt);
    run.exitStatus = IntegerOf(row, kExitStatus);
    run.signal = IntegerOf(row, kSignal);
    run.outputBytes = static_cast<std::uint64_t>(row.getColumn(kOutputBytes).getInt64());
    return run;
}

std::optional<Run> ReadOne(Query& query) {
    if (!query->executeStep()) {
        return std::nullopt;
    }
    return RunOf(*query);
}

std::int64_t ReadNumber(Query& query) {
    query->executeStep();
    return query->getColumn(0).getInt64();
}

// The statement for the filter, with its parameters bound from ?1 (the task) on. With both, the
// index of the task leaves fewer runs than that of the state; a plus keeps SQLite from the latter.
Query PrepareFor(Connection& connection, const RunStore::Filter& filter, const char* all,
                 const char* ofTask, const char* inState, const char* ofTaskInState) {
    const char* const sql =
        filter.task ? (filter.state ? ofTaskInState : ofTask) : (filter.state ? inState : all);
    return connection.Prepare(sql);
}

void BindFilter(Query& query, const RunStore::Filter& filter) {
    if (filter.task) {
        query->bind(1, *filter.task);
    }
    if (filter.state) {
        query->bind(2, std::string(RunStateText(*filter.state)));
    }
}

}  // namespace

std::optional<Run> ReadRun(Connection& connection, std::int64_t run) {
    Query query = connection.Prepare(kSelectOne);
    query->bind(1, run);
    return ReadOne(query);
}

std::vector<std::int64_t> ReadRunIds(Connection& connection, const RunStore::Filter& filter,
                                     std::int64_t offset, std::int64_t limit) {
    Query query = PrepareFor(
        connection, filter, "SELECT id FROM run ORDER BY id DESC LIMIT ?3 OFFSET ?4",
        "SELECT id FROM run WHERE task = ?1 ORDER BY id DESC LIMIT ?3 OFFSET ?4",
        "SELECT id FROM run WHERE state = ?2 ORDER BY id DESC LIMIT ?3 OFFSET ?4",
        "SELECT id FROM run WHERE task = ?1 AND +state = ?2 ORDER BY id DESC LIMIT ?3 OFFSET ?4");
    BindFilter(query, filter);
    query->bind(3, limit);
    query->bind(4, offset);
    std::vector<std::int64_t> ids;
    while (query->executeStep()) {
        ids.push_back(query->getColumn(0).getInt64());
    }
    return ids;
}

std::int64_t CountRuns(Connection& connection, const RunStore::Filter& filter) {
    Query query = PrepareFor(connection, filter, "SELECT count(*) FROM run",
                             "SELECT count(*) FROM run WHERE task = ?1",
                             "SELECT count(*) FROM run WHERE state = ?2",
                             "SELECT count(*) FROM run WHERE task = ?1 AND +state = ?2");
    BindFilter(query, filter);
    return ReadNumber(query);
}

std::optional<Run> ReadLatestRun(Connection& connection, int task) {
    Query query = connection.Prepare(kSelectLatest);
    query->bind(1, task);
    return ReadOne(query);
}

std::optional<RunOutput> ReadRunOutput(Connection& connection, std::int64_t run) {
    Query query = connection.Prepare("SELECT head, tail, dropped FROM run_output WHERE run = ?");
    query->bind(1, run);
    if (!query->executeStep()) {
        return std::nullopt;
    }
    RunOutput output;
    output.head = BytesOf(*query, 0);
    output.tail = BytesOf(*query, 1);
    output.dropped = static_cast<std::uint64_t>(query->getColumn(2).getInt64());
    return output;
}

std::int64_t ReadRevision(Connection& connection) {
    Query query = connection.Prepare("SELECT number FROM run_revision");
    return ReadNumber(query) + NewestChange(connection);
}

}  // namespace orva
