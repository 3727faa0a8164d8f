// Creating and checking the file of a database, before SQLite sees it. Functions throw
// StoreFailure.
#pragma once

#include <chrono>
#include <string>

#include "appliance/util/FileDescriptor.h"

namespace orva {

// Creates the directory of `file`, below the appliance's root only, where it is missing.
void CreateDatabaseDirectory(const std::string& file);

// Creates an empty `file` where there is none.
void CreateDatabaseFile(const std::string& file);

// Throws unless `file` is a regular file that this program may write to. Opens nothing: closing a
// descriptor of the file would drop the locks that SQLite holds on it in this process.
void CheckDatabaseFile(const std::string& file);

// Opens the directory of `file`.
FileDescriptor OpenDatabaseDirectory(const std::string& file);

// Holds the lock of the directory of `file`, under which its processes create the database, bring
// it to another schema or clear away what is left of a former one. Released with the descriptor.
FileDescriptor LockDatabaseDirectory(const std::string& file, std::chrono::milliseconds timeout);

}  // namespace orva
