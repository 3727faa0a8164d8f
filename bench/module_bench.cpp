// The module's speed as its callers meet it: through the method table of the real shared object, on
// the real store. A row named "..._floor" measures what the row of that name cannot do without; the
// table at the end compares the two, each by its median.
//
// ORVA_BENCH_TASKS sets the number of stored tasks, 10000 by default.

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Statement.h>
#include <benchmark/benchmark.h>
#include <json/writer.h>

#include <algorithm>
#include <cstdlib>
#include <string>
#include <utility>

#include "appliance/webapi/ApiAnswer.h"
#include "appliance/webapi/JsonWriter.h"
#include "bench/FloorReporter.h"
#include "bench/ModuleBench.h"
#include "bench/RawTransaction.h"

namespace orva {
namespace {

constexpr const char* kPage = R"({"sort_by":"name","offset":4000,"limit":50})";

int TaskCount() {
    const char* text = std::getenv("ORVA_BENCH_TASKS");
    return text == nullptr ? 10'000 : std::max(1, static_cast<int>(std::strtol(text, nullptr, 10)));
}

const BenchAppliance& Appliance() {
    static const BenchAppliance appliance(TaskCount());
    return appliance;
}

void FrameOfARequest(benchmark::State& state) {
    const BenchAppliance& appliance = Appliance();
    const Json::Value parameters = Parameters(R"({"task":[]})");
    for (auto _ : state) {
        benchmark::DoNotOptimize(appliance.Call("delete", parameters));
    }
}
BENCHMARK(FrameOfARequest)->Unit(benchmark::kMicrosecond);

void PageOf50(benchmark::State& state) {
    const BenchAppliance& appliance = Appliance();
    const Json::Value parameters = Parameters(kPage);
    for (auto _ : state) {
        benchmark::DoNotOptimize(appliance.Call("list", parameters));
    }
}
BENCHMARK(PageOf50)->Unit(benchmark::kMicrosecond);

// Another connection stands for another process: the store sees both by the same sign.
void PageOf50AfterAnotherProcessWrote(benchmark::State& state) {
    const BenchAppliance& appliance = Appliance();
    const Json::Value parameters = Parameters(kPage);
    SQLite::Database other(appliance.Database().string(), SQLite::OPEN_READWRITE);
    other.exec("PRAGMA synchronous=OFF");
    SQLite::Statement change(other, "UPDATE task SET name = 'Task ' || ? WHERE id = ?");
    SQLite::Statement note(other,
                           "INSERT INTO task_change (number, task)"
                           " SELECT coalesce(max(number), 0) + 1, ? FROM task_change");
    int round = 0;
    for (auto _ : state) {
        state.PauseTiming();
        ++round;
        const int id = round % TaskCount() + 1;
        other.exec("BEGIN IMMEDIATE");
        change.bind(1, TaskCount() + round);
        change.bind(2, id);
        change.exec();
        change.reset();
        note.bind(1, id);
        note.exec();
        note.reset();
        other.exec("COMMIT");
        state.ResumeTiming();
        benchmark::DoNotOptimize(appliance.Call("list", parameters));
    }
}
BENCHMARK(PageOf50AfterAnotherProcessWrote)->Unit(benchmark::kMicrosecond);

void WholeListAndItsText(benchmark::State& state) {
    const BenchAppliance& appliance = Appliance();
    const Json::Value parameters = Parameters("{}");
    for (auto _ : state) {
        benchmark::DoNotOptimize(WriteAnswer(appliance.Call("list", parameters)));
    }
}
BENCHMARK(WholeListAndItsText)->Unit(benchmark::kMillisecond);

// The same document, built member by member and written by jsoncpp.
void WholeListAndItsText_floor(benchmark::State& state) {
    const Json::Value list = Appliance().Call("list", Parameters("{}")).GetDocument();
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    for (auto _ : state) {
        Json::Value answer(Json::objectValue);
        Json::Value& data = answer["data"];
        Json::Value& rows = data["tasks"] = Json::Value(Json::arrayValue);
        for (const Json::Value& row : list["tasks"]) {
            Json::Value copy(Json::objectValue);
            for (const char* name : {"enable", "can_run", "can_delete", "can_edit"}) {
                copy[name] = row[name].asBool();
            }
            copy["id"] = row["id"].asInt();
            for (const char* name : {"name", "type", "action", "next_trigger_time"}) {
                copy[name] = row[name].asCString();
            }
            rows.append(std::move(copy));
        }
        data["total"] = list["total"];
        answer["success"] = true;
        benchmark::DoNotOptimize(Json::writeString(builder, answer));
    }
}
BENCHMARK(WholeListAndItsText_floor)->Unit(benchmark::kMillisecond);

SQLite::Database& RawDatabase() {
    static SQLite::Database raw =
        CopyDatabase(Appliance().Database(), Appliance().Root() / "raw.db");
    return raw;
}

void SetEnable(benchmark::State& state) {
    const BenchAppliance& appliance = Appliance();
    Json::Value parameters = Parameters(R"({"status":[{"id":1,"enable":true}]})");
    int round = 0;
    for (auto _ : state) {
        Json::Value& status = parameters["status"][0];
        status["id"] = ++round % TaskCount() + 1;
        status["enable"] = round % 2 == 0;
        benchmark::DoNotOptimize(appliance.Call("set_enable", parameters));
    }
}
BENCHMARK(SetEnable)->Unit(benchmark::kMicrosecond)->UseRealTime();

void SetEnable_floor(benchmark::State& state) {
    RawTransaction transaction(
        RawDatabase(), {"UPDATE task SET flags = flags + 1, name = name || '', owner = owner || '',"
                        " app = app || '', app_name = app_name || '', app_args = app_args || '',"
                        " action = action || '', command = command || '',"
                        " edit_form = edit_form || '',"
                        " next_start = coalesce(next_start, 0) + 60 WHERE id = ?"});
    int round = 0;
    for (auto _ : state) {
        transaction.Run(++round % TaskCount() + 1);
    }
}
BENCHMARK(SetEnable_floor)->Unit(benchmark::kMicrosecond)->UseRealTime();

void Delete(benchmark::State& state) {
    const BenchAppliance& appliance = Appliance();
    Json::Value parameters(Json::objectValue);
    for (auto _ : state) {
        state.PauseTiming();
        parameters["task"] = appliance.AddTask();
        state.ResumeTiming();
        benchmark::DoNotOptimize(appliance.Call("delete", parameters));
    }
}
BENCHMARK(Delete)->Unit(benchmark::kMicrosecond)->UseRealTime();

void Delete_floor(benchmark::State& state) {
    SQLite::Database& raw = RawDatabase();
    SQLite::Statement add(raw,
                          "INSERT INTO task SELECT NULL, flags, name, owner, app, app_name,"
                          " app_args, action, command, edit_form, mode, repeat, week_days,"
                          " date, first_minute, interval_minutes, last_minute, run_missed,"
                          " next_start, schedule_since FROM task WHERE id = 1");
    RawTransaction transaction(raw, {"DELETE FROM task WHERE id = ?",
                                     "UPDATE run SET state = 'skipped', why = 'deleted' "
                                     "WHERE task = ? AND state = 'queued'",
                                     "DELETE FROM recorded_start WHERE task = ?"});
    for (auto _ : state) {
        state.PauseTiming();
        add.exec();
        add.reset();
        const auto id = static_cast<int>(raw.getLastInsertRowid());
        state.ResumeTiming();
        transaction.Run(id);
    }
}
BENCHMARK(Delete_floor)->Unit(benchmark::kMicrosecond)->UseRealTime();

}  // namespace
}  // namespace orva

int main(int argc, char** argv) { return orva::RunBenchmarks(argc, argv); }
