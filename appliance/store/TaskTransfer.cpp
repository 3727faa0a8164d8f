#include "appliance/store/TaskTransfer.h"

#include <json/value.h>
#include <json/writer.h>

#include <algorithm>
#include <array>
#include <map>
#include <vector>

#include "appliance/store/TaskDocument.h"
#include "appliance/store/TaskRecord.h"
#include "appliance/util/StrictJson.h"

namespace orva {
namespace {

// Reads one task of the array after the other.
class Importer {
  public:
    explicit Importer(const Snapshot& storedTasks) : stored(storedTasks) {}

    // What is wrong with the document; empty when it was taken.
    std::string Add(const Json::Value& document) {
        int id = kNewTaskId;
        const Json::Value* basic = FindMember(document, kBasicSection);
        if (const Json::Value* member = basic == nullptr ? nullptr : FindMember(*basic, "id")) {
            const std::optional<int> parsed = ParseTaskId(*member);
            if (!parsed) {
                return "basic.id: is no decimal id";
            }
            id = *parsed;
        }
        if (id != kNewTaskId) {
            const auto [first, fresh] = numberOfId.emplace(id, tasks.size() + 1);
            if (!fresh) {
                return "basic.id: task " + std::to_string(first->second) + " has it already";
            }
        }
        const std::optional<std::size_t> at = stored.Find(id);
        if (!at && id > kHighestImportedId) {
            return "basic.id: is higher than " + std::to_string(kHighestImportedId);
        }
        TaskData task = at ? stored.Task(*at) : *NewTaskDefaults();
        if (const auto problem = ApplyTaskDocument(document, task, accounts)) {
            return problem->text;
        }
        const auto problem = CommandProblem(task.command);
        if (problem && !(at && stored.Task(*at).command == task.command)) {
            return "command: " + *problem;
        }
        task.id = id;
        tasks.push_back(std::move(task));
        return {};
    }

    const std::vector<TaskData>& Tasks() const { return tasks; }

  private:
    const Snapshot& stored;
    AccountLookup accounts;
    std::vector<TaskData> tasks;
    std::map<int, std::size_t> numberOfId;
};

}  // namespace

ImportResult ImportTasks(TaskStore& store, std::string_view json) {
    ImportResult result;
    const std::optional<Json::Value> documents = ParseStrictJson(json, result.problem);
    if (!documents) {
        return result;
    }
    if (!documents->isArray()) {
        result.problem = "is no array of tasks";
        return result;
    }
    const std::shared_ptr<const Snapshot> stored = store.CurrentSnapshot();
    Importer importer(*stored);
    for (Json::ArrayIndex index = 0; index < documents->size(); ++index) {
        const std::string problem = importer.Add((*documents)[index]);
        if (!problem.empty()) {
            result.problem = "task " + std::to_string(index + 1) + ": " + problem;
            return result;
        }
    }
    store.SaveAll(importer.Tasks());
    result.count = importer.Tasks().size();
    return result;
}

std::string ExportTasks(const Snapshot& tasks) {
    Json::Value documents(Json::arrayValue);
    for (const SharedTask& task : tasks.Tasks()) {
        documents.append(TaskDocument(*task));
    }
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "  ";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, documents) + "\n";
}

std::string TaskOverview(const Snapshot& tasks) {
    using Row = std::array<std::string, 5>;
    std::vector<Row> rows = {{"ID", "ENABLED", "NEXT START", "OWNER", "NAME"}};
    for (std::size_t index = 0; index < tasks.Count(); ++index) {
        const TaskData& task = tasks.Task(index);
        rows.push_back({std::to_string(task.id), task.Has(kEnabled) ? "on" : "off",
                        FormatNextStart(tasks.NextStart(index), tasks.Zone()), task.owner,
                        task.name});
    }
    std::array<std::size_t, 5> widths{};
    for (const Row& row : rows) {
        for (std::size_t column = 0; column < row.size(); ++column) {
            widths[column] = std::max(widths[column], row[column].size());
        }
    }
    std::string text;
    for (const Row& row : rows) {
        for (std::size_t column = 0; column + 1 < row.size(); ++column) {
            text += row[column];
            text.append(widths[column] - row[column].size() + 2, ' ');
        }
        text += row.back() + "\n";
    }
    return text;
}

}  // namespace orva
