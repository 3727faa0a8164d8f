#include "appliance/store/MachineZone.h"

#include <atomic>
#include <climits>
#include <cstdlib>
#include <string_view>
#include <utility>

#include <syslog.h>
#include <unistd.h>

namespace orva {
namespace {

constexpr const char* kUtc = "UTC";

// The zone's name within the zone files, or a path for a zone file that stands elsewhere.
std::string ZoneNameOfLink(const std::string& link) {
    char target[PATH_MAX];
    const ssize_t length = ::readlink(link.c_str(), target, sizeof target);
    if (length <= 0) {
        // A plain copy of a zone file, or none at all, which means UTC.
        return ::access(link.c_str(), R_OK) == 0 ? link : kUtc;
    }
    const std::string_view path(target, static_cast<std::size_t>(length));
    constexpr std::string_view kZoneFiles = "/zoneinfo/";
    const std::size_t at = path.find(kZoneFiles);
    return std::string(at == std::string_view::npos ? std::string_view(link)
                                                    : path.substr(at + kZoneFiles.size()));
}

std::string CurrentZoneName(const std::string& link) {
    const char* fromEnvironment = std::getenv("TZ");
    if (fromEnvironment == nullptr) {
        return ZoneNameOfLink(link);
    }
    if (*fromEnvironment == ':') {
        ++fromEnvironment;
    }
    return *fromEnvironment == '\0' ? kUtc : fromEnvironment;
}

// The absolute path in a spelling that no earlier call in this process has yielded. Zones are kept
// by name for as long as the process lives: what a file holds now has to be asked for under a name
// that is new.
std::string FreshSpelling(const std::string& path) {
    static std::atomic<unsigned> calls = 0;
    std::string detour;
    // The number in binary: "/." for a one, "/" for a zero.
    for (unsigned number = ++calls; number != 0; number /= 2) {
        detour += number % 2 == 0 ? "/" : "/.";
    }
    return detour + path;
}

}  // namespace

MachineZone::MachineZone(std::string localtimeLink)
    : link(std::move(localtimeLink)), name(kUtc), zone(absl::UTCTimeZone()) {}

absl::TimeZone MachineZone::Now() {
    std::string current = CurrentZoneName(link);
    FileIdentity identity;
    const bool isFile = current.front() == '/' && GetFileIdentity(current, identity) == 0;
    const std::lock_guard lock(mutex);
    if (current != name || identity != file) {
        if (!absl::LoadTimeZone(isFile ? FreshSpelling(current) : current, &zone)) {
            zone = absl::UTCTimeZone();
            syslog(LOG_ERR, "no data for time zone \"%s\"; using UTC", current.c_str());
        }
        name = std::move(current);
        file = identity;
    }
    return zone;
}

}  // namespace orva
