#pragma once

#include "appliance/store/Connection.h"

namespace orva {

// Whether the database holds the current schema; false when it is empty or of an older version.
// Throws StoreFailure, with the database untouched, when a newer version of this program or another
// program wrote it.
bool IsSchemaCurrent(Connection& connection);

// Brings the database to the current schema, in one transaction. Safe to call by several processes.
void MigrateSchema(Connection& connection);

}  // namespace orva
