#pragma once

#include <chrono>
#include <string>

#include "appliance/util/FileDescriptor.h"
#include "platform/package.h"

namespace orva {

enum class PackageState {
    kRunning,
    kStopped,
    kUnknown,  // it gives no command that tells, or that command does not work
};

// Starts and stops one installed package by the commands in its description. They run in the
// package's own folder through /bin/sh, and what they print goes where this process's output goes.
// A program that is to keep running must be left behind by the start command in a session of its
// own and with an output of its own.
//
// For programs of one thread: TERM, INT and HUP end a running command and then the program.
class PackageControl {
  public:
    struct Limits {
        // For the start and the stop command.
        std::chrono::milliseconds command{90'000};
        // For one call of the status command.
        std::chrono::milliseconds status{10'000};
        // How long the status may take to show what a start or stop has done.
        std::chrono::milliseconds settling{10'000};
        // How long to wait for another start or stop of it: that may take all of the above.
        std::chrono::milliseconds turn{150'000};
    };

    explicit PackageControl(std::string id);
    PackageControl(std::string id, const Limits& limits);

    // Reads its description. False when it is not installed or damaged; `report` is one line then.
    [[nodiscard]] bool Load(std::string& report);

    // What it says of itself; empty until it is loaded.
    const ORVAPackageTool::PackageInfo& Info() const { return info; }

    // For a loaded one: run its command unless it is in the wanted state already, and wait until
    // its status shows that state, where it gives one. True when that is done; `report` is one line
    // in either case. Two at once for one package take turns, by a lock that only the account which
    // made /run/orva/packages may take: for another account both fail.
    [[nodiscard]] bool Start(std::string& report) const;
    [[nodiscard]] bool Stop(std::string& report) const;

    PackageState State() const;

  private:
    struct Verb;

    bool Change(const Verb& verb, std::string& report) const;
    // Held while it is open; not open with `report` set when it cannot be had.
    FileDescriptor TakeTurn(std::string& report) const;
    // Its state, looked at until it is the wanted one or cannot be told, or the time is over.
    PackageState WaitFor(PackageState wanted) const;

    std::string packageId;
    Limits maxima;
    std::string folder;
    ORVAPackageTool::PackageInfo info;
};

}  // namespace orva
