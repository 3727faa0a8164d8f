#include "appliance/store/DatabaseGuard.h"

#include <sqlite3.h>
#include <syslog.h>

namespace orva {
namespace {

// Whether the index of the log could not be made: on a full disk, nearly always.
bool IsWithoutLogIndex(const SQLite::Exception& error) {
    return error.getExtendedErrorCode() == SQLITE_IOERR_SHMSIZE ||
           error.getExtendedErrorCode() == SQLITE_IOERR_SHMOPEN;
}

ErrorCode CodeOf(const SQLite::Exception& error) {
    if (IsWithoutLogIndex(error)) {
        return kErrDatabaseFull;
    }
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
        case SQLITE_IOERR_SHORT_READ:
        case SQLITE_IOERR_CORRUPTFS:
            return kErrDatabaseCorrupt;
        default:
            return kErrDatabase;
    }
}

}  // namespace

void ThrowAsStoreFailure(const SQLite::Exception& error, const char* file, int line) {
    // SQLite's own words for it are "disk I/O error".
    const char* reason = IsWithoutLogIndex(error) ? "no space left for its log" : error.what();
    throw StoreFailure(CodeOf(error), reason, file, line);
}

void LogFailure(const Database& database, const StoreFailure& failure) {
    if (failure.IsOfDatabase()) {
        syslog(LOG_ERR, "task store %s: %s", database.File().c_str(), failure.what());
    }
}

}  // namespace orva
