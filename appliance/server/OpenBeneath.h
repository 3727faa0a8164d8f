#pragma once

#include <string>

#include "appliance/util/FileDescriptor.h"

namespace orva {

// Opens `path`, relative and without "." or "..", for reading below the open `directory`. Not open,
// with errno, when that would lead through a link anywhere on the way, or out of the directory.
// Never waits, whatever stands there.
FileDescriptor OpenBeneath(int directory, const std::string& path);

// The same step by step, for kernels that have no call for it.
FileDescriptor OpenBeneathByHand(int directory, const std::string& path);

}  // namespace orva
