#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "appliance/runs/RunStore.h"
#include "appliance/scheduler/Scheduler.h"
#include "tests/appliance/store/StoreTest.h"

// Plays the processes of runs. What it holds outlives a scheduler, as processes do.
class FakeHost : public orva::RunHost {
  public:
    const std::string& BootId() const override { return bootId; }
    std::optional<std::string> Prepare(const orva::RunOrder& order) override;
    std::optional<std::string> Start(std::int64_t run) override;
    Trace Look(std::int64_t run) override;
    std::optional<orva::RunRemains> Remains(std::int64_t run) const override;
    void Remove(std::int64_t run) override;
    std::vector<std::int64_t> All() const override;
    void Stop(std::int64_t run) override { stopped.push_back(run); }

    std::string bootId = "this boot";
    // In order, of all schedulers.
    std::vector<orva::RunOrder> started;
    std::vector<std::int64_t> stopped;
    // Why no run can be prepared, or started; empty when runs can.
    std::string noRoom;
    std::string refusal;
    // Runs that have a folder; those of them that have not begun, with their orders.
    std::set<std::int64_t> folders;
    std::map<std::int64_t, orva::RunOrder> prepared;
    std::set<std::int64_t> goingOn;
    // Called when a run is prepared.
    std::function<void()> onPrepare;
    // Called before a run is started: to fail there, as at a kill.
    std::function<void()> beforeStart;
    // Called when somebody asks what has become of a run. The answer is from before the call.
    std::function<void(std::int64_t)> onLook;
    // Nothing that runs have left can be read.
    bool unreadable = false;
    std::map<std::int64_t, orva::RunEnding> endings;
    std::map<std::int64_t, orva::StoredOutput> outputs;
};

// A scheduler on a store of its own with fake processes. It is noon UTC of Friday, 1 May 2026.
class SchedulerTest : public StoreTest {
  protected:
    SchedulerTest();

    // A new one after the end of the former one, whose memory is gone.
    void Restart();
    // The same, and it takes over what there is.
    void RestartAndRecover();

    // Works until there is nothing more to do now. Yields when there will be.
    absl::Time Work();

    // Stores a daily task at "HH:MM" with the name as its command too. Yields its id.
    int AddTask(const std::string& name, int hour, int minute, std::uint16_t moreFlags = 0);
    int AddTask(orva::TaskData task);
    orva::TaskData Stored(int id) const;

    // Lets the run end with that exit status.
    void End(std::int64_t run, int status = 0);

    // The history, oldest first: "name occurrence reason state why", with "-" for what is not
    // there.
    std::vector<std::string> History() const;
    // The commands that were started, in order.
    std::vector<std::string> Started() const;
    // Column next_start of the task, as "MM-DD HH:MM"; "-" for none.
    std::string NextStart(int id) const;
    std::optional<orva::Run> Find(std::int64_t run) const;
    void Execute(const std::string& sql) const;

    FakeHost host;
    orva::Scheduler::Options options;
    std::unique_ptr<orva::Scheduler> scheduler;
};
