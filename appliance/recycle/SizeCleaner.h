#pragma once

#include "appliance/recycle/CleanReport.h"
#include "appliance/recycle/CleanRun.h"
#include "appliance/recycle/DirectoryTree.h"

namespace orva {

// Brings a bin down to the size limit of the run's rules: first looks at everything, then removes
// one file after the other, in the rules' order, until what is left is no larger than the limit.
// Files that the rules keep count in the bin's size. Files of one time, or one size, go in the
// order of their paths.
//
// Needs about 60 bytes of memory for each file, and its name.
CleanTotals CleanToSize(DirectoryTree& tree, CleanRun& run);

}  // namespace orva
