// A run as the scheduler starts it: the real orva-run, in a root of its own.
#pragma once

#include <sys/types.h>

#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "appliance/supervisor/RunFolder.h"
#include "tests/system/Process.h"

namespace orva::test {

// The account that the tests run as.
std::string OwnName();

// Waits for the condition, at most kPatience. Its last value.
bool WaitUntil(const std::function<bool()>& condition);

class SupervisedRun {
  public:
    // Makes the root; nothing is started yet.
    SupervisedRun();
    ~SupervisedRun();
    SupervisedRun(const SupervisedRun&) = delete;
    SupervisedRun& operator=(const SupervisedRun&) = delete;

    const Sandbox& Root() const { return sandbox; }
    const RunFolder& Folder() const { return *folder; }

    // Makes the folder; the lock for Launch.
    FileDescriptor Prepare(const std::string& command, const std::string& owner = OwnName(),
                           std::vector<std::pair<std::string, std::string>> environment = {});
    void Launch(FileDescriptor lock, const std::string& program = ORVA_BIN_DIR "/orva-run");
    // Launches a shell script in its place, as root of mounts of its own. In it, $1 is the run's
    // folder, and $RUN the supervisor's program.
    void LaunchScript(FileDescriptor lock, const std::string& script);
    // Both.
    void Start(const std::string& command, const std::string& owner = OwnName(),
               std::vector<std::pair<std::string, std::string>> environment = {});
    pid_t Supervisor() const { return supervisor; }
    // Waits for the supervisor's end. Its exit status, or 128 + the signal.
    int Wait();
    // Waits for the supervisor's end; fails the test without an ending.
    RunEnding End();
    // Start and End; all that was printed, if nothing was dropped.
    RunEnding Run(const std::string& command, const std::string& owner = OwnName(),
                  std::vector<std::pair<std::string, std::string>> environment = {});
    std::string Printed() const;

  private:
    Sandbox sandbox;
    std::optional<RunFolder> folder;
    pid_t supervisor = -1;
};

}  // namespace orva::test
