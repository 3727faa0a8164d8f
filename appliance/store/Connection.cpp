#include "appliance/store/Connection.h"

#include <SQLiteCpp/Exception.h>
#include <sqlite3.h>

#include <algorithm>
#include <random>
#include <thread>

#include "appliance/store/StoreFailure.h"

namespace orva {
namespace {

// Pages are cached by the kernel anyway; a large cache in each connection only costs memory.
constexpr const char* kSettings =
    "PRAGMA synchronous = FULL;"
    "PRAGMA cache_size = -512;"
    "PRAGMA journal_size_limit = 4194304;"
    "PRAGMA temp_store = MEMORY;"
    "PRAGMA trusted_schema = OFF;";

constexpr std::chrono::microseconds kLongestWait{1000};

constexpr const char* kWriteAheadLog = "wal";

}  // namespace

Connection::Connection(const std::string& file, std::chrono::milliseconds busyTimeout)
    : patience(busyTimeout), database(file, SQLite::OPEN_READWRITE | SQLite::OPEN_NOMUTEX) {
    sqlite3_busy_handler(
        database.getHandle(),
        [](void* connection, int attempts) {
            return static_cast<Connection*>(connection)->WaitForOthers(attempts);
        },
        this);
    database.exec(kSettings);
}

// SQLite's own way of waiting sleeps longer each time, up to a tenth of a second. Whoever waits
// here is the next to write (see Database::NextWriter), and all others wait with it: short sleeps
// let it begin soon after the lock is free, and uneven ones fall into step with nobody who does not
// queue.
int Connection::WaitForOthers(int attempts) {
    const auto now = std::chrono::steady_clock::now();
    if (attempts == 0) {
        waitingSince = now;
    } else if (now - waitingSince >= patience) {
        return 0;
    }
    thread_local std::minstd_rand random(std::random_device{}());
    std::uniform_int_distribution<std::chrono::microseconds::rep> wait(1, kLongestWait.count());
    std::this_thread::sleep_for(std::chrono::microseconds(wait(random)));
    return 1;
}

Query Connection::Prepare(const char* sql) {
    auto found = std::find_if(statements.begin(), statements.end(),
                              [sql](const Prepared& each) { return each.sql == sql; });
    if (found == statements.end()) {
        statements.push_back({sql, SQLite::Statement(database, sql)});
        found = std::prev(statements.end());
    }
    return Query(found->statement);
}

void Connection::Execute(const std::string& sql) { database.exec(sql); }

bool Connection::HasWriteAheadLog() {
    SQLite::Statement statement(database, "PRAGMA journal_mode");
    return statement.executeStep() && statement.getColumn(0).getString() == kWriteAheadLog;
}

void Connection::UseWriteAheadLog() {
    SQLite::Statement statement(database, "PRAGMA journal_mode = WAL");
    if (!statement.executeStep() || statement.getColumn(0).getString() != kWriteAheadLog) {
        throw StoreFailure(kErrDatabase, "its file system supports no write-ahead log");
    }
}

Transaction::Transaction(Connection& connectionToUse) : connection(connectionToUse) {
    connection.Prepare("BEGIN IMMEDIATE")->exec();
}

Transaction::~Transaction() {
    if (!open) {
        return;
    }
    try {
        connection.Prepare("ROLLBACK")->exec();
    } catch (const SQLite::Exception&) {
        // SQLite has rolled back by itself after an error such as a full disk.
    }
}

void Transaction::Commit() {
    connection.Prepare("COMMIT")->exec();
    open = false;
}

ReadTransaction::ReadTransaction(Connection& connectionToUse) : connection(connectionToUse) {
    connection.Prepare("BEGIN")->exec();
}

ReadTransaction::~ReadTransaction() {
    try {
        connection.Prepare("COMMIT")->exec();
    } catch (const SQLite::Exception&) {
        // Nothing was written; the connection is dropped after a failure.
    }
}

}  // namespace orva
