#pragma once

#include <absl/time/time.h>

#include <atomic>
#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "appliance/store/TaskStore.h"
#include "platform/schedtask.h"
#include "tests/appliance/util/Sandbox.h"

// A test with a task store of its own, in which it is noon UTC of Friday, 1 May 2026 until the test
// says otherwise.
class StoreTest : public Sandbox {
  protected:
    StoreTest();
    ~StoreTest() override;

    // The database file.
    std::string DatabasePath() const;
    // The one column of the one row that the query finds.
    std::string Stored(const std::string& sql) const;
    // Lets go of the store; the next use opens it anew, with that patience.
    void Reopen(std::chrono::milliseconds busyTimeout = std::chrono::seconds(30));
    // A second store on the same database, which knows nothing of the first: what another process
    // has.
    std::unique_ptr<orva::TaskStore> OtherProcess();
    void SetNow(const std::string& utc);

    // A complete task that starts daily at 06:30.
    static orva::TaskData SampleTask(const std::string& name);
    static std::vector<int> Ids(const orva::Snapshot& snapshot);

  private:
    orva::TaskStore::Options Options(std::chrono::milliseconds busyTimeout);

    std::shared_ptr<std::atomic<std::int64_t>> nowSecond;
};

// A record that is freed at the end.
class Record {
  public:
    Record() : task(ORVASchedTaskAlloc()) {}
    ~Record() { ORVASchedTaskFree(task); }
    Record(const Record&) = delete;
    Record& operator=(const Record&) = delete;
    _tag_orva_sched_task_* Get() const { return task; }
    _tag_orva_sched_task_& operator*() const { return *task; }

  private:
    _tag_orva_sched_task_* task;
};

// Runs `work` in a child process with mounts of its own, in which it may mount what it likes. What
// `work` yields comes back: empty when all was well.
std::string InOwnMounts(const std::function<std::string()>& work);
