#include "appliance/server/SessionTable.h"

#include <algorithm>
#include <stdexcept>

namespace orva {
namespace {

constexpr std::size_t kIdBytes = 32;

}  // namespace

std::string SessionTable::Begin() {
    std::optional<std::string> id = MakeSecret(kIdBytes);
    if (!id) {
        throw std::runtime_error("the kernel gives no random bits");
    }
    const std::lock_guard lock(mutex);
    if (sessions.size() >= kMostSessions) {
        sessions.erase(sessions.begin());
    }
    sessions.push_back({Sha256(*id), now() + kLifetime});
    return *std::move(id);
}

bool SessionTable::IsOpen(std::string_view id) {
    if (id.size() != 2 * kIdBytes) {
        return false;
    }
    const std::lock_guard lock(mutex);
    // In two steps: the search forgets sessions that are over, which moves the end.
    const auto session = FindLocked(id);
    return session != sessions.end();
}

void SessionTable::End(std::string_view id) {
    const std::lock_guard lock(mutex);
    const auto session = FindLocked(id);
    if (session != sessions.end()) {
        sessions.erase(session);
    }
}

// Looks at all of them, found or not: the time taken says nothing about the ids.
std::vector<SessionTable::Session>::iterator SessionTable::FindLocked(std::string_view id) {
    const std::chrono::milliseconds time = now();
    const auto firstOpen = std::find_if(sessions.begin(), sessions.end(),
                                        [time](const Session& s) { return s.ends > time; });
    sessions.erase(sessions.begin(), firstOpen);
    const Sha256Digest digest = Sha256(id);
    auto found = sessions.end();
    for (auto session = sessions.begin(); session != sessions.end(); ++session) {
        if (SameSecret(session->digest, digest)) {
            found = session;
        }
    }
    return found;
}

}  // namespace orva
