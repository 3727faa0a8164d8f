#pragma once

#include <chrono>
#include <cstddef>
#include <map>
#include <mutex>
#include <optional>
#include <vector>

#include "appliance/server/BootTime.h"
#include "appliance/server/HttpMessage.h"

namespace orva {

// How often each address has lately presented a wrong secret.
//
// Threads: any.
class GuessLimit {
  public:
    static constexpr std::size_t kMostGuesses = 5;
    static constexpr std::chrono::seconds kPeriod{60};
    // Beyond that many, the address whose last guess is oldest is forgotten.
    static constexpr std::size_t kMostAddresses = 1024;

    explicit GuessLimit(BootClock clock = BootTime) : now(std::move(clock)) {}

    // Counts a guess. When the address has had all of its guesses, yields the whole seconds, at
    // least 1, after which it has one again; such a guess is not counted. The first of those in a
    // row is one line in the log.
    std::optional<std::chrono::seconds> Take(const PeerAddress& address);

    // Uncounts a guess: it was right.
    void GiveBack(const PeerAddress& address);

  private:
    struct Guesser {
        // In ascending order.
        std::vector<std::chrono::milliseconds> guesses;
        bool logged = false;
    };

    void MakeRoomLocked(std::chrono::milliseconds time);

    const BootClock now;
    std::mutex mutex;
    std::map<PeerAddress, Guesser> guessers;
};

}  // namespace orva
