#pragma once

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Statement.h>

#include <deque>
#include <filesystem>
#include <initializer_list>

namespace orva {

// A copy of a task database under SQLite alone, with the store's durability.
SQLite::Database CopyDatabase(const std::filesystem::path& original,
                              const std::filesystem::path& copy);

// The floor of a change: prepared statements in one transaction, and the row that says in the same
// transaction which task changed. It writes what the store writes, without everything around it.
class RawTransaction {
  public:
    // Each statement has one parameter, the id of a task.
    RawTransaction(SQLite::Database& database, std::initializer_list<const char*> statements);

    void Run(int id);

  private:
    SQLite::Statement begin;
    std::deque<SQLite::Statement> changes;
    SQLite::Statement commit;
};

}  // namespace orva
