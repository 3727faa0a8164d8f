#pragma once

#include <sys/types.h>

namespace orva {

// Whether a process of this group still lives; those that have ended and only wait to be reaped do
// not. True too when that cannot be told.
[[nodiscard]] bool HasLivingProcess(pid_t group);

}  // namespace orva
