#pragma once

#include "appliance/recycle/CleanReport.h"
#include "appliance/recycle/CleanRules.h"
#include "appliance/recycle/LinkTimes.h"

namespace orva {

// What all bins of one clean share; the members are the caller's.
struct CleanRun {
    const CleanJudge& judge;
    CleanReport& report;
    LinkTimes& links;
    bool preview = false;  // look and tell, and remove nothing
};

}  // namespace orva
