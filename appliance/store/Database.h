#pragma once

#include <sys/types.h>

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "appliance/store/Connection.h"
#include "appliance/util/FileDescriptor.h"

namespace orva {

// The database file of a task store and the connections to it. The file is created, with its
// directory, when it is missing; brought to the current schema when it is older; and left alone
// when it is anything else. A file that was replaced or removed while connections to it were open
// is noticed at the next use.
//
// Functions throw SQLite::Exception and StoreFailure. Threads: any.
class Database {
  public:
    Database(std::string databaseFile, std::chrono::milliseconds busyTimeoutToUse);
    ~Database();
    Database(const Database&) = delete;
    Database& operator=(const Database&) = delete;

    const std::string& File() const { return file; }

    // Counts the files that have stood at the path. Whoever keeps a connection or what was read
    // through one asks here first and starts anew when the number is another one.
    std::uint64_t Generation();

    // The account that the database's folder belonged to when the database was opened; nothing
    // before that.
    std::optional<uid_t> FolderOwner();

    // A connection of the caller's own.
    std::unique_ptr<Connection> Open();

    // A connection borrowed from the pool, given back at the end. One that failed is closed
    // instead.
    class Lease {
      public:
        explicit Lease(Database& owner);
        ~Lease();
        Lease(const Lease&) = delete;
        Lease& operator=(const Lease&) = delete;
        Connection& operator*() { return *connection; }

      private:
        Database& database;
        std::uint64_t generation;
        int exceptions;
        std::unique_ptr<Connection> connection;
    };

    // The right of one thread of this process to write. Waiting here is fair and wakes at once;
    // waiting for SQLite's lock means asking again and again.
    class WriteTurn {
      public:
        explicit WriteTurn(Database& owner);
        ~WriteTurn();
        WriteTurn(const WriteTurn&) = delete;
        WriteTurn& operator=(const WriteTurn&) = delete;

      private:
        Database& database;
    };

    // The right of one process to be the next that writes, wanted until its transaction has begun.
    // SQLite lets whoever asks at the right moment write, which is nearly always the one that wrote
    // last: others would wait for seconds beside a process that writes without pause. Held as the
    // lock of the database's directory; where its file system has none, everybody is the next.
    class NextWriter {
      public:
        explicit NextWriter(Database& owner);
        ~NextWriter() { Yield(); }
        NextWriter(const NextWriter&) = delete;
        NextWriter& operator=(const NextWriter&) = delete;

        // Lets the others queue up.
        void Yield();

      private:
        std::shared_ptr<const FileDescriptor> directory;
    };

  private:
    struct FileId {
        std::uint64_t device = 0;
        std::uint64_t inode = 0;
        bool operator==(const FileId&) const = default;
    };

    static FileId Identify(const std::string& path);
    void CheckFile();
    void ForgetFile();
    std::unique_ptr<Connection> OpenLocked();
    void Prepare(Connection& connection);

    const std::string file;
    const std::chrono::milliseconds busyTimeout;

    std::mutex mutex;
    std::condition_variable connectionGivenBack;
    std::vector<std::unique_ptr<Connection>> idle;
    std::size_t borrowed = 0;
    std::uint64_t generation = 1;
    // The file that the connections of this generation belong to, and its log; zero before the
    // first one is open.
    FileId openFile;
    FileId openLog;
    // Of this generation's file; null before the first connection is open.
    std::shared_ptr<const FileDescriptor> directory;
    std::optional<uid_t> folderOwner;

    std::mutex turnMutex;
    std::condition_variable turnGivenBack;
    bool turnTaken = false;
};

// A borrowed connection in a transaction that may write.
class WriteTransaction {
  public:
    explicit WriteTransaction(Database& database)
        : turn(database), lease(database), next(database), transaction(*lease) {
        next.Yield();
    }
    Connection& operator*() { return *lease; }
    void Commit() { transaction.Commit(); }

  private:
    Database::WriteTurn turn;
    Database::Lease lease;
    Database::NextWriter next;
    Transaction transaction;
};

}  // namespace orva
