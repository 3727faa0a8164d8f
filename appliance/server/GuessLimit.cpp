#include "appliance/server/GuessLimit.h"

#include <syslog.h>

#include <algorithm>

namespace orva {

std::optional<std::chrono::seconds> GuessLimit::Take(const PeerAddress& address) {
    const std::lock_guard lock(mutex);
    const std::chrono::milliseconds time = now();
    auto place = guessers.find(address);
    if (place == guessers.end()) {
        MakeRoomLocked(time);
        place = guessers.emplace(address, Guesser()).first;
    }
    Guesser& guesser = place->second;
    std::vector<std::chrono::milliseconds>& guesses = guesser.guesses;
    guesses.erase(guesses.begin(), std::find_if(guesses.begin(), guesses.end(), [time](auto guess) {
                      return guess + kPeriod > time;
                  }));
    if (guesses.size() < kMostGuesses) {
        guesses.push_back(time);
        guesser.logged = false;
        return std::nullopt;
    }
    if (!guesser.logged) {
        guesser.logged = true;
        ::syslog(LOG_WARNING, "%s presents wrong tokens; its further guesses are not looked at",
                 ToText(address).c_str());
    }
    return std::chrono::ceil<std::chrono::seconds>(guesses.front() + kPeriod - time);
}

void GuessLimit::GiveBack(const PeerAddress& address) {
    const std::lock_guard lock(mutex);
    const auto guesser = guessers.find(address);
    if (guesser == guessers.end()) {
        return;
    }
    if (!guesser->second.guesses.empty()) {
        guesser->second.guesses.pop_back();
    }
    if (guesser->second.guesses.empty()) {
        guessers.erase(guesser);
    }
}

void GuessLimit::MakeRoomLocked(std::chrono::milliseconds time) {
    if (guessers.size() < kMostAddresses) {
        return;
    }
    std::erase_if(guessers, [time](const auto& entry) {
        return entry.second.guesses.back() + kPeriod <= time;
    });
    if (guessers.size() >= kMostAddresses) {
        guessers.erase(
            std::min_element(guessers.begin(), guessers.end(), [](const auto& a, const auto& b) {
                return a.second.guesses.back() < b.second.guesses.back();
            }));
    }
}

}  // namespace orva
