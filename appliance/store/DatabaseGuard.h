#pragma once

#include <SQLiteCpp/Exception.h>

#include "appliance/store/Database.h"
#include "appliance/store/StoreFailure.h"

namespace orva {

// Raised at that line.
[[noreturn]] void ThrowAsStoreFailure(const SQLite::Exception& error, const char* file, int line);

// One line in the log when the database is at fault.
void LogFailure(const Database& database, const StoreFailure& failure);

// Runs `operation` on the database and yields its result. Turns what SQLite reports into a
// StoreFailure of the caller's line, and logs what is the database's fault.
template <class Operation>
auto Guarded(const Database& database, Operation operation, const char* file = __builtin_FILE(),
             int line = __builtin_LINE()) -> decltype(operation()) {
    try {
        try {
            return operation();
        } catch (const SQLite::Exception& error) {
            ThrowAsStoreFailure(error, file, line);
        }
    } catch (const StoreFailure& failure) {
        LogFailure(database, failure);
        throw;
    }
}

}  // namespace orva
