// The speed of get, set and create for each kind of task, in process through the method table of
// the real shared object, on the real store.
#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Statement.h>
#include <benchmark/benchmark.h>
#include <json/reader.h>
#include <json/writer.h>

#include <array>
#include <filesystem>
#include <fstream>
#include <map>
#include <string>
#include <utility>

#include "appliance/store/TaskStore.h"
#include "bench/FloorReporter.h"
#include "bench/ModuleBench.h"
#include "bench/RawTransaction.h"

namespace orva {
namespace {

constexpr int kTaskCount = 10'000;
constexpr int kPackages = 100;
constexpr std::array kCatalogues = {100, 1000, 5000};

struct Kind {
    const char* name;  // in the benchmarks' names
    const char* type;  // null: of another application, and never created through the API
    // Two forms, so that each change is one.
    std::array<const char*, 2> extra;
};
constexpr std::array kKinds = {
    Kind{"Beep", "beep", {R"({"beep_duration":30})", R"({"beep_duration":60})"}},
    Kind{"Script",
         "script",
         {R"({"script":"/usr/bin/find /volume1 -newer /tmp/mark-1"})",
          R"({"script":"/usr/bin/find /volume1 -newer /tmp/mark-2"})"}},
    Kind{"Recycle",
         "recycle",
         {R"({"clean_share_policy":{"clean_all":false,"shares":["photo","video"]},
              "clean_file_policy":{"policy":"time","time":30,"reserve_policy":{
              "size_greater_check":true,"size_greater":100,"extension_check":true,
              "extension":[{"file_ext":"jpg"},{"file_ext":"txt"}]}}})",
          R"({"clean_share_policy":{"clean_all":true},
              "clean_file_policy":{"policy":"size","size":500,"sort_type":1}})"}},
    Kind{"Basic", nullptr, {"null", "null"}},
    Kind{"Service112",
         "service",
         {R"({"action":"stop","services":[{"id":"Samba","enable":true},
              {"id":"package00007","enable":true}]})",
          R"({"action":"start","services":[{"id":"Samba","enable":false},
              {"id":"package00007","enable":false}]})"}},
};

std::filesystem::path PackagesOf(int count) { return "usr/orva/packages-" + std::to_string(count); }

void WritePackages(const std::filesystem::path& root, int count) {
    for (int i = 0; i < count; ++i) {
        std::string id = std::to_string(i);
        id.insert(0, 5 - id.size(), '0');
        const std::filesystem::path directory = root / PackagesOf(count) / ("package" + id);
        std::filesystem::create_directories(directory);
        std::ofstream(directory / "package.json")
            << R"({"display_name":"The application )" << id
            << R"(","startable":true,"start":"systemctl start app)" << id
            << R"(","stop":"systemctl stop app)" << id << R"("})";
    }
}

// The appliance with its tasks, one of each kind among them, and sets of packages to install.
class TypedAppliance {
  public:
    TypedAppliance() : appliance(kTaskCount) {
        const std::filesystem::path root = appliance.Root();
        std::filesystem::create_directories(root / "usr/orva/etc");
        std::ofstream(root / "usr/orva/etc/orva.conf") << "supportNFS=\"yes\"\n"
                                                       << "supportweb=\"yes\"\n";
        for (const int count : kCatalogues) {
            WritePackages(root, count);
        }
        Install(kPackages);
        for (const Kind& kind : kKinds) {
            ids[kind.name] = kind.type == nullptr ? AddOther() : Create(kind, 0);
        }
        for (const int count : kCatalogues) {
            Install(count);
            catalogueIds[count] = Create(kKinds.back(), 0);
        }
        Install(kPackages);
        const Json::Value services =
            Call("get", Id(ids["Service112"])).GetDocument()["extra"]["services"];
        Require(services.size() == 112, "the catalogue has another size");
    }

    // Puts `count` packages in the place of those that are installed.
    void Install(int count) {
        const std::filesystem::path root = appliance.Root();
        if (installed != 0) {
            std::filesystem::rename(root / "usr/orva/packages", root / PackagesOf(installed));
        }
        std::filesystem::rename(root / PackagesOf(count), root / "usr/orva/packages");
        installed = count;
    }

    template <class Request>
    ORVA::APIResponse Call(const char* method, Request&& request) const {
        return appliance.Call(method, std::forward<Request>(request));
    }

    static Json::Value Id(int id) {
        Json::Value parameters(Json::objectValue);
        parameters["id"] = id;
        return parameters;
    }

    static Json::Value Form(const Kind& kind, std::size_t which) {
        Json::Value form = Parameters(
            R"({"name":"A task","enable":true,"schedule":{"hour":3,"minute":30,"week_day":"1,3"}})");
        form["extra"] = Parameters(kind.extra[which]);
        return form;
    }

    int Create(const Kind& kind, std::size_t which) const {
        Json::Value parameters = Form(kind, which);
        parameters["type"] = kind.type;
        return Call("create", parameters).GetDocument()["id"].asInt();
    }

    int IdOf(const Kind& kind) const { return ids.at(kind.name); }
    int IdOfCatalogue(int count) const { return catalogueIds.at(count); }
    const BenchAppliance& Base() const { return appliance; }

  private:
    int AddOther() const {
        const int id = appliance.AddTask();
        TaskData task = *TaskStore::Current()->Find(id);
        task.app = "ORVA.ZUM.BackupApp.NetBackup";
        return TaskStore::Current()->Save(task);
    }

    BenchAppliance appliance;
    std::map<std::string, int> ids;
    std::map<int, int> catalogueIds;
    int installed = 0;
};

TypedAppliance& Appliance() {
    static TypedAppliance appliance;
    return appliance;
}

SQLite::Database& RawDatabase() {
    static SQLite::Database raw =
        CopyDatabase(Appliance().Base().Database(), Appliance().Base().Root() / "raw.db");
    return raw;
}

void Get(benchmark::State& state, const Kind& kind) {
    const TypedAppliance& appliance = Appliance();
    ORVA::APIRequest request = BenchAppliance::Request(TypedAppliance::Id(appliance.IdOf(kind)));
    for (auto _ : state) {
        benchmark::DoNotOptimize(appliance.Call("get", request));
    }
}

void Set(benchmark::State& state, const Kind& kind) {
    const TypedAppliance& appliance = Appliance();
    const auto request = [&](std::size_t which) {
        Json::Value form = TypedAppliance::Form(kind, which);
        form["id"] = appliance.IdOf(kind);
        return BenchAppliance::Request(form);
    };
    std::array<ORVA::APIRequest, 2> requests = {request(0), request(1)};
    std::size_t round = 0;
    for (auto _ : state) {
        benchmark::DoNotOptimize(appliance.Call("set", requests[++round % requests.size()]));
    }
}

void Create(benchmark::State& state, const Kind& kind) {
    const TypedAppliance& appliance = Appliance();
    Json::Value form = TypedAppliance::Form(kind, 0);
    form["type"] = kind.type;
    ORVA::APIRequest request = BenchAppliance::Request(form);
    for (auto _ : state) {
        benchmark::DoNotOptimize(appliance.Call("create", request));
    }
}

// Every column's text is built anew, as a change binds it anew.
constexpr const char* kRawUpdate =
    "UPDATE task SET flags = flags + 1, name = name || '', owner = owner || '', app = app || '',"
    " app_name = app_name || '', app_args = app_args || '', action = action || '',"
    " command = command || '', edit_form = edit_form || '',"
    " next_start = coalesce(next_start, 0) + 60 WHERE id = ?";
constexpr const char* kRawInsert =
    "INSERT INTO task SELECT NULL, flags, name, owner, app, app_name, app_args, action, command,"
    " edit_form, mode, repeat, week_days, date, first_minute, interval_minutes, last_minute,"
    " run_missed, next_start, schedule_since FROM task WHERE id = ?";

void WriteFloor(benchmark::State& state, const Kind& kind, const char* sql) {
    RawTransaction transaction(RawDatabase(), {sql});
    const int id = Appliance().IdOf(kind);
    for (auto _ : state) {
        transaction.Run(id);
    }
}

#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
// The section's text through jsoncpp's reader and writer, the ones that tasks are stored with.
std::string ReadAndWrite(const std::string& text) {
    Json::Value section;
    Require(Json::Reader().parse(text, section), "the section is no JSON");
    return Json::FastWriter().write(section);
}
#pragma GCC diagnostic pop

std::string SectionOf(int id) { return TaskStore::Current()->Find(id)->appArgs; }

void SectionFloor(benchmark::State& state, const Kind& kind) {
    const std::string text = SectionOf(Appliance().IdOf(kind));
    for (auto _ : state) {
        benchmark::DoNotOptimize(ReadAndWrite(text));
    }
}

void SectionAndWriteFloor(benchmark::State& state, const Kind& kind, const char* sql) {
    RawTransaction transaction(RawDatabase(), {sql});
    const int id = Appliance().IdOf(kind);
    const std::string text = SectionOf(id);
    for (auto _ : state) {
        benchmark::DoNotOptimize(ReadAndWrite(text));
        transaction.Run(id);
    }
}

void Refresh(benchmark::State& state) {
    TypedAppliance& appliance = Appliance();
    const int count = static_cast<int>(state.range(0));
    const Json::Value parameters = TypedAppliance::Id(appliance.IdOfCatalogue(count));
    appliance.Install(count);
    benchmark::DoNotOptimize(appliance.Call("get", parameters));
    for (auto _ : state) {
        benchmark::DoNotOptimize(appliance.Call("get", parameters));
    }
    state.counters["per_package"] = benchmark::Counter(
        static_cast<double>(count),
        benchmark::Counter::kIsIterationInvariantRate | benchmark::Counter::kInvert);
    appliance.Install(kPackages);
    benchmark::DoNotOptimize(appliance.Call("get", parameters));
}

template <class Function, class... Arguments>
void Register(const std::string& name, Function function, Arguments... arguments) {
    benchmark::RegisterBenchmark(name.c_str(), function, arguments...)
        ->Unit(benchmark::kMicrosecond)
        ->UseRealTime();
}

void RegisterAll() {
    for (const Kind& kind : kKinds) {
        const std::string name = kind.name;
        const bool service = &kind == &kKinds.back();
        const auto writeFloor = service ? SectionAndWriteFloor : WriteFloor;
        Register("Get" + name, Get, kind);
        if (service) {
            Register("Get" + name + "_floor", SectionFloor, kind);
        }
        Register("Set" + name, Set, kind);
        Register("Set" + name + "_floor", writeFloor, kind, kRawUpdate);
        if (kind.type != nullptr) {
            Register("Create" + name, Create, kind);
            Register("Create" + name + "_floor", writeFloor, kind, kRawInsert);
        }
    }
    benchmark::internal::Benchmark* refresh =
        benchmark::RegisterBenchmark("RefreshCatalogue", Refresh)
            ->Unit(benchmark::kMicrosecond)
            ->UseRealTime();
    for (const int count : kCatalogues) {
        refresh->Arg(count);
    }
}

}  // namespace
}  // namespace orva

int main(int argc, char** argv) {
    orva::RegisterAll();
    return orva::RunBenchmarks(argc, argv);
}
