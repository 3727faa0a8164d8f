#include "appliance/runs/RunStore.h"

#include <syslog.h>

#include <mutex>
#include <set>
#include <string>
#include <utility>

#include "appliance/runs/RunTable.h"
#include "appliance/runs/RunWriter.h"
#include "appliance/store/DatabaseGuard.h"
#include "appliance/store/StoreFailure.h"
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

// Once for each row: whoever shows the history asks again and again.
void LogDamaged(const Database& database, const StoreFailure& failure) {
    static std::mutex mutex;
    static std::set<std::string> logged;
    constexpr std::size_t kMostLogged = 1000;
    const std::lock_guard lock(mutex);
    if (logged.size() < kMostLogged &&
        logged.insert(database.File() + ": " + failure.what()).second) {
        syslog(LOG_ERR, "task store %s: %s: it is left out", database.File().c_str(),
               failure.what());
    }
}

// A row that holds what no run can is left out.
template <class ReadOne>
void AddUndamaged(const Database& database, std::vector<Run>& runs, ReadOne readOne) {
    try {
        if (std::optional<Run> run = readOne()) {
            runs.push_back(*std::move(run));
        }
    } catch (const StoreFailure& failure) {
        LogDamaged(database, failure);
    }
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
    Database& database = store->UsedDatabase();
    return Reading(database, [&](Connection& connection) {
        Page page;
        page.total = CountRuns(connection, filter);
        for (const std::int64_t id : ReadRunIds(connection, filter, offset, limit)) {
            AddUndamaged(database, page.runs, [&] { return ReadRun(connection, id); });
        }
        return page;
    });
}

std::vector<Run> RunStore::Latest(const std::vector<int>& tasks) {
    Database& database = store->UsedDatabase();
    return Reading(database, [&](Connection& connection) {
        std::vector<Run> runs;
        for (const int task : tasks) {
            AddUndamaged(database, runs, [&] { return ReadLatestRun(connection, task); });
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

bool RunStore::Cancel(std::int64_t run) {
    Database& database = store->UsedDatabase();
    return Guarded(database, [&] {
        WriteTransaction transaction(database);
        const bool cancelled = CancelQueued(*transaction, run);
        transaction.Commit();
        return cancelled;
    });
}

std::int64_t RunStore::Revision() { return Reading(store->UsedDatabase(), ReadRevision); }

}  // namespace orva
