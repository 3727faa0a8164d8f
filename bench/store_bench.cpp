// The task store through the platform's functions: a page of a sorted list, changes, loads, and the
// same changes done with SQLite alone as the floor.
//
// ORVA_BENCH_TASKS sets the number of stored tasks, 10000 by default.
#include <SQLiteCpp/SQLiteCpp.h>
#include <absl/time/clock.h>
#include <benchmark/benchmark.h>
#include <sys/resource.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "appliance/root/Root.h"
#include "appliance/store/Database.h"
#include "appliance/store/TaskStore.h"
#include "appliance/store/TaskTable.h"
#include "platform/schedtask.h"

namespace {

constexpr int kPage = 50;

int TaskCount() {
    const char* text = std::getenv("ORVA_BENCH_TASKS");
    return text == nullptr ? 10000 : static_cast<int>(std::strtol(text, nullptr, 10));
}

// A root with as many tasks as TaskCount() says, removed at the end.
class Appliance {
  public:
    Appliance() {
        std::string pattern =
            (std::filesystem::temp_directory_path() / "orva-bench-XXXXXX").string();
        if (::mkdtemp(pattern.data()) == nullptr) {
            throw std::runtime_error("no temporary directory");
        }
        root = pattern;
        orva::SetRoot(root);
        std::vector<orva::TaskData> tasks;
        tasks.reserve(static_cast<std::size_t>(TaskCount()));
        for (int number = 0; number < TaskCount(); ++number) {
            tasks.push_back(Task(number));
        }
        orva::TaskStore::Current()->SaveAll(tasks);
    }
    ~Appliance() {
        orva::TaskStore::Configure({});
        std::error_code error;
        std::filesystem::remove_all(root, error);
    }

    const std::string& Root() const { return root; }

    static orva::TaskData Task(int number) {
        orva::TaskData task;
        task.name = "Task number " + std::to_string(number * 7919 % 100003);
        task.owner = "root";
        task.app = "ORVA.ZUM.TaskScheduler.Script";
        task.appName = "#script:script_title#";
        task.appArgs =
            R"({"script":"/volume1/scripts/backup.sh --target )" + std::to_string(number) + "\"}\n";
        task.action =
            "#script:script_run#: /volume1/scripts/backup.sh --target " + std::to_string(number);
        task.command = "/volume1/scripts/backup.sh --target " + std::to_string(number);
        task.editForm = "ORVA.ZUM.TaskScheduler.Script.Form";
        task.schedule.firstMinute = number % 1440;
        task.schedule.weekDays = static_cast<std::uint8_t>(number % 127 + 1);
        return task;
    }

  private:
    std::string root;
};

Appliance& TheAppliance() {
    static Appliance appliance;
    return appliance;
}

// Another process's view of the database: its own connections, nothing shared.
orva::TaskStore& OtherStore() {
    static orva::TaskStore store(TheAppliance().Root() + orva::TaskStore::kDatabaseFile, {});
    return store;
}

bool Listable(_tag_orva_sched_task_* task) { return ORVASchedTaskIsListable(*task); }

// A page through the functions that the module calls, without building rows.
int WalkPage(const char* key, int ascending, int offset) {
    _tag_orva_sched_task_* head = nullptr;
    if (ORVASchedTaskListGet(&head, Listable) < 0 ||
        ORVASchedTaskListSort(&head, key, ascending) < 0) {
        throw std::runtime_error("no list");
    }
    int position = 0;
    for (_tag_orva_sched_task_* task = head; task != nullptr && position < offset + kPage;
         task = ORVASchedTaskNext(task)) {
        if (position >= offset) {
            benchmark::DoNotOptimize(ORVASchedTaskGetName(*task));
            benchmark::DoNotOptimize(ORVASchedTaskGetNextTriggerTime(*task));
        }
        ++position;
    }
    ORVASchedTaskListFree(&head);
    return position;
}

void PageOfUnchangedStore(benchmark::State& state) {
    TheAppliance();
    WalkPage("next trigger time", 0, 0);
    for (auto _ : state) {
        benchmark::DoNotOptimize(WalkPage("next trigger time", 0, 0));
    }
}
BENCHMARK(PageOfUnchangedStore)->Unit(benchmark::kMicrosecond);
BENCHMARK(PageOfUnchangedStore)->Unit(benchmark::kMicrosecond)->Threads(2)->UseRealTime();

void LastPageOfUnchangedStore(benchmark::State& state) {
    TheAppliance();
    WalkPage("name", 1, 0);
    for (auto _ : state) {
        benchmark::DoNotOptimize(WalkPage("name", 1, TaskCount() - kPage));
    }
}
BENCHMARK(LastPageOfUnchangedStore)->Unit(benchmark::kMicrosecond);

void PageAfterAnotherProcessChangedATask(benchmark::State& state) {
    TheAppliance();
    const std::string key = state.range(0) == 0 ? "next trigger time" : "name";
    int number = 0;
    for (auto _ : state) {
        state.PauseTiming();
        orva::TaskData task = Appliance::Task(++number);
        task.id = number % TaskCount() + 1;
        OtherStore().Save(task);
        state.ResumeTiming();
        benchmark::DoNotOptimize(WalkPage(key.c_str(), 1, 0));
    }
}
BENCHMARK(PageAfterAnotherProcessChangedATask)->Arg(0)->Arg(1)->Unit(benchmark::kMillisecond);

void FirstPageOfAProcess(benchmark::State& state) {
    TheAppliance();
    for (auto _ : state) {
        orva::TaskStore store(TheAppliance().Root() + orva::TaskStore::kDatabaseFile, {});
        benchmark::DoNotOptimize(store.CurrentSnapshot()->Order(orva::SortKey::kNextStart, true));
    }
}
BENCHMARK(FirstPageOfAProcess)->Unit(benchmark::kMillisecond);

void Load(benchmark::State& state) {
    TheAppliance();
    _tag_orva_sched_task_* task = ORVASchedTaskAlloc();
    int id = 0;
    for (auto _ : state) {
        id = id % TaskCount() + 1;
        benchmark::DoNotOptimize(ORVASchedTaskLoad(id, task));
    }
    ORVASchedTaskFree(task);
}
BENCHMARK(Load)->Unit(benchmark::kMicrosecond);

// The floor of a change: one transaction on the same table with the same durability.
void RawSqliteChange(benchmark::State& state) {
    TheAppliance();
    SQLite::Database database(TheAppliance().Root() + orva::TaskStore::kDatabaseFile,
                              SQLite::OPEN_READWRITE, 5000);
    database.exec("PRAGMA synchronous = FULL");
    SQLite::Statement begin(database, "BEGIN IMMEDIATE");
    SQLite::Statement commit(database, "COMMIT");
    SQLite::Statement update(database,
                             "UPDATE task SET flags = 1023 - flags, next_start = ? WHERE id = ?");
    int id = 0;
    for (auto _ : state) {
        id = id % TaskCount() + 1;
        begin.exec();
        begin.reset();
        update.bind(1, std::int64_t{1900000000} + id);
        update.bind(2, id);
        update.exec();
        update.reset();
        commit.exec();
        commit.reset();
    }
}
BENCHMARK(RawSqliteChange)->Unit(benchmark::kMicrosecond)->UseRealTime();

void LoadSetStateSave(benchmark::State& state) {
    TheAppliance();
    int id = 0;
    for (auto _ : state) {
        id = id % TaskCount() + 1;
        _tag_orva_sched_task_* task = ORVASchedTaskAlloc();
        ORVASchedTaskLoad(id, task);
        ORVASchedCTaskSetState(task, !ORVASchedTaskIsEnabled(*task));
        if (ORVASchedTaskSave(task) < 0) {
            state.SkipWithError("save failed");
        }
        ORVASchedTaskFree(task);
    }
}
BENCHMARK(LoadSetStateSave)->Unit(benchmark::kMicrosecond)->UseRealTime();

// Changes a task; how long that took, in milliseconds.
double TimedSave(orva::TaskStore& store, int number) {
    orva::TaskData task = Appliance::Task(number);
    task.id = number % TaskCount() + 1;
    const auto start = std::chrono::steady_clock::now();
    store.Save(task);
    return std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start)
        .count();
}

// Two processes that change tasks without pause, and the longest that either has to wait for a
// change of its own.
void ChangeBesideAnotherWriter(benchmark::State& state) {
    TheAppliance();
    std::atomic<bool> stop = false;
    double longestOfOther = 0;
    std::thread other([&] {
        for (int number = 0; !stop; ++number) {
            longestOfOther = std::max(longestOfOther, TimedSave(OtherStore(), number));
        }
    });
    double longest = 0;
    int number = 0;
    for (auto _ : state) {
        longest = std::max(longest, TimedSave(*orva::TaskStore::Current(), ++number));
    }
    stop = true;
    other.join();
    state.counters["longest_ms"] = std::max(longest, longestOfOther);
}
BENCHMARK(ChangeBesideAnotherWriter)->Unit(benchmark::kMillisecond)->Iterations(300)->UseRealTime();

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    rusage usage{};
    ::getrusage(RUSAGE_SELF, &usage);
    std::printf("peak memory of this process: %ld KiB\n", usage.ru_maxrss);
}
