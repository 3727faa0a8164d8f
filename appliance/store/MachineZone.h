#pragma once

#include <absl/time/time.h>

#include <mutex>
#include <string>

namespace orva {

// The machine's time zone as it is set now: the environment's TZ when that is set, else what the
// link `localtime` points to. A zone that is changed while the program runs is noticed at the next
// call; a name without zone data counts as UTC and is logged once.
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
    absl::TimeZone zone;
};

}  // namespace orva
