#pragma once

#include "platform/qlibc.h"

namespace orva {

// The codes of the last error, as they stand in the log.
enum ErrorCode : int {
    kErrNoMemory = 0x0200,
    kErrNotFound = 0x0300,         // no such task, share, account, ...
    kErrNotAllowed = 0x0400,       // the object's own rules forbid it
    kErrSystem = 0x0500,           // a system call failed
    kErrDatabase = 0x0600,         // the task store's database failed
    kErrDatabaseBusy = 0x0601,     // another process held it longer than the timeout
    kErrDatabaseCorrupt = 0x0602,  // not a database, or a damaged one
    kErrDatabaseVersion = 0x0603,  // written by a newer version of this program
    kErrDatabaseFull = 0x0604,     // no space left, or a read-only file system
    kErrNoScheduler = 0x0700,      // no scheduler is running
    kErrBadDocument = 0x0800,      // a document or file has the wrong form
    kErrBadArgument = 0x0D00,
    kErrTooLong = 0x0E00,  // the result does not fit
};

// Records `code` as this thread's last error, raised at the caller's line, and yields -1.
inline int Fail(ErrorCode code, const char* file = __builtin_FILE(), int line = __builtin_LINE()) {
    const char* base = file;
    for (const char* at = file; *at != '\0'; ++at) {
        if (*at == '/') {
            base = at + 1;
        }
    }
    QLIBCErrSetEx(code, base, line);
    return -1;
}

}  // namespace orva
