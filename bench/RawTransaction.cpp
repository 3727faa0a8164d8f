#include "bench/RawTransaction.h"

namespace orva {

SQLite::Database CopyDatabase(const std::filesystem::path& original,
                              const std::filesystem::path& copy) {
    SQLite::Database(original.string(), SQLite::OPEN_READONLY)
        .exec("VACUUM INTO '" + copy.string() + "'");
    SQLite::Database database(copy.string(), SQLite::OPEN_READWRITE);
    database.exec("PRAGMA journal_mode=WAL; PRAGMA synchronous=FULL");
    return database;
}

RawTransaction::RawTransaction(SQLite::Database& database,
                               std::initializer_list<const char*> statements)
    : begin(database, "BEGIN IMMEDIATE"), commit(database, "COMMIT") {
    for (const char* statement : statements) {
        changes.emplace_back(database, statement);
    }
    changes.emplace_back(database, "INSERT INTO task_change (task) VALUES (?)");
}

void RawTransaction::Run(int id) {
    begin.exec();
    begin.reset();
    for (SQLite::Statement& change : changes) {
        change.bind(1, id);
        change.exec();
        change.reset();
    }
    commit.exec();
    commit.reset();
}

}  // namespace orva
