// The API ORVA.Core.TaskHistory: what ran, what it printed, and what is to come.
#include <json/value.h>

#include <cstdint>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "appliance/modules/ApiMethod.h"
#include "appliance/modules/EditorSchedule.h"
#include "appliance/runs/RunDocument.h"
#include "appliance/runs/RunStore.h"
#include "appliance/schedule/StartText.h"
#include "appliance/schedule/StartTimes.h"
#include "appliance/store/SchedulerLink.h"
#include "appliance/store/TaskStore.h"
#include "platform/webapi.h"

namespace {

using orva::ApiFailure;
using orva::ModuleError;
using orva::Parameters;
using orva::Run;
using orva::RunStore;

constexpr const char* kApiName = "ORVA.Core.TaskHistory";

constexpr std::int64_t kHighestTask = std::numeric_limits<int>::max();
constexpr std::int64_t kHighestRun = std::numeric_limits<std::int64_t>::max();
constexpr std::int64_t kUsualPage = 50;
constexpr std::int64_t kLargestPage = 1000;
constexpr std::size_t kMostTasks = 10'000;
constexpr std::int64_t kUsualStarts = 10;
constexpr std::int64_t kMostStarts = 50;

Json::Value RunDocuments(const std::vector<Run>& runs) {
    Json::Value documents(Json::arrayValue);
    for (const Run& run : runs) {
        documents.append(orva::RunDocument(run));
    }
    return documents;
}

RunStore::Filter ReadFilter(const Parameters& parameters) {
    RunStore::Filter filter;
    if (const auto task = parameters.Integer("task", 1, kHighestTask)) {
        filter.task = static_cast<int>(*task);
    }
    if (const auto state = parameters.Text("state")) {
        filter.state = orva::ParseRunState(*state);
        if (!filter.state) {
            std::string known;
            for (const std::string_view each : orva::kRunStateTexts) {
                known.append(known.empty() ? "" : ", ").append(each);
            }
            orva::RefuseParameter("state", "is none of " + known);
        }
    }
    return filter;
}

Json::Value List(const Parameters& parameters) {
    const RunStore::Filter filter = ReadFilter(parameters);
    const std::int64_t offset = parameters.Integer("offset", 0, kHighestRun).value_or(0);
    const std::int64_t limit = parameters.Integer("limit", 1, kLargestPage).value_or(kUsualPage);
    const RunStore::Page page = RunStore::Current()->List(filter, offset, limit);
    Json::Value answer(Json::objectValue);
    answer["runs"] = RunDocuments(page.runs);
    answer["total"] = Json::Int64{page.total};
    answer["offset"] = Json::Int64{offset};
    return answer;
}

Json::Value Latest(const Parameters& parameters) {
    parameters.Require("tasks");
    std::vector<int> tasks;
    for (const std::int64_t task : parameters.Integers("tasks", 1, kHighestTask, kMostTasks)) {
        tasks.push_back(static_cast<int>(task));
    }
    Json::Value answer(Json::objectValue);
    answer["runs"] = RunDocuments(RunStore::Current()->Latest(tasks));
    return answer;
}

[[noreturn]] void RefuseRun(std::int64_t run) {
    throw ApiFailure(ModuleError::kNoSuchRun, "there is no run " + std::to_string(run));
}

Json::Value Output(const Parameters& parameters) {
    const std::int64_t id = parameters.RequiredInteger("run", 1, kHighestRun);
    const std::shared_ptr<RunStore> store = RunStore::Current();
    // The state first: an output that comes with the state "ended" is all that will ever come.
    const std::optional<Run> run = store->Find(id);
    std::optional<orva::RunOutput> output = store->Output(id);
    if (!run || !output) {
        RefuseRun(id);
    }
    const std::uint64_t size = output->head.size() + output->dropped + output->tail.size();
    if (output->dropped == 0) {
        // A character may lie across the two parts.
        output->head += output->tail;
        output->tail.clear();
    }
    Json::Value answer(Json::objectValue);
    answer["run"] = Json::Int64{id};
    answer["state"] = std::string(RunStateText(run->state));
    answer["head"] = output->head;
    answer["tail"] = output->tail;
    answer["dropped"] = Json::UInt64{output->dropped};
    answer["size"] = Json::UInt64{size};
    return answer;
}

Json::Value Next(const Parameters& parameters) {
    parameters.Require("schedule");
    const std::int64_t count = parameters.Integer("count", 1, kMostStarts).value_or(kUsualStarts);
    orva::Schedule schedule;
    if (const auto problem = orva::ReadEditorSchedule(parameters.Any("schedule"), schedule)) {
        throw ApiFailure(ModuleError::kBadParameter, *problem);
    }
    const std::shared_ptr<orva::TaskStore> store = orva::TaskStore::Current();
    const absl::TimeZone zone = store->Zone();
    Json::Value answer(Json::objectValue);
    answer["zone"] = orva::ZoneName(zone);
    Json::Value& starts = answer["starts"] = Json::Value(Json::arrayValue);
    for (const orva::Start& start :
         NextStarts(schedule, zone, store->Now(), static_cast<std::size_t>(count))) {
        Json::Value each(Json::objectValue);
        each["utc"] = orva::FormatInstant(start.at);
        each["local"] = orva::FormatLocalMinute(start.at, zone);
        each["offset"] = orva::FormatOffset(start.at, zone);
        each["note"] = std::string(orva::ClockChangeNote(start.change));
        starts.append(std::move(each));
    }
    return answer;
}

Json::Value Stop(const Parameters& parameters) {
    const std::int64_t run = parameters.RequiredInteger("run", 1, kHighestRun);
    const std::shared_ptr<RunStore> store = RunStore::Current();
    const std::optional<Run> found = store->Find(run);
    if (!found) {
        RefuseRun(run);
    }
    // One that waits needs no scheduler for it. It may be started just now.
    if (found->state == orva::RunState::kQueued && store->Cancel(run)) {
        return Json::Value(Json::objectValue);
    }
    if (const std::optional<std::string> reason = orva::SchedulerLink::Stop(run)) {
        throw ApiFailure(ModuleError::kCannotStop, *reason);
    }
    return Json::Value(Json::objectValue);
}

const ORVA::APITableRow kTable[] = {
    {kApiName, 1, "list", orva::Serve<List>},     {kApiName, 1, "latest", orva::Serve<Latest>},
    {kApiName, 1, "output", orva::Serve<Output>}, {kApiName, 1, "next", orva::Serve<Next>},
    {kApiName, 1, "stop", orva::Serve<Stop>},     {nullptr, 0, nullptr, nullptr},
};

}  // namespace

__attribute__((visibility("default"))) const ORVA::APITableRow* GetAPITable() { return kTable; }
