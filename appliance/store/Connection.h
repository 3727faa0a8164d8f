#pragma once

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Statement.h>

#include <chrono>
#include <cstdint>
#include <deque>
#include <string>

namespace orva {

// A prepared statement in use. Reset at the end, so that it holds no lock longer than its user.
class Query {
  public:
    explicit Query(SQLite::Statement& preparedStatement) : statement(&preparedStatement) {}
    ~Query() { statement->tryReset(); }
    Query(const Query&) = delete;
    Query& operator=(const Query&) = delete;

    SQLite::Statement* operator->() { return statement; }
    SQLite::Statement& operator*() { return *statement; }

  private:
    SQLite::Statement* statement;
};

// One connection to a database file with the statements that were prepared on it. Every function
// throws when the database fails: SQLite::Exception, or StoreFailure with a reason of our own.
// Belongs to one thread at a time.
class Connection {
  public:
    // Opens an existing file and changes nothing in it. A statement that finds the database locked
    // by others tries again for as long as `busyTimeout`.
    Connection(const std::string& file, std::chrono::milliseconds busyTimeout);
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    // The statement, prepared at its first use and kept. `sql` must be a literal: it is known by
    // its address. One user at a time for each literal.
    Query Prepare(const char* sql);

    // Runs statements that have no result and are seldom needed.
    void Execute(const std::string& sql);

    bool HasWriteAheadLog();

    // Has the database keep a write-ahead log. Throws when it cannot.
    void UseWriteAheadLog();

    std::int64_t LastInsertId() const { return database.getLastInsertRowid(); }
    int Changes() const { return database.getChanges(); }

  private:
    struct Prepared {
        const char* sql;
        SQLite::Statement statement;
    };

    int WaitForOthers(int attempts);

    const std::chrono::milliseconds patience;
    std::chrono::steady_clock::time_point waitingSince;
    SQLite::Database database;
    // A deque: statements in use must not move.
    std::deque<Prepared> statements;
};

// A transaction that may write. It takes the write lock at once: a transaction that begins by
// reading and then wants to write fails at once when somebody else is writing, whatever the busy
// timeout. Rolled back at the end unless it was committed.
class Transaction {
  public:
    explicit Transaction(Connection& connectionToUse);
    ~Transaction();
    Transaction(const Transaction&) = delete;
    Transaction& operator=(const Transaction&) = delete;

    void Commit();

  private:
    Connection& connection;
    bool open = true;
};

// A transaction that only reads: all its statements see the same state.
class ReadTransaction {
  public:
    explicit ReadTransaction(Connection& connectionToUse);
    ~ReadTransaction();
    ReadTransaction(const ReadTransaction&) = delete;
    ReadTransaction& operator=(const ReadTransaction&) = delete;

  private:
    Connection& connection;
};

}  // namespace orva
