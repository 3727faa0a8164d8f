#pragma once

#include <chrono>
#include <cstddef>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "appliance/server/BootTime.h"
#include "appliance/server/Secret.h"

namespace orva {

// The browsers that have signed in, until they sign out, their time is over or the program ends.
// Held are digests only: whoever reads this memory cannot sign in with it.
//
// Threads: any.
class SessionTable {
  public:
    static constexpr std::chrono::hours kLifetime{12};
    // One more ends the oldest.
    static constexpr std::size_t kMostSessions = 100;

    explicit SessionTable(BootClock clock = BootTime) : now(std::move(clock)) {}

    // Begins a session and yields its id: 256 random bits as 64 hexadecimal digits. Throws
    // std::runtime_error when the kernel gives no random bits.
    std::string Begin();

    bool IsOpen(std::string_view id);

    // No session of that id: nothing happens.
    void End(std::string_view id);

  private:
    struct Session {
        Sha256Digest digest{};
        std::chrono::milliseconds ends{};
    };

    std::vector<Session>::iterator FindLocked(std::string_view id);

    const BootClock now;
    std::mutex mutex;
    // In the order in which they end.
    std::vector<Session> sessions;
};

}  // namespace orva
