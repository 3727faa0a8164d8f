#include "tests/appliance/runs/RunTest.h"

#include <SQLiteCpp/SQLiteCpp.h>

#include <array>

RunTest::RunTest() { orva::TaskStore::Current()->CurrentSnapshot(); }

std::int64_t RunTest::AddRun(const std::string& columns, const std::string& values) const {
    struct Default {
        const char* column;
        const char* value;
    };
    constexpr std::array<Default, 6> kDefaults = {{{"task", "1"},
                                                   {"reason", "'hand'"},
                                                   {"state", "'ended'"},
                                                   {"queued_at", "0"},
                                                   {"asked_program", "''"},
                                                   {"asked_account", "''"}}};
    std::string allColumns = columns;
    std::string allValues = values;
    for (const Default& each : kDefaults) {
        if ((", " + columns + ",").find(", " + std::string(each.column) + ",") ==
            std::string::npos) {
            allColumns += (allColumns.empty() ? "" : ", ") + std::string(each.column);
            allValues += (allValues.empty() ? "" : ", ") + std::string(each.value);
        }
    }
    SQLite::Database database(DatabasePath(), SQLite::OPEN_READWRITE, 30000);
    database.exec("INSERT INTO run (" + allColumns + ") VALUES (" + allValues + ")");
    return database.getLastInsertRowid();
}

void RunTest::Execute(const std::string& sql) const {
    SQLite::Database(DatabasePath(), SQLite::OPEN_READWRITE, 30000).exec(sql);
}
