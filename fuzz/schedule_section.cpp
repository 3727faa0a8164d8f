// A schedule section, with two members of its own beside those of the section: "after" (seconds
// since 1970) is the instant from which the next starts are sought, "zone" (a number) the time
// zone.
#include <absl/time/time.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "appliance/schedule/ScheduleSection.h"
#include "appliance/schedule/StartTimes.h"
#include "appliance/util/StrictJson.h"
#include "fuzz/Require.h"

namespace {

constexpr std::size_t kStarts = 6;

// Zones that jump by an hour, by half an hour, by a whole day, at midnight, and not at all.
const std::vector<absl::TimeZone>& Zones() {
    static const std::vector<absl::TimeZone> zones = [] {
        std::vector<absl::TimeZone> loaded;
        for (const char* name : {"UTC", "Europe/Berlin", "America/New_York", "Australia/Lord_Howe",
                                 "Pacific/Apia", "Africa/Cairo", "Asia/Kathmandu"}) {
            absl::TimeZone zone;
            Require(absl::LoadTimeZone(name, &zone), "the time zones are installed");
            loaded.push_back(zone);
        }
        return loaded;
    }();
    return zones;
}

std::int64_t IntegerOr(const Json::Value& document, const char* name, std::int64_t otherwise) {
    const Json::Value& member = document.isObject() ? document[name] : Json::Value::nullSingleton();
    return member.isInt64() ? member.asInt64() : otherwise;
}

// From 1900 to 2200.
absl::Time After(const Json::Value& document) {
    constexpr std::int64_t kEarliest = -2208988800;
    constexpr std::int64_t kLatest = 7258118400;
    return absl::FromUnixSeconds(
        std::clamp(IntegerOr(document, "after", 1900000000), kEarliest, kLatest));
}

const absl::TimeZone& Zone(const Json::Value& document) {
    const auto number = static_cast<std::uint64_t>(IntegerOr(document, "zone", 0));
    return Zones()[number % Zones().size()];
}

void RequireStarts(const orva::Schedule& schedule, const absl::TimeZone& zone, absl::Time after) {
    std::vector<absl::Time> chain;
    absl::Time last = after;
    while (chain.size() < kStarts) {
        const std::optional<absl::Time> next = orva::NextStart(schedule, zone, last);
        if (!next) {
            break;
        }
        Require(*next > last, "the next start is strictly later");
        // A series that begins on the last day of the year 9999 goes on in one that is not shown.
        Require(!chain.empty() || orva::FormatLocalMinute(*next, zone).size() == 16,
                "the next start can be shown");
        last = *next;
        chain.push_back(last);
    }
    const std::vector<orva::Start> starts = orva::NextStarts(schedule, zone, after, kStarts);
    Require(std::equal(starts.begin(), starts.end(), chain.begin(), chain.end(),
                       [](const orva::Start& start, absl::Time at) { return start.at == at; }),
            "several starts are the next one again and again");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    std::string error;
    const std::optional<Json::Value> section =
        orva::ParseStrictJson({reinterpret_cast<const char*>(data), size}, error);
    if (!section) {
        return 0;
    }
    orva::Schedule schedule;
    const std::optional<std::string> problem = orva::ApplyScheduleSection(*section, schedule);
    if (problem) {
        Require(!problem->empty(), "a refusal has a reason");
        Require(schedule == orva::Schedule(), "a refused section changes nothing");
        return 0;
    }
    orva::Schedule again;
    Require(!orva::ApplyScheduleSection(orva::ScheduleSection(schedule), again),
            "what is written is accepted");
    Require(again == schedule, "what is written reads back as the same schedule");
    RequireStarts(schedule, Zone(*section), After(*section));
    return 0;
}
