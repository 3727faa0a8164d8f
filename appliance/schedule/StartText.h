// Starts as people and programs read them.
//
// Threads: any.
#pragma once

#include <absl/time/time.h>

#include <optional>
#include <string>
#include <string_view>

#include "appliance/schedule/StartTimes.h"

namespace orva {

// What the clock did to a start, for people; empty when it did nothing.
std::string_view ClockChangeNote(Start::ClockChange change);

// The zone's offset from UTC at that instant: "+01:00".
std::string FormatOffset(absl::Time time, const absl::TimeZone& zone);

// The zone's name, "Europe/Berlin"; "localtime" for a zone file that has none.
std::string ZoneName(const absl::TimeZone& zone);

// "2026-11-21T10:00:00Z", with a fraction if there is one. Nothing for any other text.
std::optional<absl::Time> ParseUtcInstant(const std::string& text);

}  // namespace orva
