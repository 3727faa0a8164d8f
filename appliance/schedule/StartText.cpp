#include "appliance/schedule/StartText.h"

namespace orva {

std::string_view ClockChangeNote(Start::ClockChange change) {
    switch (change) {
        case Start::ClockChange::kNone:
            break;
        case Start::ClockChange::kJumpedOver:
            return "moved: the clock skips this time";
        case Start::ClockChange::kFirstPass:
            return "the clock shows this time twice: the first of them";
        case Start::ClockChange::kSecondPass:
            return "the clock shows this time twice: the second of them";
    }
    return {};
}

std::string FormatOffset(absl::Time time, const absl::TimeZone& zone) {
    return absl::FormatTime("%Ez", time, zone);
}

std::string ZoneName(const absl::TimeZone& zone) {
    // A zone that was read from a plain file has its path for a name, in odd spellings.
    const std::string name = zone.name();
    return name.starts_with('/') ? "localtime" : name;
}

std::optional<absl::Time> ParseUtcInstant(const std::string& text) {
    absl::Time time;
    std::string ignored;
    // Blanks around it would be passed over, and words such as "infinite-past" taken.
    if (text.find_first_not_of("0123456789-T:.Z") != std::string::npos ||
        !absl::ParseTime("%E4Y-%m-%dT%H:%M:%E*SZ", text, &time, &ignored)) {
        return std::nullopt;
    }
    return time;
}

}  // namespace orva
