// The task store for verbs that only read it: a database that is not there yet is not made.
#pragma once

#include <memory>

#include "appliance/store/Snapshot.h"

namespace orva {

// False, with a complaint, when the root has not even the folder of a task store: it is most likely
// mistyped.
[[nodiscard]] bool HasStoreFolder();

// Whether there is a database in it. An appliance gets one with its first task.
[[nodiscard]] bool HasDatabase();

// All tasks; none while there is no database. Throws StoreFailure.
std::shared_ptr<const Snapshot> TasksToRead();

}  // namespace orva
