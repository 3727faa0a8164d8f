#include "appliance/store/DatabaseGuard.h"

#include <sqlite3.h>
#include <syslog.h>

namespace orva {
namespace {

ErrorCode CodeOf(const SQLite::Exception& error) {
    switch (error.getErrorCode()) {
        case SQLITE_BUSY:
        case SQLITE_LOCKED:
            return kErrDatabaseBusy;
        case SQLITE_CORRUPT:
        case SQLITE_NOTADB:
            return kErrDatabaseCorrupt;
        case SQLITE_FULL:
        case SQLITE_READONLY:
            return kErrDatabaseFull;
        case SQLITE_NOMEM:
            return kErrNoMemory;
        default:
            break;
    }
    switch (error.getExtendedErrorCode()) {
        // The index of the log could not be made: on a full disk, nearly always.
        case SQLITE_IOERR_SHMSIZE:
        case SQLITE_IOERR_SHMOPEN:
            return kErrDatabaseFull;
        case SQLITE_IOERR_SHORT_READ:
        case SQLITE_IOERR_CORRUPTFS:
            return kErrDatabaseCorrupt;
        default:
            return kErrDatabase;
    }
}

}  // namespace

void ThrowAsStoreFailure(const SQLite::Exception& error) {
    throw StoreFailure(CodeOf(error), error.what());
}

void LogFailure(const Database& database, const StoreFailure& failure) {
    if (failure.IsOfDatabase()) {
        syslog(LOG_ERR, "task store %s: %s", database.File().c_str(), failure.what());
    }
}

}  // namespace orva
