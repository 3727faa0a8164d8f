#include "bench/ModuleBench.h"

#include <SQLiteCpp/Database.h>
#include <stdlib.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <utility>

#include "appliance/root/Root.h"
#include "appliance/util/StrictJson.h"
#include "appliance/webapi/JsonWriter.h"
#include "platform/schedtask.h"

namespace orva {
namespace {

constexpr const char* kApi = "ORVA.Core.TaskScheduler";
constexpr int kTextCount = 500;

void WriteTexts(const std::filesystem::path& root) {
    Json::Value texts(Json::objectValue);
    texts["common"]["run"] = "Run";
    for (int i = 1; i < kTextCount; ++i) {
        const std::string number = std::to_string(i);
        texts["section" + std::to_string(i / 25)]["key_" + number] =
            "A text of the catalogue " + number;
    }
    const std::filesystem::path directory = root / "usr/orva/orvaman/webman/texts/en";
    std::filesystem::create_directories(directory);
    std::ofstream(directory / "strings.json") << WriteJson(texts);
}

// The tasks go in by one transaction through SQLite itself; what the store made first serves as the
// pattern.
void WriteTasks(const std::filesystem::path& database, int count) {
    Json::Value document;
    document["basic"]["id"] = "-1";
    document["basic"]["task_name"] = "Task 1";
    document["basic"]["enabled"] = "on";
    document["schedule"] = Json::Value(Json::objectValue);
    _tag_orva_sched_task_* task = ORVASchedTaskAlloc();
    Require(ORVASchedTaskConvertFromJson_Basic(document, *task) &&
                ORVASchedTaskConvertFromJson_Schedule(document, *task),
            "the task is refused");
    ORVASchedCTaskSetApp(task, "ORVA.ZUM.TaskScheduler.Script");
    ORVASchedCTaskSetAppName(task, "#common:command_line#");
    ORVASchedCTaskSetAction(task, "#common:run#: /usr/bin/find /volume1 -newer /tmp/mark");
    ORVASchedCTaskSetAppArgs(task, "{\"script\":\"/usr/bin/find /volume1 -newer /tmp/mark\"}\n");
    ORVASchedCTaskSetCommand(task, "/usr/bin/find /volume1 -newer /tmp/mark");
    Require(ORVASchedTaskSave(task) == 0, "the task cannot be saved");
    ORVASchedTaskFree(task);

    SQLite::Database raw(database.string(), SQLite::OPEN_READWRITE);
    raw.exec(
        "CREATE TEMP TABLE pattern AS SELECT * FROM task;"
        "WITH RECURSIVE n(i) AS (VALUES(2) UNION ALL SELECT i + 1 FROM n WHERE i < " +
        std::to_string(count) +
        ") INSERT INTO task SELECT i, flags, 'Task ' || i, owner, app, app_name, app_args, action,"
        " command, edit_form, mode, repeat, week_days, date, (i * 7) % 1440, interval_minutes,"
        " 1439, run_missed, next_start + i * 60 FROM n, pattern;"
        "DROP TABLE pattern;");
}

}  // namespace

BenchAppliance::BenchAppliance(int taskCount) {
    const char* place = std::getenv("ORVA_BENCH_DIR");
    std::string pattern =
        (std::filesystem::absolute(place != nullptr ? place : ".") / "orva-bench-XXXXXX").string();
    Require(::mkdtemp(pattern.data()) != nullptr, "cannot create " + pattern);
    root = pattern;
    SetRoot(root.string());
    std::filesystem::create_directories(root / "usr/orva/var");
    WriteTexts(root);
    WriteTasks(Database(), taskCount);
    modules = std::make_unique<ModuleLoader>(ORVA_LIB_DIR);
    Require(modules->Catalogue().Lookup(kApi, 1, "list").function != nullptr,
            "the module is not in " ORVA_LIB_DIR);
}

BenchAppliance::~BenchAppliance() {
    std::error_code error;
    std::filesystem::remove_all(root, error);
}

std::filesystem::path BenchAppliance::Database() const { return root / "usr/orva/var/tasks.db"; }

ORVA::APIResponse BenchAppliance::Call(const char* method, const Json::Value& parameters) const {
    ORVA::APIRequest request(parameters, "en");
    ORVA::APIResponse response;
    modules->Catalogue().Lookup(kApi, 1, method).function(&request, &response);
    Require(response.IsSuccess(), std::string(method) + ": " + WriteJson(response.GetDocument()));
    return response;
}

Json::Value Parameters(const char* text) {
    std::string error;
    std::optional<Json::Value> document = ParseStrictJson(text, error);
    Require(document.has_value(), error);
    return std::move(*document);
}

void Require(bool condition, const std::string& message) {
    if (!condition) {
        std::fprintf(stderr, "bench: %s\n", message.c_str());
        std::exit(1);
    }
}

}  // namespace orva
