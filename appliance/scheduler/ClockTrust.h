#pragma once

#include <absl/time/time.h>

namespace orva {

// Whether the wall clock can be right. A machine that has lost its battery, or starts before it has
// asked for the time, shows a day long past; tasks must not be started by that.
//
// A clock set deliberately, by people or by a time service, is trusted as long as it does not stand
// before this program was made.
class ClockTrust {
  public:
    // `programMade`: no clock that stands more than a day before it can be right.
    explicit ClockTrust(absl::Time programMade) : made(programMade) {}

    // The latest instant that is on record, from before this program was started.
    void Remember(absl::Time recorded);
    // The clock was set while this program ran.
    void ClockWasSet() { wasSet = true; }

    // `synchronised`: the kernel has its time from a time service.
    bool Trusts(absl::Time now, bool synchronised) const;

  private:
    absl::Time made;
    absl::Time newest = absl::InfinitePast();
    bool wasSet = false;
};

}  // namespace orva
