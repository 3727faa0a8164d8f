// Runs as rows of the database. Functions throw SQLite::Exception and StoreFailure; several of them
// that are to agree with each other belong inside one transaction.
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "appliance/runs/RunStore.h"
#include "appliance/store/Connection.h"

namespace orva {

std::optional<Run> ReadRun(Connection& connection, std::int64_t run);

// The ids of the runs that `filter` leaves, the newest first.
std::vector<std::int64_t> ReadRunIds(Connection& connection, const RunStore::Filter& filter,
                                     std::int64_t offset, std::int64_t limit);
std::int64_t CountRuns(Connection& connection, const RunStore::Filter& filter);

// The newest run of the task.
std::optional<Run> ReadLatestRun(Connection& connection, int task);

// What was stored of the run's output when it ended; nothing when there was none.
std::optional<RunOutput> ReadRunOutput(Connection& connection, std::int64_t run);

// The number that grows with every change of tasks or runs.
std::int64_t ReadRevision(Connection& connection);

}  // namespace orva
