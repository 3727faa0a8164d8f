#pragma once

#include <string>
#include <vector>

namespace orva {

// `orvaschedtool --start-service NAME...` and `--stop-service NAME...`: starts, or stops, what the
// service tables (ServiceTable.h) say that each name means, in the order of the names, and waits
// for each. One that is unknown or fails is named on standard error, and the others are still done:
// kToolFailed then, kToolDone otherwise.
// TERM, INT and HUP end the command that is running and then the program, by the same signal.
int StartServices(const std::vector<std::string>& names);
int StopServices(const std::vector<std::string>& names);

}  // namespace orva
