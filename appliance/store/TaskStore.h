#pragma once

#include <absl/time/time.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "appliance/store/Database.h"
#include "appliance/store/MachineZone.h"
#include "appliance/store/NextStartTime.h"
#include "appliance/store/Snapshot.h"
#include "appliance/store/TaskData.h"

namespace orva {

// The stored tasks of one appliance. A change is on disk when its function returns, and every
// process that uses the same database sees it from then on.
//
// Functions throw StoreFailure; failures of the database have been logged with its path by then.
// Threads: any.
class TaskStore {
  public:
    struct Options {
        // How long to wait for another process that holds the database.
        std::chrono::milliseconds busyTimeout{5000};
        // What time it is.
        std::function<absl::Time()> clock;
    };

    static constexpr const char* kDatabaseFile = "/usr/orva/var/tasks.db";

    // The store below the root of this program. Opens nothing yet.
    static std::shared_ptr<TaskStore> Current();
    // For Current() from now on; the present store is let go. Belongs to a program's start.
    static void Configure(const Options& options);

    explicit TaskStore(std::string databaseFile, const Options& optionsToUse);

    // The stored task; null when there is none. A web-API call that asks again for the task that it
    // asked for last gets what it got then, unless it has changed tasks itself meanwhile.
    SharedTask Find(int id);

    // All stored tasks as they are now. The same object as long as nothing changes. Damaged ones
    // are left out, and logged when they are found.
    std::shared_ptr<const Snapshot> CurrentSnapshot();

    // Stores the task, as a new one when its id is kNewTaskId. Yields its id. Fails when the stored
    // task that it is to replace is gone.
    int Save(const TaskData& task);

    // Changes the stored task with the id of `base` in what `changed` differs from `base`, and in
    // nothing else: what others changed since `base` was read stays. Yields the task as it is
    // stored now. Fails when it is gone.
    SharedTask Change(const TaskData& base, const TaskData& changed);

    // Fails when there is no such task.
    void Remove(int id);

    // Has the scheduler start the task now. Fails when there is no such task, when it has no
    // command, and while no scheduler is running.
    void QueueRun(int id);

    // Stores all or none. A task with the id of a stored one replaces it. Any other keeps its id
    // when that has never been given here, and gets the next free one otherwise. No id may come
    // twice.
    void SaveAll(const std::vector<TaskData>& tasks);

    absl::Time Now() const { return options.clock(); }
    absl::TimeZone Zone() { return zone.Now(); }

    // The account that the folder of the tasks belongs to; nothing before it has been used.
    std::optional<uid_t> FolderOwner() { return database.FolderOwner(); }

    // The database that the tasks stand in, for what else is kept there. Lives as long as the
    // store.
    Database& UsedDatabase() { return database; }

  private:
    std::shared_ptr<const Snapshot> RefreshSnapshot(const absl::TimeZone& zoneNow, absl::Time now);
    std::vector<SharedTask> ReadTasks(std::vector<DamagedTask>& damaged);
    void LogDamaged(const std::vector<DamagedTask>& damaged) const;

    Options options;
    MachineZone zone;
    Database database;

    // What the snapshot was read through and when. The observer never writes, so that its data
    // version counts every change by anybody.
    std::mutex snapshotMutex;
    std::unique_ptr<Connection> observer;
    std::uint64_t observedGeneration = 0;
    std::int64_t dataVersion = 0;
    std::int64_t newestChange = 0;
    std::shared_ptr<const Snapshot> snapshot;
};

}  // namespace orva
