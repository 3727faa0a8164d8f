#include "appliance/store/TaskStore.h"

#include <SQLiteCpp/Exception.h>
#include <absl/time/clock.h>
#include <errno.h>
#include <sqlite3.h>
#include <syslog.h>

#include <algorithm>
#include <cstdlib>
#include <utility>

#include "appliance/root/Root.h"
#include "appliance/store/Accounts.h"
#include "appliance/store/SchedulerLink.h"
#include "appliance/store/StoreFailure.h"
#include "appliance/store/TaskTable.h"

namespace orva {
namespace {

// Reading single tasks costs more than reading all of them when it is a good part of them.
constexpr std::int64_t kMostChangesToFollow = 1000;

ErrorCode CodeOf(const SQLite::Exception& error) {
    switch (error.getErrorCode()) {
        case SQLITE_BUSY:
        case SQLITE_LOCKED:
            return kErrDatabaseBusy;
        case SQLITE_CORRUPT:
        case SQLITE_NOTADB:
            return kErrDatabaseCorrupt;
        case SQLITE_FULL:
        case SQLITE_READONLY:
            return kErrDatabaseFull;
        case SQLITE_NOMEM:
            return kErrNoMemory;
        default:
            break;
    }
    switch (error.getExtendedErrorCode()) {
        // The index of the log could not be made: on a full disk, nearly always.
        case SQLITE_IOERR_SHMSIZE:
        case SQLITE_IOERR_SHMOPEN:
            return kErrDatabaseFull;
        case SQLITE_IOERR_SHORT_READ:
        case SQLITE_IOERR_CORRUPTFS:
            return kErrDatabaseCorrupt;
        default:
            return kErrDatabase;
    }
}

struct Stores {
    std::mutex mutex;
    TaskStore::Options options;
    std::string file;
    std::shared_ptr<TaskStore> store;
};

// Never destroyed: threads may still ask for the store while the program ends. The store itself is
// closed then, so that its log is folded into the database.
Stores& TheStores() {
    static Stores* stores = [] {
        std::atexit([] { TaskStore::Configure({}); });
        return new Stores;
    }();
    return *stores;
}

}  // namespace

std::shared_ptr<TaskStore> TaskStore::Current() {
    std::string file = ResolvePath(kDatabaseFile);
    Stores& stores = TheStores();
    std::shared_ptr<TaskStore> former;
    const std::lock_guard lock(stores.mutex);
    if (stores.store == nullptr || stores.file != file) {
        former = std::exchange(stores.store, std::make_shared<TaskStore>(file, stores.options));
        stores.file = std::move(file);
    }
    return stores.store;
}

void TaskStore::Configure(const Options& options) {
    Stores& stores = TheStores();
    std::shared_ptr<TaskStore> former;
    const std::lock_guard lock(stores.mutex);
    stores.options = options;
    former = std::move(stores.store);
}

TaskStore::TaskStore(std::string databaseFile, const Options& optionsToUse)
    : options(optionsToUse), database(std::move(databaseFile), optionsToUse.busyTimeout) {
    if (!options.clock) {
        options.clock = [] { return absl::Now(); };
    }
}

// Turns what SQLite reports into a StoreFailure, and logs what is the database's fault.
template <class Operation>
auto TaskStore::Guarded(Operation operation) -> decltype(operation()) {
    try {
        try {
            return operation();
        } catch (const SQLite::Exception& error) {
            throw StoreFailure(CodeOf(error), error.what());
        }
    } catch (const StoreFailure& failure) {
        if (failure.IsOfDatabase()) {
            syslog(LOG_ERR, "task store %s: %s", database.File().c_str(), failure.what());
        }
        throw;
    }
}

SharedTask TaskStore::Find(int id) {
    return Guarded([&]() -> SharedTask {
        Database::Lease lease(database);
        std::optional<TaskData> task = ReadTask(*lease, id);
        return task ? std::make_shared<const TaskData>(*std::move(task)) : nullptr;
    });
}

std::shared_ptr<const Snapshot> TaskStore::CurrentSnapshot() {
    return Guarded([&] {
        const std::lock_guard lock(snapshotMutex);
        try {
            return RefreshSnapshot(zone.Now(), options.clock());
        } catch (...) {
            // The connection may be in the middle of something.
            observer.reset();
            throw;
        }
    });
}

std::shared_ptr<const Snapshot> TaskStore::RefreshSnapshot(const absl::TimeZone& zoneNow,
                                                           absl::Time now) {
    const std::uint64_t generation = database.Generation();
    if (observer == nullptr || generation != observedGeneration) {
        snapshot = nullptr;
        observer = nullptr;
        observer = database.Open();
        observedGeneration = database.Generation();
    }
    const auto readVersion = [this] {
        Query query = observer->Prepare("PRAGMA data_version");
        query->executeStep();
        return query->getColumn(0).getInt64();
    };
    if (snapshot != nullptr && readVersion() == dataVersion) {
        if (!snapshot->HoldsFor(zoneNow, now)) {
            snapshot = std::make_shared<const Snapshot>(snapshot->Tasks(), zoneNow, now);
        }
        return snapshot;
    }
    // In one transaction: the version must be that of the rows.
    const ReadTransaction transaction(*observer);
    dataVersion = readVersion();
    snapshot = std::make_shared<const Snapshot>(ReadTasks(), zoneNow, now);
    return snapshot;
}

// The stored tasks; those that did not change since the last snapshot are shared with it.
std::vector<SharedTask> TaskStore::ReadTasks() {
    const std::int64_t lastSeen = std::exchange(newestChange, NewestChange(*observer));
    std::optional<std::vector<int>> changed;
    if (snapshot != nullptr) {
        changed = TasksChangedAfter(*observer, lastSeen, kMostChangesToFollow);
    }
    if (!changed) {
        return ReadAllTasks(*observer);
    }
    const std::vector<SharedTask>& former = snapshot->Tasks();
    std::vector<SharedTask> tasks;
    tasks.reserve(former.size() + changed->size());
    auto next = former.begin();
    for (const int id : *changed) {
        const auto place =
            std::lower_bound(next, former.end(), id,
                             [](const SharedTask& task, int wanted) { return task->id < wanted; });
        tasks.insert(tasks.end(), next, place);
        next = place != former.end() && (*place)->id == id ? place + 1 : place;
        if (std::optional<TaskData> task = ReadTask(*observer, id)) {
            tasks.push_back(std::make_shared<const TaskData>(*std::move(task)));
        }
    }
    tasks.insert(tasks.end(), next, former.end());
    return tasks;
}

int TaskStore::Save(const TaskData& task) {
    const StartSecond nextStart = ComputeNextStart(task, zone.Now(), options.clock());
    const int id = Guarded([&] {
        WriteTransaction transaction(database);
        int savedId = task.id;
        if (task.id == kNewTaskId) {
            savedId = InsertTask(*transaction, task, nextStart);
        } else if (!UpdateTask(*transaction, task, nextStart)) {
            throw StoreFailure(kErrNotFound, "no task " + std::to_string(task.id));
        }
        transaction.Commit();
        return savedId;
    });
    SchedulerLink::Wake();
    return id;
}

SharedTask TaskStore::Change(const TaskData& base, const TaskData& changed) {
    const absl::TimeZone zoneNow = zone.Now();
    const absl::Time now = options.clock();
    SharedTask stored = Guarded([&] {
        WriteTransaction transaction(database);
        // Read under the write lock: nobody else changes the task from here to the commit.
        std::optional<TaskData> task = ReadTask(*transaction, base.id);
        if (task) {
            ApplyChange(base, changed, *task);
        }
        if (!task || !UpdateTask(*transaction, *task, ComputeNextStart(*task, zoneNow, now))) {
            throw StoreFailure(kErrNotFound, "no task " + std::to_string(base.id));
        }
        transaction.Commit();
        return std::make_shared<const TaskData>(*std::move(task));
    });
    SchedulerLink::Wake();
    return stored;
}

void TaskStore::Remove(int id) {
    Guarded([&] {
        WriteTransaction transaction(database);
        if (!RemoveTask(*transaction, id)) {
            throw StoreFailure(kErrNotFound, "no task " + std::to_string(id));
        }
        transaction.Commit();
    });
    SchedulerLink::Wake();
}

void TaskStore::QueueRun(int id) {
    const SharedTask task = Find(id);
    if (task == nullptr) {
        throw StoreFailure(kErrNotFound, "there is no such task");
    }
    if (task->command.empty()) {
        throw StoreFailure(kErrNotAllowed, "it has no command");
    }
    if (!SchedulerLink::IsAlive()) {
        throw StoreFailure(kErrNoScheduler, "no scheduler is running");
    }
    Guarded([&] {
        WriteTransaction transaction(database);
        if (!orva::QueueRun(*transaction, id, absl::ToUnixSeconds(options.clock()),
                            program_invocation_short_name, OwnAccount())) {
            throw StoreFailure(kErrNotFound, "there is no such task");
        }
        transaction.Commit();
    });
    SchedulerLink::Wake();
}

void TaskStore::SaveAll(const std::vector<TaskData>& tasks) {
    const absl::TimeZone zoneNow = zone.Now();
    const absl::Time now = options.clock();
    Guarded([&] {
        WriteTransaction transaction(database);
        const std::int64_t highest = HighestTaskId(*transaction);
        std::vector<const TaskData*> withoutId;
        // Those that bring an id come first: a new one must not be given an id that is still to
        // come.
        for (const TaskData& task : tasks) {
            const StartSecond nextStart = ComputeNextStart(task, zoneNow, now);
            if (task.id > highest) {
                InsertTask(*transaction, task, nextStart);
            } else if (task.id == kNewTaskId || !UpdateTask(*transaction, task, nextStart)) {
                withoutId.push_back(&task);
            }
        }
        for (const TaskData* task : withoutId) {
            TaskData created = *task;
            created.id = kNewTaskId;
            InsertTask(*transaction, created, ComputeNextStart(created, zoneNow, now));
        }
        transaction.Commit();
    });
    SchedulerLink::Wake();
}

}  // namespace orva
