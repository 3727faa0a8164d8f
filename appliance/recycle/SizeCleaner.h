#pragma once

#include "appliance/recycle/CleanReport.h"
#include "appliance/recycle/CleanRun.h"
#include "appliance/recycle/DirectoryTree.h"

namespace orva {

// Brings a bin down to the size limit of the run's rules: first looks at everything, then removes
// the files that come first in the rules' order, as many as it takes for what is left to be no
// larger than the limit. What could not be removed is made up for by those that come next. Files
// that the rules keep count in the bin's size.
//
// The chosen files go folder by folder. However early the clean is stopped, nothing else is gone,
// and the same clean again comes to the same end.
//
// Needs about 60 bytes of memory for each file, and its name.
CleanTotals CleanToSize(DirectoryTree& tree, CleanRun& run);

}  // namespace orva
