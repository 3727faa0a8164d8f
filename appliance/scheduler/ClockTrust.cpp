#include "appliance/scheduler/ClockTrust.h"

#include <algorithm>

namespace orva {
namespace {

// People put a clock right by less; a lost battery puts it wrong by more.
constexpr absl::Duration kTolerance = absl::Hours(24);

}  // namespace

void ClockTrust::Remember(absl::Time recorded) { newest = std::max(newest, recorded); }

bool ClockTrust::Trusts(absl::Time now, bool synchronised) const {
    if (now < made - kTolerance) {
        return false;
    }
    return wasSet || synchronised || now >= newest - kTolerance;
}

}  // namespace orva
