// The folder of one run, as the scheduler and the readers of runs see it. The scheduler makes it
// and hands it to a supervisor process of its own (`orva-run`), which fills it; when the run has
// ended and its row is stored, the scheduler removes it.
//
//   order    what is to be run
//   process  who runs it, and whether it is to stop; locked (flock) for as long as the supervisor
//            lives
//   output   first and last 64 KiB of what the command prints, allocated before it starts
//   ending   how it ended: absent until then, then complete and durable
//
// Nothing here throws. Threads: any.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "appliance/supervisor/OutputFile.h"
#include "appliance/supervisor/RunRecords.h"
#include "appliance/util/FileDescriptor.h"

namespace orva {

class RunFolder {
  public:
    // Below the root; one folder for each run, named by its id.
    static constexpr const char* kRunsFolder = "/usr/orva/var/runs";

    // The ids of all runs that have a folder, ascending. Empty too when there is no such place.
    static std::vector<std::int64_t> All();

    explicit RunFolder(std::int64_t run);

    const std::string& Path() const { return path; }

    // Makes the folder with the order in it and the space for its ending taken. What stands there
    // under that name already is removed first: run ids are never used twice. Readable by the group
    // of the folder above the runs' one.
    //
    // Yields the locked process file, for StartSupervisor: the supervisor inherits the lock, so
    // that at no time between now and its end the run looks abandoned. None with `error` set, a
    // text that suits RunEnding::why; then there is no folder.
    [[nodiscard]] std::optional<FileDescriptor> Create(const RunOrder& order, std::string& error);

    enum class State {
        kUnknown,     // it cannot be read now, for want of descriptors perhaps; errno says why
        kNotBegun,    // nobody cares for it, and its command has not been started
        kSupervised,  // a supervisor cares for it, or the scheduler is about to start one
        kEnded,       // there is an ending
        kAbandoned,   // nobody cares for it any more, or somebody has removed it or its process
                      // file; no ending will ever be recorded
    };
    [[nodiscard]] State Look() const;

    // Whether somebody certainly holds the lock. That may be so for a moment after the ending.
    [[nodiscard]] bool IsSupervised() const;

    // These set errno when a file cannot be read.
    //
    // None when it is not there, or not complete.
    [[nodiscard]] std::optional<RunOrder> Order() const;
    // None until the supervisor runs.
    [[nodiscard]] std::optional<RunProcess> Process() const;
    // None until the run has ended.
    [[nodiscard]] std::optional<RunEnding> Ending() const;
    // None until the supervisor has made the output's file. What is there so far while it runs.
    [[nodiscard]] std::optional<StoredOutput> Output() const;

    // A pidfd of the supervisor, readable when it has ended, whoever started it. Not open when it
    // is not running, was started before the machine's last start, or has not yet said who it is
    // (then ask again while IsSupervised()).
    [[nodiscard]] FileDescriptor WatchSupervisor() const;

    // Records that the run is to stop, for its supervisor and for the next scheduler; in space
    // that was taken before. `killAt` as in RunProcess. False, with errno, when that fails.
    [[nodiscard]] bool RecordStop(std::uint64_t killAt) const;

    // Sends the signal to the command's process group. False when the command is not running.
    [[nodiscard]] bool SignalCommand(int signal) const;

    // Kills the process group of the command in a folder that is kAbandoned. A pidfd of the
    // command's shell, readable when that has ended. Not open when the shell is not there any more,
    // or is not certainly the one that was started; then nothing is killed. Sets errno when
    // something cannot be read.
    [[nodiscard]] FileDescriptor KillAbandonedCommand() const;

    // Removes the folder and what is in it. False with a log line when that fails; true when there
    // was none.
    bool Remove() const;

  private:
    std::string path;
};

}  // namespace orva
