#include "appliance/store/TaskStore.h"

#include <absl/time/clock.h>
#include <errno.h>
#include <syslog.h>

#include <algorithm>
#include <cstdlib>
#include <iterator>
#include <utility>

#include "appliance/root/Root.h"
#include "appliance/store/Accounts.h"
#include "appliance/store/DatabaseGuard.h"
#include "appliance/store/SchedulerLink.h"
#include "appliance/store/StoreFailure.h"
#include "appliance/store/TaskTable.h"
#include "appliance/util/CallScope.h"

namespace orva {
namespace {

// Reading single tasks costs more than reading all of them when it is a good part of them.
constexpr std::int64_t kMostChangesToFollow = 1000;

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

// The task that the call of this thread has read last, as it was then.
struct TaskOfCall {
    std::uint64_t call = 0;
    const TaskStore* store = nullptr;
    SharedTask task;
};
thread_local TaskOfCall taskOfCall;

SharedTask Recall(const TaskStore* store, int id) {
    const std::uint64_t call = CallScope::Current();
    const bool known = call != 0 && taskOfCall.call == call && taskOfCall.store == store &&
                       taskOfCall.task->id == id;
    return known ? taskOfCall.task : nullptr;
}

void Remember(const TaskStore* store, const SharedTask& task) {
    if (const std::uint64_t call = CallScope::Current(); call != 0 && task != nullptr) {
        taskOfCall = {call, store, task};
    }
}

void Forget() { taskOfCall = {}; }

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

SharedTask TaskStore::Find(int id) {
    if (SharedTask known = Recall(this, id)) {
        return known;
    }
    SharedTask found = Guarded(database, [&]() -> SharedTask {
        Database::Lease lease(database);
        std::optional<TaskData> task = ReadTask(*lease, id);
        return task ? std::make_shared<const TaskData>(*std::move(task)) : nullptr;
    });
    Remember(this, found);
    return found;
}

std::shared_ptr<const Snapshot> TaskStore::CurrentSnapshot() {
    return Guarded(database, [&] {
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
            snapshot = std::make_shared<const Snapshot>(snapshot->Tasks(), zoneNow, now,
                                                        snapshot->Damaged());
        }
        return snapshot;
    }
    // In one transaction: the version must be that of the rows.
    const ReadTransaction transaction(*observer);
    dataVersion = readVersion();
    // Runs come and go much more often than tasks change.
    const bool sameTasks = snapshot != nullptr && NewestChange(*observer) == newestChange;
    if (!sameTasks) {
        std::vector<DamagedTask> damaged;
        std::vector<SharedTask> tasks = ReadTasks(damaged);
        LogDamaged(damaged);
        snapshot =
            std::make_shared<const Snapshot>(std::move(tasks), zoneNow, now, std::move(damaged));
    } else if (!snapshot->HoldsFor(zoneNow, now)) {
        snapshot =
            std::make_shared<const Snapshot>(snapshot->Tasks(), zoneNow, now, snapshot->Damaged());
    }
    return snapshot;
}

// The stored tasks; those that did not change since the last snapshot are shared with it.
std::vector<SharedTask> TaskStore::ReadTasks(std::vector<DamagedTask>& damaged) {
    const std::int64_t lastSeen = std::exchange(newestChange, NewestChange(*observer));
    std::optional<std::vector<int>> changed;
    if (snapshot != nullptr) {
        changed = TasksChangedAfter(*observer, lastSeen, kMostChangesToFollow);
    }
    if (!changed) {
        return ReadAllTasks(*observer, damaged);
    }
    const auto unchanged = [&changed](const DamagedTask& task) {
        return !std::binary_search(changed->begin(), changed->end(), task.id);
    };
    std::copy_if(snapshot->Damaged().begin(), snapshot->Damaged().end(),
                 std::back_inserter(damaged), unchanged);
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
        try {
            if (std::optional<TaskData> task = ReadTask(*observer, id)) {
                tasks.push_back(std::make_shared<const TaskData>(*std::move(task)));
            }
        } catch (const StoreFailure& failure) {
            damaged.push_back({id, failure.what()});
        }
    }
    tasks.insert(tasks.end(), next, former.end());
    return tasks;
}

// Those that the last snapshot did not know.
void TaskStore::LogDamaged(const std::vector<DamagedTask>& damaged) const {
    for (const DamagedTask& task : damaged) {
        if (snapshot == nullptr || std::find(snapshot->Damaged().begin(), snapshot->Damaged().end(),
                                             task) == snapshot->Damaged().end()) {
            syslog(LOG_ERR, "task store %s: %s: it is left out", database.File().c_str(),
                   task.problem.c_str());
        }
    }
}

int TaskStore::Save(const TaskData& task) {
    Forget();
    const absl::Time now = options.clock();
    const StartSecond nextStart = ComputeNextStart(task, zone.Now(), now);
    const int id = Guarded(database, [&] {
        WriteTransaction transaction(database);
        int savedId = task.id;
        if (task.id == kNewTaskId) {
            savedId = InsertTask(*transaction, task, nextStart);
        } else if (!UpdateTask(*transaction, task, nextStart, now)) {
            throw StoreFailure(kErrNotFound, "no task " + std::to_string(task.id));
        }
        transaction.Commit();
        return savedId;
    });
    SchedulerLink::Wake();
    return id;
}

SharedTask TaskStore::Change(const TaskData& base, const TaskData& changed) {
    const absl::Time now = options.clock();
    // What nobody changes needs not be computed anew; the scheduler follows clock and zone.
    const bool movesStart =
        changed.schedule != base.schedule || changed.Has(kEnabled) != base.Has(kEnabled);
    Forget();
    SharedTask stored = Guarded(database, [&] {
        WriteTransaction transaction(database);
        // Read under the write lock: nobody else changes the task from here to the commit.
        std::optional<TaskData> task = ReadTask(*transaction, base.id);
        std::optional<StartSecond> nextStart;
        if (task) {
            ApplyChange(base, changed, *task);
            if (movesStart) {
                nextStart = ComputeNextStart(*task, zone.Now(), now);
            }
        }
        if (!task || !UpdateTask(*transaction, *task, nextStart, now)) {
            throw StoreFailure(kErrNotFound, "no task " + std::to_string(base.id));
        }
        transaction.Commit();
        return std::make_shared<const TaskData>(*std::move(task));
    });
    SchedulerLink::Wake();
    Remember(this, stored);
    return stored;
}

void TaskStore::Remove(int id) {
    Forget();
    Guarded(database, [&] {
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
    Guarded(database, [&] {
        WriteTransaction transaction(database);
        if (!orva::QueueRun(*transaction, id, options.clock(), program_invocation_short_name,
                            OwnAccount())) {
            throw StoreFailure(kErrNotFound, "there is no such task");
        }
        transaction.Commit();
    });
    SchedulerLink::Wake();
}

void TaskStore::SaveAll(const std::vector<TaskData>& tasks) {
    Forget();
    const absl::TimeZone zoneNow = zone.Now();
    const absl::Time now = options.clock();
    Guarded(database, [&] {
        WriteTransaction transaction(database);
        const std::int64_t highest = HighestTaskId(*transaction);
        std::vector<const TaskData*> withoutId;
        // Those that bring an id come first: a new one must not be given an id that is still to
        // come.
        for (const TaskData& task : tasks) {
            const StartSecond nextStart = ComputeNextStart(task, zoneNow, now);
            if (task.id > highest) {
                InsertTask(*transaction, task, nextStart);
            } else if (task.id == kNewTaskId || !UpdateTask(*transaction, task, nextStart, now)) {
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
