#include "tests/appliance/scheduler/SchedulerTest.h"

#include <SQLiteCpp/SQLiteCpp.h>

#include <algorithm>
#include <cerrno>
#include <chrono>

#include "tests/appliance/scheduler/Instants.h"

std::optional<std::string> FakeHost::Prepare(const orva::RunOrder& order) {
    if (onPrepare) {
        onPrepare();
    }
    if (!noRoom.empty()) {
        return noRoom;
    }
    folders.insert(order.run);
    prepared[order.run] = order;
    return std::nullopt;
}

std::optional<std::string> FakeHost::Start(std::int64_t run) {
    if (beforeStart) {
        beforeStart();
    }
    if (!refusal.empty()) {
        return refusal;
    }
    started.push_back(prepared.at(run));
    prepared.erase(run);
    goingOn.insert(run);
    return std::nullopt;
}

orva::RunHost::Trace FakeHost::Look(std::int64_t run) {
    const Trace trace = goingOn.count(run) != 0    ? Trace::kGoesOn
                        : prepared.count(run) != 0 ? Trace::kNotBegun
                                                   : Trace::kOver;
    if (onLook) {
        onLook(run);
    }
    return trace;
}

std::optional<orva::RunRemains> FakeHost::Remains(std::int64_t run) const {
    if (unreadable) {
        errno = EMFILE;
        return std::nullopt;
    }
    orva::RunRemains remains;
    if (const auto ending = endings.find(run); ending != endings.end()) {
        remains.ending = ending->second;
    }
    if (const auto output = outputs.find(run); output != outputs.end()) {
        remains.output = output->second;
    }
    return remains;
}

void FakeHost::Remove(std::int64_t run) {
    folders.erase(run);
    prepared.erase(run);
    goingOn.erase(run);
}

std::vector<std::int64_t> FakeHost::All() const { return {folders.begin(), folders.end()}; }

SchedulerTest::SchedulerTest() {
    options.mostRuns = 64;
    RestartAndRecover();
}

void SchedulerTest::Restart() {
    Reopen();
    scheduler = std::make_unique<orva::Scheduler>(*orva::TaskStore::Current(), host, options);
}

void SchedulerTest::RestartAndRecover() {
    Restart();
    scheduler->Recover();
}

absl::Time SchedulerTest::Work() {
    constexpr int kPlenty = 1000;
    absl::Time next = absl::InfinitePast();
    for (int count = 0; next == absl::InfinitePast(); ++count) {
        if (count == kPlenty) {
            ADD_FAILURE() << "there is no end of work";
            break;
        }
        next = scheduler->Work();
    }
    return next;
}

int SchedulerTest::AddTask(const std::string& name, int hour, int minute, std::uint16_t moreFlags) {
    orva::TaskData task = SampleTask(name);
    task.command = name;
    task.flags = static_cast<std::uint16_t>(task.flags | moreFlags);
    task.schedule.firstMinute = hour * 60 + minute;
    return AddTask(std::move(task));
}

int SchedulerTest::AddTask(orva::TaskData task) { return orva::TaskStore::Current()->Save(task); }

orva::TaskData SchedulerTest::Stored(int id) const { return *orva::TaskStore::Current()->Find(id); }

void SchedulerTest::End(std::int64_t run, int status) {
    orva::RunEnding ending;
    ending.started =
        orva::RunTime(std::chrono::seconds(absl::ToUnixSeconds(Utc("2026-05-01 12:00:01"))));
    ending.ended =
        orva::RunTime(std::chrono::seconds(absl::ToUnixSeconds(Utc("2026-05-01 12:00:02"))));
    ending.exitStatus = status;
    host.endings[run] = ending;
    host.goingOn.erase(run);
    scheduler->RunEnded(run);
}

std::vector<std::string> SchedulerTest::History() const {
    std::vector<orva::Run> runs = orva::RunStore::Current()->List({}, 0, 100'000).runs;
    std::reverse(runs.begin(), runs.end());
    std::vector<std::string> lines;
    for (const orva::Run& run : runs) {
        lines.push_back(
            run.taskName + " " +
            (run.occurrence ? absl::FormatTime("%m-%d %H:%M", *run.occurrence, absl::UTCTimeZone())
                            : "-") +
            " " + std::string(RunReasonText(run.reason)) + " " +
            std::string(RunStateText(run.state)) + " " + (run.why.empty() ? "-" : run.why));
    }
    return lines;
}

std::vector<std::string> SchedulerTest::Started() const {
    std::vector<std::string> commands;
    for (const orva::RunOrder& order : host.started) {
        commands.push_back(order.command);
    }
    return commands;
}

std::string SchedulerTest::NextStart(int id) const {
    SQLite::Database database(DatabasePath());
    SQLite::Statement query(database, "SELECT next_start FROM task WHERE id = ?");
    query.bind(1, id);
    if (!query.executeStep() || query.getColumn(0).isNull()) {
        return "-";
    }
    return absl::FormatTime("%m-%d %H:%M", absl::FromUnixSeconds(query.getColumn(0).getInt64()),
                            absl::UTCTimeZone());
}

std::optional<orva::Run> SchedulerTest::Find(std::int64_t run) const {
    return orva::RunStore::Current()->Find(run);
}

void SchedulerTest::Execute(const std::string& sql) const {
    SQLite::Database database(DatabasePath(), SQLite::OPEN_READWRITE, 5000);
    database.exec(sql);
}
