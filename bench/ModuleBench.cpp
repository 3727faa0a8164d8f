#include "bench/ModuleBench.h"

#include <stdlib.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <utility>
#include <vector>

#include "appliance/root/Root.h"
#include "appliance/store/TaskData.h"
#include "appliance/store/TaskStore.h"
#include "appliance/util/CallScope.h"
#include "appliance/util/StrictJson.h"
#include "appliance/webapi/JsonWriter.h"

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

TaskData MakeTask(int number) {
    TaskData task;
    task.name = "Task " + std::to_string(number);
    task.owner = "root";
    task.app = "ORVA.ZUM.TaskScheduler.Script";
    task.appName = "#common:command_line#";
    task.command = "/usr/bin/find /volume1 -newer /tmp/mark-" + std::to_string(number);
    task.action = "#common:run#: " + task.command;
    task.appArgs = "{\"script\":\"" + task.command + "\"}\n";
    task.schedule.firstMinute = number * 7 % Schedule::kMinutesPerDay;
    return task;
}

}  // namespace

BenchAppliance::BenchAppliance(int taskCount) {
    const char* place = std::getenv("ORVA_BENCH_DIR");
    std::string pattern =
        (std::filesystem::absolute(place != nullptr ? place : ".") / "orva-bench-XXXXXX").string();
    Require(::mkdtemp(pattern.data()) != nullptr, "cannot create " + pattern);
    root = pattern;
    SetRoot(root.string());
    WriteTexts(root);
    std::vector<TaskData> tasks;
    for (int number = 1; number <= taskCount; ++number) {
        tasks.push_back(MakeTask(number));
    }
    TaskStore::Current()->SaveAll(tasks);
    modules = std::make_unique<ModuleLoader>(ORVA_LIB_DIR);
    Require(modules->Catalogue().Lookup(kApi, 1, "list").function != nullptr,
            "the module is not in " ORVA_LIB_DIR);
}

BenchAppliance::~BenchAppliance() {
    TaskStore::Configure({});
    std::error_code error;
    std::filesystem::remove_all(root, error);
}

std::filesystem::path BenchAppliance::Database() const { return root / "usr/orva/var/tasks.db"; }

int BenchAppliance::AddTask() const { return TaskStore::Current()->Save(MakeTask(0)); }

ORVA::APIResponse BenchAppliance::Call(const char* method, const Json::Value& parameters) const {
    ORVA::APIRequest request = Request(parameters);
    return Call(method, request);
}

ORVA::APIResponse BenchAppliance::Call(const char* method, ORVA::APIRequest& request) const {
    ORVA::APIResponse response;
    const CallScope scope;
    modules->Catalogue().Lookup(kApi, 1, method).function(&request, &response);
    if (!response.IsSuccess()) {
        Require(false, std::string(method) + ": " + WriteJson(response.GetDocument()));
    }
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
