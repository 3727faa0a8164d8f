// The fixture of the tests of a database that cannot be used.
#pragma once

#include <gmock/gmock.h>
#include <sys/stat.h>

#include <chrono>
#include <string>
#include <thread>
#include <vector>

#include "appliance/store/DatabaseFile.h"
#include "appliance/store/StoreFailure.h"
#include "tests/appliance/store/StoreTest.h"

class DatabaseTest : public StoreTest {
  protected:
    static std::size_t Count() { return orva::TaskStore::Current()->CurrentSnapshot()->Count(); }

    // What an operation on the store fails with, and the one line that it logs.
    struct Failed {
        int code = 0;
        std::string log;
    };
    static Failed Saving() {
        return Trying([] { orva::TaskStore::Current()->Save(SampleTask("x")); });
    }
    static Failed Listing() {
        return Trying([] { orva::TaskStore::Current()->CurrentSnapshot(); });
    }
    template <class Operation>
    static Failed Trying(Operation operation) {
        TakeLog();
        Failed failed;
        try {
            operation();
        } catch (const orva::StoreFailure& failure) {
            failed.code = failure.Code();
        }
        const std::vector<std::string> log = TakeLog();
        failed.log = log.size() == 1 ? log[0] : std::to_string(log.size()) + " log lines";
        return failed;
    }

    // Whether nobody sets the database up or waits for his turn to write.
    bool CanLockDirectory() const {
        try {
            return orva::LockDatabaseDirectory(DatabasePath(), std::chrono::milliseconds(0))
                .IsOpen();
        } catch (const orva::StoreFailure&) {
            return false;
        }
    }

    template <class Condition>
    static bool BecomesTrue(Condition condition) {
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(60);
        while (!condition()) {
            if (std::chrono::steady_clock::now() > deadline) {
                return false;
            }
            std::this_thread::yield();
        }
        return true;
    }

    // Both kinds of use fail in the same way, and the file keeps its bytes.
    void ExpectRefused(int code, const std::string& reason) const {
        const std::string before = Read("/usr/orva/var/tasks.db");
        for (const Failed& failed : {Listing(), Saving()}) {
            EXPECT_EQ(failed.code, code);
            EXPECT_THAT(failed.log, testing::HasSubstr("task store " + DatabasePath() + ": "));
            EXPECT_THAT(failed.log, testing::HasSubstr(reason));
        }
        EXPECT_EQ(Read("/usr/orva/var/tasks.db"), before);
    }

    static int ModeOf(const std::string& path) {
        struct stat status {};
        return ::stat(path.c_str(), &status) == 0 ? static_cast<int>(status.st_mode & 07777) : -1;
    }
};
