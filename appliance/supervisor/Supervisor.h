#pragma once

#include <string>

namespace orva {

// Carries out the run in the folder: starts its command, keeps what it prints, and writes down how
// it ended. The process has inherited the locked process file as kSupervisorLock, and is nothing
// else than this run's supervisor: it ignores the signals that ask a process to end.
//
// A command that was asked to stop (RunFolder::RecordStop) has ended when nothing of its process
// group lives any more; any other one, when its shell has ended.
//
// Returns when the ending is in the folder, on disk. False, with a log line, when it could not be
// written. What the command has left behind in the background may still be printing then: that goes
// to a small process which throws it away, so that it neither blocks nor breaks.
[[nodiscard]] bool Supervise(const std::string& folder);

}  // namespace orva
