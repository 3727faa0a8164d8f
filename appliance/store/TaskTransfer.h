// All tasks of a store as text: in and out as a JSON array of task documents, and as a table for
// people. Functions throw StoreFailure when the store fails.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "appliance/store/TaskStore.h"

namespace orva {

// New tasks are numbered on from the highest id that was ever given. A file must not use them up.
inline constexpr int kHighestImportedId = 1'000'000'000;

// What ImportTasks did.
struct ImportResult {
    std::size_t count = 0;
    // Why nothing was stored: "task 3: basic.owner: no account named \"x\"", counted from 1. Empty
    // when all was stored.
    std::string problem;
};

// Stores the tasks of the array, all or none. A task without an id, or with the id -1, is a new
// one. The id of a stored task replaces that task. Any other id is kept when it has never been
// given here, as when a store is copied to an empty appliance, but refused when it is higher than
// kHighestImportedId; otherwise the task gets a new one.
ImportResult ImportTasks(TaskStore& store, std::string_view json);

// All tasks by id, indented, ended by a newline.
std::string ExportTasks(const Snapshot& tasks);

// One line a task, by id, below a line of titles.
std::string TaskOverview(const Snapshot& tasks);

}  // namespace orva
