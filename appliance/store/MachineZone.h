#pragma once

#include <absl/time/time.h>

#include <mutex>
#include <string>

#include "appliance/util/FileRead.h"

namespace orva {

// The machine's time zone as it is set now: the environment's TZ when that is set, else what the
// link `localtime` points to, or holds when it is a plain copy of a zone file. A zone that is
// changed while the program runs is noticed at the next call; a name or a file without zone data
// counts as UTC and is logged once. Zones by name are those of the machine's zone files, read once.
//
// Threads: any.
class MachineZone {
  public:
    explicit MachineZone(std::string localtimeLink = "/etc/localtime");

    absl::TimeZone Now();

  private:
    const std::string link;
    std::mutex mutex;
    std::string name;
    // Of the zone file when the name is its path, else empty.
    FileIdentity file;
    absl::TimeZone zone;
};

}  // namespace orva
