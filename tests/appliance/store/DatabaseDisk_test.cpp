// What a database on a full or read-only disk fails with.
#include <SQLiteCpp/SQLiteCpp.h>
#include <sys/mount.h>

#include <filesystem>
#include <fstream>
#include <string>

#include "tests/appliance/store/DatabaseTest.h"

namespace {

using orva::TaskStore;
using DatabaseDiskTest = DatabaseTest;

TEST_F(DatabaseDiskTest, AReadOnlyFileSystemIsReportedAsThat) {
    TaskStore::Current()->Save(SampleTask("a"));
    TaskStore::Configure({});
    EXPECT_EQ(
        InOwnMounts([this]() -> std::string {
            const std::string directory = RootPath() + "/usr/orva/var";
            // Root writes through mode bits, but not through a mount.
            if (::mount(directory.c_str(), directory.c_str(), nullptr, MS_BIND, nullptr) != 0 ||
                ::mount("none", directory.c_str(), nullptr, MS_BIND | MS_REMOUNT | MS_RDONLY,
                        nullptr) != 0) {
                return "cannot mount";
            }
            const Failed failed = Saving();
            if (failed.code != orva::kErrDatabaseFull) {
                return "code " + std::to_string(failed.code);
            }
            const std::string expected =
                "task store " + DatabasePath() + ": cannot be written to: Read-only file system";
            return failed.log == expected ? "" : failed.log;
        }),
        "");
    EXPECT_EQ(Count(), 1U);
}

TEST_F(DatabaseDiskTest, ADatabaseThatCannotBeCreatedOnAReadOnlyFileSystemSaysSo) {
    EXPECT_EQ(InOwnMounts([this]() -> std::string {
                  if (::mount("none", RootPath().c_str(), "tmpfs", MS_RDONLY, nullptr) != 0) {
                      return "cannot mount";
                  }
                  const Failed failed = Listing();
                  return failed.code == orva::kErrDatabaseFull ? "" : failed.log;
              }),
              "");
}

TEST_F(DatabaseDiskTest, AFullDiskLosesNothingThatWasAcknowledged) {
    EXPECT_EQ(InOwnMounts([this]() -> std::string {
                  if (::mount("none", RootPath().c_str(), "tmpfs", 0, "size=2m") != 0) {
                      return "cannot mount";
                  }
                  orva::TaskData task = SampleTask("a");
                  task.appArgs = std::string(20000, 'x');
                  std::size_t saved = 0;
                  Failed failed;
                  while (failed.code == 0 && saved < 1000) {
                      failed = Trying([&task] { TaskStore::Current()->Save(task); });
                      saved += failed.code == 0 ? 1 : 0;
                  }
                  if (failed.code != orva::kErrDatabaseFull) {
                      return "code " + std::to_string(failed.code) + ": " + failed.log;
                  }
                  if (failed.log != "task store " + DatabasePath() + ": database or disk is full") {
                      return failed.log;
                  }
                  Reopen();
                  if (saved == 0 || Count() != saved) {
                      return "stored " + std::to_string(Count()) + " of " + std::to_string(saved);
                  }
                  TaskStore::Configure({});
                  SQLite::Database database(DatabasePath(), SQLite::OPEN_READWRITE);
                  return database.execAndGet("PRAGMA integrity_check").getString() == "ok"
                             ? ""
                             : "not intact";
              }),
              "");
}

TEST_F(DatabaseDiskTest, AFullDiskFromTheStartIsReportedAsThat) {
    EXPECT_EQ(InOwnMounts([this]() -> std::string {
                  if (::mount("none", RootPath().c_str(), "tmpfs", 0, "size=64k") != 0) {
                      return "cannot mount";
                  }
                  std::ofstream filler(RootPath() + "/filler");
                  while (filler.put('x').flush()) {
                  }
                  const Failed failed = Listing();
                  return failed.code == orva::kErrDatabaseFull
                             ? ""
                             : std::to_string(failed.code) + " " + failed.log;
              }),
              "");
}

TEST_F(DatabaseDiskTest, AFullDiskThatKeepsAStoredDatabaseFromBeingReadIsReportedAsThat) {
    EXPECT_EQ(
        InOwnMounts([this]() -> std::string {
            if (::mount("none", RootPath().c_str(), "tmpfs", 0, "size=1m") != 0) {
                return "cannot mount";
            }
            TaskStore::Current()->Save(SampleTask("a"));
            TaskStore::Configure({});
            Reopen();
            std::ofstream filler(RootPath() + "/filler");
            while (filler.put('x').flush()) {
            }
            for (const Failed& failed : {Listing(), Saving()}) {
                if (failed.code != orva::kErrDatabaseFull ||
                    failed.log != "task store " + DatabasePath() + ": no space left for its log") {
                    return std::to_string(failed.code) + " " + failed.log;
                }
            }
            std::filesystem::resize_file(RootPath() + "/filler", 0);
            return Count() == 1 ? "" : "not readable again";
        }),
        "");
}

}  // namespace
