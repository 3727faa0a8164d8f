#include "appliance/runs/RunStore.h"

#include <utility>

#include "appliance/runs/RunTable.h"
#include "appliance/store/DatabaseGuard.h"
#include "appliance/supervisor/RunFolder.h"

namespace orva {
namespace {

// Runs `operation` on a connection whose statements all see the same state.
template <class Operation>
auto Reading(Database& database, Operation operation) {
    return Guarded(database, [&] {
        Database::Lease lease(database);
        const ReadTransaction transaction(*lease);
        return operation(*lease);
    });
}

struct StateAndOutput {
    RunState state;
    RunOutput output;
};

}  // namespace

std::shared_ptr<RunStore> RunStore::Current() {
    return std::make_shared<RunStore>(TaskStore::Current());
}

RunStore::RunStore(std::shared_ptr<TaskStore> taskStore) : store(std::move(taskStore)) {}

RunStore::Page RunStore::List(const Filter& filter, std::int64_t offset, std::int64_t limit) {
    return Reading(store->UsedDatabase(), [&](Connection& connection) {
        Page page;
        page.total = CountRuns(connection, filter);
        for (const std::int64_t id : ReadRunIds(connection, filter, offset, limit)) {
            if (std::optional<Run> run = ReadRun(connection, id)) {
                page.runs.push_back(*std::move(run));
            }
        }
        return page;
    });
}

std::vector<Run> RunStore::Latest(const std::vector<int>& tasks) {
    return Reading(store->UsedDatabase(), [&](Connection& connection) {
        std::vector<Run> runs;
        for (const int task : tasks) {
            if (std::optional<Run> run = ReadLatestRun(connection, task)) {
                runs.push_back(*std::move(run));
            }
        }
        return runs;
    });
}

std::optional<Run> RunStore::Find(std::int64_t run) {
    return Reading(store->UsedDatabase(),
                   [&](Connection& connection) { return ReadRun(connection, run); });
}

std::optional<RunOutput> RunStore::Output(std::int64_t run) {
    const auto read = [&](Connection& connection) -> std::optional<StateAndOutput> {
        const std::optional<Run> found = ReadRun(connection, run);
        if (!found) {
            return std::nullopt;
        }
        return StateAndOutput{found->state, ReadRunOutput(connection, run).value_or(RunOutput())};
    };
    std::optional<StateAndOutput> stored = Reading(store->UsedDatabase(), read);
    if (stored && stored->state == RunState::kRunning) {
        if (std::optional<StoredOutput> sofar = RunFolder(run).Output()) {
            return RunOutput{std::move(sofar->head), std::move(sofar->tail), sofar->dropped};
        }
        // The run may have ended meanwhile: its folder goes when its row is stored.
        stored = Reading(store->UsedDatabase(), read);
    }
    return stored ? std::optional(std::move(stored->output)) : std::nullopt;
}

std::int64_t RunStore::Revision() { return Reading(store->UsedDatabase(), ReadRevision); }

}  // namespace orva
