#pragma once

#include "appliance/recycle/BinOpener.h"
#include "appliance/recycle/CleanReport.h"
#include "appliance/recycle/CleanRun.h"

namespace orva {

// Cleans an open bin and gives the totals; the caller has begun the bin in the report and ends it.
//
// Files, links and the like go when the rules allow it, and so does every folder below the bin that
// is empty then, also one that was empty before. The bin itself stays. What cannot be removed is
// reported and the rest still done. Running it again after it was killed finishes the work.
CleanTotals CleanBin(OpenBin bin, CleanRun& run);

}  // namespace orva
