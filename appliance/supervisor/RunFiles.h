// The names of the files in a run's folder, and what a supervisor inherits.
#pragma once

namespace orva {

inline constexpr const char* kOrderFile = "/order";
inline constexpr const char* kProcessFile = "/process";
inline constexpr const char* kOutputFile = "/output";
inline constexpr const char* kEndingFile = "/ending";
// Holds the space for the ending, and becomes it.
inline constexpr const char* kEndingReserve = "/ending.new";

// Any ending fits.
inline constexpr int kEndingSpace = 4096;
// Any process's records fit.
inline constexpr int kProcessSpace = 4096;

// The file descriptor under which a supervisor gets its run's process file, open for appending and
// locked.
inline constexpr int kSupervisorLock = 3;

}  // namespace orva
