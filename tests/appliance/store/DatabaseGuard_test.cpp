#include "appliance/store/DatabaseGuard.h"

#include <gmock/gmock.h>
#include <sqlite3.h>

#include <string>
#include <utility>
#include <vector>

#include "tests/appliance/store/StoreTest.h"

namespace {

using testing::ElementsAre;

class DatabaseGuardTest : public StoreTest {
  protected:
    orva::Database database{DatabasePath(), std::chrono::seconds(5)};
};

TEST_F(DatabaseGuardTest, YieldsWhatTheOperationDoes) {
    EXPECT_EQ(orva::Guarded(database, [] { return std::string("done"); }), "done");
}

TEST_F(DatabaseGuardTest, AFailureOfTheDatabaseIsLoggedAndRaisedWhereItWasAskedFor) {
    TakeLog();
    int line = 0;
    try {
        line = __LINE__ + 1;
        orva::Guarded(database, [] { throw SQLite::Exception("database is locked", SQLITE_BUSY); });
        ADD_FAILURE() << "nothing was thrown";
    } catch (const orva::StoreFailure& failure) {
        EXPECT_EQ(failure.Code(), 0x0601);
        EXPECT_STREQ(failure.what(), "database is locked");
        EXPECT_THAT(failure.File(), testing::EndsWith("/DatabaseGuard_test.cpp"));
        EXPECT_EQ(failure.Line(), line);
    }
    EXPECT_THAT(TakeLog(), ElementsAre("task store " + DatabasePath() + ": database is locked"));
}

TEST_F(DatabaseGuardTest, TheLastErrorNamesTheStoresFunctionAndNotTheGuard) {
    Write("/usr/orva/var/tasks.db", std::string(5000, 'x'));
    const Record task;
    EXPECT_LT(ORVASchedTaskLoad(1, task.Get()), 0);
    EXPECT_EQ(QLIBCErrGet(), 0x0602);
    EXPECT_STREQ(QLIBCErrorGetFile(), "TaskStore.cpp");
    EXPECT_GT(QLIBCErrorGetLine(), 0);
}

TEST_F(DatabaseGuardTest, TellsTheKindsOfFailureApart) {
    for (const auto& [reported, code] : std::vector<std::pair<int, int>>{{SQLITE_ERROR, 0x0600},
                                                                         {SQLITE_BUSY, 0x0601},
                                                                         {SQLITE_LOCKED, 0x0601},
                                                                         {SQLITE_CORRUPT, 0x0602},
                                                                         {SQLITE_NOTADB, 0x0602},
                                                                         {SQLITE_FULL, 0x0604},
                                                                         {SQLITE_READONLY, 0x0604},
                                                                         {SQLITE_NOMEM, 0x0200},
                                                                         {SQLITE_IOERR, 0x0600}}) {
        try {
            orva::Guarded(database,
                          [reported = reported] { throw SQLite::Exception("x", reported); });
            ADD_FAILURE() << "nothing was thrown for " << reported;
        } catch (const orva::StoreFailure& failure) {
            EXPECT_EQ(failure.Code(), code) << reported;
        }
    }
}

TEST_F(DatabaseGuardTest, AFailureOfTheCallerPassesUnlogged) {
    TakeLog();
    EXPECT_THROW(
        orva::Guarded(database, [] { throw orva::StoreFailure(orva::kErrNotFound, "no task 7"); }),
        orva::StoreFailure);
    EXPECT_THAT(TakeLog(), ElementsAre());
}

}  // namespace
