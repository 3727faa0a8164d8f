// An appliance of its own with the real scheduler running in it, started and killed at will.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "appliance/runs/RunStore.h"
#include "appliance/store/TaskStore.h"
#include "tests/system/Process.h"

namespace orva::test {

class RunningScheduler {
  public:
    // Makes the appliance and points this process to it; starts nothing. Programs and libraries
    // stand in it where they do on an installed one.
    RunningScheduler();
    ~RunningScheduler();
    RunningScheduler(const RunningScheduler&) = delete;
    RunningScheduler& operator=(const RunningScheduler&) = delete;

    const Sandbox& Root() const { return sandbox; }
    std::string Program(const std::string& name) const;
    // Puts a shell script in the place of the runs' supervisor; in it, $REAL is that.
    void ReplaceSupervisor(const std::string& script);
    void RestoreSupervisor();

    std::vector<std::string> Arguments() const;
    // Starts a scheduler and waits until it is ready. Fails the test when it does not start.
    void Start();
    // Starts it and does not wait.
    void Launch();
    void WaitUntilReady();
    // SIGKILL, and waits for its end.
    void Kill();
    // SIGTERM, and waits for its end. Its status.
    int Stop();
    // Waits until it has ended by itself.
    int WaitForEnd();
    pid_t Pid() const { return pid; }
    void Signal(int signalNumber) const;
    // What all schedulers of this appliance have written to standard error.
    std::string ErrorText() const;

    // A task of the account that runs the tests, which may run any number of times at once, not due
    // before long. Yields its id.
    int AddTask(const std::string& command);
    // Makes its start due in this second.
    void MakeDueNow(int task);
    void MakeDue(int task, absl::Time time);
    // Tells the scheduler.
    void Wake() const;

    // Waits until no run waits or goes on and no start is due, with a scheduler running.
    void WaitUntilIdle();
    std::vector<Run> Runs() const;
    // The only run of the task; fails the test when there are others or none.
    Run OnlyRunOf(int task) const;
    bool WaitForState(std::int64_t run, RunState state) const;
    // A statement on the database, from outside.
    void Execute(const std::string& sql) const;
    // "ok" for a database that is sound.
    std::string IntegrityCheck() const;

  private:
    Sandbox sandbox;
    std::string errorFile;
    pid_t pid = -1;
};

// Waits for the condition, at most kPatience. Its last value.
bool WaitFor(const std::function<bool()>& condition);

}  // namespace orva::test
