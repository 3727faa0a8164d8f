#pragma once

#include <SQLiteCpp/Exception.h>

#include "appliance/store/Database.h"
#include "appliance/store/StoreFailure.h"

namespace orva {

[[noreturn]] void ThrowAsStoreFailure(const SQLite::Exception& error);

// One line in the log when the database is at fault.
void LogFailure(const Database& database, const StoreFailure& failure);

// Runs `operation` on the database and yields its result. Turns what SQLite reports into a
// StoreFailure, and logs what is the database's fault.
template <class Operation>
auto Guarded(const Database& database, Operation operation) -> decltype(operation()) {
    try {
        try {
            return operation();
        } catch (const SQLite::Exception& error) {
            ThrowAsStoreFailure(error);
        }
    } catch (const StoreFailure& failure) {
        LogFailure(database, failure);
        throw;
    }
}

}  // namespace orva
