#pragma once

#include <cstdio>
#include <span>

#include "appliance/recycle/FileInfo.h"

namespace orva {

// The program orvarecycle, from the arguments after its name to its exit status: 0 done, 1
// something could not be done, 2 wrong command line. `now` is what ages are measured from. Changes
// the root for
// --root. The streams stay the caller's.
int RunRecycleTool(std::span<const char* const> arguments, std::FILE* out, std::FILE* err,
                   FileTime now);

}  // namespace orva
