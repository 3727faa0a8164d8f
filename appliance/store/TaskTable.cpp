#include "appliance/store/TaskTable.h"

#include <absl/time/civil_time.h>

#include <algorithm>
#include <limits>
#include <memory>

#include "appliance/store/StoreFailure.h"

namespace orva {
namespace {

// How many changes are kept for those who read on.
constexpr std::int64_t kChangesKept = 10000;
// Old ones are cut off once in so many changes: doing it each time would dirty one page more.
constexpr std::int64_t kChangesPerCut = 256;

// The order of the columns in every statement below.
enum Column : int {
    kId,
    kFlags,
    kName,
    kOwner,
    kApp,
    kAppName,
    kAppArgs,
    kAction,
    kCommand,
    kEditForm,
    kMode,
    kRepeat,
    kWeekDays,
    kDate,
    kFirstMinute,
    kIntervalMinutes,
    kLastMinute,
    kRunMissed,
    kNextStart,
    kScheduleSince,
};

constexpr const char* kSelectOne =
    "SELECT id, flags, name, owner, app, app_name, app_args, action, command, edit_form, mode, "
    "repeat, week_days, date, first_minute, interval_minutes, last_minute, run_missed "
    "FROM task WHERE id = ?";
constexpr const char* kSelectAll =
    "SELECT id, flags, name, owner, app, app_name, app_args, action, command, edit_form, mode, "
    "repeat, week_days, date, first_minute, interval_minutes, last_minute, run_missed "
    "FROM task ORDER BY id";
constexpr const char* kInsert =
    "INSERT INTO task (id, flags, name, owner, app, app_name, app_args, action, command, "
    "edit_form, "
    "mode, repeat, week_days, date, first_minute, interval_minutes, last_minute, run_missed, "
    "next_start) VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)";
constexpr const char* kUpdate =
    "UPDATE task SET flags = ?2, name = ?3, owner = ?4, app = ?5, app_name = ?6, app_args = ?7, "
    "action = ?8, command = ?9, edit_form = ?10, mode = ?11, repeat = ?12, week_days = ?13, "
    "date = ?14, first_minute = ?15, interval_minutes = ?16, last_minute = ?17, run_missed = ?18, "
    // Of the flags kEnabled alone.
    "schedule_since = CASE WHEN (flags & 1, mode, repeat, week_days, date, first_minute, "
    "interval_minutes, last_minute, run_missed) IS (?2 & 1, ?11, ?12, ?13, ?14, ?15, ?16, ?17, "
    "?18) THEN schedule_since ELSE ?19 END WHERE id = ?1";
// Apart from the rest of an update: whatever the column is set to, SQLite writes a page of its
// index anew, and most changes leave it as it is.
constexpr const char* kMoveStart =
    "UPDATE task SET next_start = ?2 WHERE id = ?1 AND next_start IS NOT ?2 "
    "AND (next_start IS NULL OR next_start > ?3)";
constexpr const char* kSelectDue =
    "SELECT id, flags, name, owner, app, app_name, app_args, action, command, edit_form, mode, "
    "repeat, week_days, date, first_minute, interval_minutes, last_minute, run_missed, next_start, "
    "schedule_since FROM task WHERE next_start <= ? ORDER BY next_start, id LIMIT ?";
constexpr const char* kSelectAfter =
    "SELECT id, flags, name, owner, app, app_name, app_args, action, command, edit_form, mode, "
    "repeat, week_days, date, first_minute, interval_minutes, last_minute, run_missed, next_start, "
    "schedule_since FROM task WHERE id > ? ORDER BY id LIMIT ?";

std::string TextOf(SQLite::Statement& row, int column) {
    // Not as a C string: a text may hold any byte.
    const SQLite::Column value = row.getColumn(column);
    const char* bytes = value.getText();
    return {bytes, static_cast<std::size_t>(value.getBytes())};
}

int IntegerIn(SQLite::Statement& row, int column, int low, int high) {
    const std::int64_t value = row.getColumn(column).getInt64();
    if (value < low || value > high) {
        throw StoreFailure(kErrDatabaseCorrupt, "task " + TextOf(row, kId) + ": column " +
                                                    row.getColumnName(column) + " holds " +
                                                    std::to_string(value));
    }
    return static_cast<int>(value);
}

Schedule ScheduleOf(SQLite::Statement& row) {
    constexpr int kLastMinuteOfDay = Schedule::kMinutesPerDay - 1;
    Schedule schedule;
    schedule.mode = static_cast<Schedule::Mode>(
        IntegerIn(row, kMode, 0, static_cast<int>(Schedule::Mode::kDate)));
    schedule.repeat = static_cast<Schedule::Repeat>(
        IntegerIn(row, kRepeat, 0, static_cast<int>(Schedule::Repeat::kYearly)));
    schedule.weekDays =
        static_cast<std::uint8_t>(IntegerIn(row, kWeekDays, 0, Schedule::kAllWeekDays));
    if (!row.getColumn(kDate).isNull()) {
        absl::CivilDay date;
        if (!absl::ParseCivilTime(row.getColumn(kDate).getText(), &date)) {
            throw StoreFailure(kErrDatabaseCorrupt,
                               "task " + TextOf(row, kId) + ": column date is no date");
        }
        schedule.date = date;
    }
    schedule.firstMinute = IntegerIn(row, kFirstMinute, 0, kLastMinuteOfDay);
    schedule.intervalMinutes = IntegerIn(row, kIntervalMinutes, 0, kLastMinuteOfDay);
    schedule.lastMinute = IntegerIn(row, kLastMinute, 0, kLastMinuteOfDay);
    schedule.runMissed = IntegerIn(row, kRunMissed, 0, 1) != 0;
    return schedule;
}

TaskData TaskOf(SQLite::Statement& row) {
    TaskData task;
    task.id = IntegerIn(row, kId, 1, std::numeric_limits<int>::max());
    task.flags = static_cast<std::uint16_t>(
        IntegerIn(row, kFlags, 0, std::numeric_limits<std::uint16_t>::max()));
    task.name = TextOf(row, kName);
    task.owner = TextOf(row, kOwner);
    task.app = TextOf(row, kApp);
    task.appName = TextOf(row, kAppName);
    task.appArgs = TextOf(row, kAppArgs);
    task.action = TextOf(row, kAction);
    task.command = TextOf(row, kCommand);
    task.editForm = TextOf(row, kEditForm);
    task.schedule = ScheduleOf(row);
    return task;
}

// Parameters are numbered from 1, columns from 0.
constexpr int Parameter(Column column) { return column + 1; }

void BindStart(SQLite::Statement& statement, int parameter, StartSecond start) {
    if (start == kNoStart) {
        statement.bind(parameter);
    } else {
        statement.bind(parameter, start);
    }
}

// `task` must live until the statement has run.
void BindTask(SQLite::Statement& statement, const TaskData& task) {
    const Schedule& schedule = task.schedule;
    if (task.id == kNewTaskId) {
        statement.bind(Parameter(kId));
    } else {
        statement.bind(Parameter(kId), task.id);
    }
    statement.bind(Parameter(kFlags), static_cast<int>(task.flags));
    statement.bindNoCopy(Parameter(kName), task.name);
    statement.bindNoCopy(Parameter(kOwner), task.owner);
    statement.bindNoCopy(Parameter(kApp), task.app);
    statement.bindNoCopy(Parameter(kAppName), task.appName);
    statement.bindNoCopy(Parameter(kAppArgs), task.appArgs);
    statement.bindNoCopy(Parameter(kAction), task.action);
    statement.bindNoCopy(Parameter(kCommand), task.command);
    statement.bindNoCopy(Parameter(kEditForm), task.editForm);
    statement.bind(Parameter(kMode), static_cast<int>(schedule.mode));
    statement.bind(Parameter(kRepeat), static_cast<int>(schedule.repeat));
    statement.bind(Parameter(kWeekDays), static_cast<int>(schedule.weekDays));
    if (schedule.date) {
        statement.bind(Parameter(kDate), absl::FormatCivilTime(*schedule.date));
    } else {
        statement.bind(Parameter(kDate));
    }
    statement.bind(Parameter(kFirstMinute), schedule.firstMinute);
    statement.bind(Parameter(kIntervalMinutes), schedule.intervalMinutes);
    statement.bind(Parameter(kLastMinute), schedule.lastMinute);
    statement.bind(Parameter(kRunMissed), schedule.runMissed ? 1 : 0);
}

// In a damaged row it may be no number: that sorts behind all numbers and comes never.
StartSecond StartOf(const SQLite::Column& column) {
    return column.isInteger() || column.isFloat() ? column.getInt64() : kNoStart;
}

StoredStarts StoredStartsOf(SQLite::Statement& rows) {
    StoredStarts starts;
    while (rows.executeStep()) {
        ++starts.read;
        starts.last = rows.getColumn(kId).getInt64();
        const SQLite::Column start = rows.getColumn(kNextStart);
        try {
            starts.tasks.push_back(
                {TaskOf(rows), StartOf(start), rows.getColumn(kScheduleSince).getInt64()});
        } catch (const StoreFailure& failure) {
            if (!start.isNull()) {
                starts.damaged.push_back({starts.last, failure.what()});
            }
        }
    }
    return starts;
}

std::int64_t ReadNumber(Connection& connection, const char* sql) {
    Query query = connection.Prepare(sql);
    return query->executeStep() ? query->getColumn(0).getInt64() : 0;
}

void RecordChange(Connection& connection, int task) {
    {
        Query query = connection.Prepare("INSERT INTO task_change (task) VALUES (?)");
        query->bind(1, task);
        query->exec();
    }
    const std::int64_t number = connection.LastInsertId();
    if (number % kChangesPerCut == 0) {
        Query query = connection.Prepare("DELETE FROM task_change WHERE number <= ?");
        query->bind(1, number - kChangesKept);
        query->exec();
    }
}

}  // namespace

std::optional<TaskData> ReadTask(Connection& connection, int id) {
    Query query = connection.Prepare(kSelectOne);
    query->bind(1, id);
    if (!query->executeStep()) {
        return std::nullopt;
    }
    return TaskOf(*query);
}

std::vector<SharedTask> ReadAllTasks(Connection& connection, std::vector<DamagedTask>& damaged) {
    std::vector<SharedTask> tasks;
    Query query = connection.Prepare(kSelectAll);
    while (query->executeStep()) {
        try {
            tasks.push_back(std::make_shared<const TaskData>(TaskOf(*query)));
        } catch (const StoreFailure& failure) {
            damaged.push_back({query->getColumn(kId).getInt64(), failure.what()});
        }
    }
    return tasks;
}

int InsertTask(Connection& connection, const TaskData& task, StartSecond nextStart) {
    {
        Query query = connection.Prepare(kInsert);
        BindTask(*query, task);
        BindStart(*query, Parameter(kNextStart), nextStart);
        query->exec();
    }
    const std::int64_t id = connection.LastInsertId();
    if (id > std::numeric_limits<int>::max()) {
        throw StoreFailure(kErrDatabaseFull, "all task ids have been used");
    }
    RecordChange(connection, static_cast<int>(id));
    return static_cast<int>(id);
}

bool UpdateTask(Connection& connection, const TaskData& task, std::optional<StartSecond> nextStart,
                absl::Time now) {
    {
        Query query = connection.Prepare(kUpdate);
        BindTask(*query, task);
        query->bind(Parameter(kRunMissed) + 1, absl::ToUnixSeconds(now));
        if (query->exec() == 0) {
            return false;
        }
    }
    if (nextStart) {
        Query query = connection.Prepare(kMoveStart);
        query->bind(1, task.id);
        BindStart(*query, 2, *nextStart);
        query->bind(3, absl::ToUnixSeconds(now));
        query->exec();
    }
    RecordChange(connection, task.id);
    return true;
}

bool RemoveTask(Connection& connection, int id) {
    {
        Query query = connection.Prepare("DELETE FROM task WHERE id = ?");
        query->bind(1, id);
        if (query->exec() == 0) {
            return false;
        }
    }
    {
        Query query = connection.Prepare(
            "UPDATE run SET state = 'skipped', why = 'deleted' "
            "WHERE task = ? AND state = 'queued'");
        query->bind(1, id);
        query->exec();
    }
    {
        Query query = connection.Prepare("DELETE FROM recorded_start WHERE task = ?");
        query->bind(1, id);
        query->exec();
    }
    RecordChange(connection, id);
    return true;
}

std::int64_t HighestTaskId(Connection& connection) {
    return ReadNumber(connection, "SELECT seq FROM sqlite_sequence WHERE name = 'task'");
}

std::int64_t NewestChange(Connection& connection) {
    return ReadNumber(connection, "SELECT max(number) FROM task_change");
}

std::optional<std::vector<int>> TasksChangedAfter(Connection& connection, std::int64_t after,
                                                  std::int64_t most) {
    const std::int64_t oldest = ReadNumber(connection, "SELECT min(number) FROM task_change");
    const std::int64_t newest = NewestChange(connection);
    if (oldest > after + 1 || newest < after || newest - after > most) {
        return std::nullopt;
    }
    Query query =
        connection.Prepare("SELECT DISTINCT task FROM task_change WHERE number > ? ORDER BY task");
    query->bind(1, after);
    std::vector<int> tasks;
    while (query->executeStep()) {
        tasks.push_back(query->getColumn(0).getInt());
    }
    return tasks;
}

StoredStarts ReadDueTasks(Connection& connection, absl::Time now, int most) {
    Query query = connection.Prepare(kSelectDue);
    query->bind(1, absl::ToUnixSeconds(now));
    query->bind(2, most);
    return StoredStartsOf(*query);
}

StoredStarts ReadTasksAfter(Connection& connection, std::int64_t after, int most) {
    Query query = connection.Prepare(kSelectAfter);
    query->bind(1, after);
    query->bind(2, most);
    return StoredStartsOf(*query);
}

StartSecond EarliestStart(Connection& connection) {
    Query query = connection.Prepare(
        "SELECT next_start FROM task WHERE next_start IS NOT NULL ORDER BY next_start LIMIT 1");
    return query->executeStep() ? StartOf(query->getColumn(0)) : kNoStart;
}

void SetNextStart(Connection& connection, std::int64_t id, StartSecond start) {
    Query query = connection.Prepare("UPDATE task SET next_start = ?2 WHERE id = ?1");
    query->bind(1, id);
    BindStart(*query, 2, start);
    query->exec();
}

bool QueueRun(Connection& connection, int task, absl::Time now, const std::string& program,
              const std::string& account) {
    Query query = connection.Prepare(
        "INSERT INTO run (task, task_name, reason, state, queued_at, asked_program, asked_account) "
        "SELECT id, name, 'hand', 'queued', ?2, ?3, ?4 FROM task WHERE id = ?1");
    query->bind(1, task);
    query->bind(2, absl::ToUnixMillis(now));
    query->bind(3, program);
    query->bind(4, account);
    return query->exec() > 0;
}

}  // namespace orva
