// Runs as JSON documents, as the API and the tools show them.
#pragma once

#include <absl/time/time.h>
#include <json/value.h>

#include <optional>
#include <string>

#include "appliance/runs/Run.h"

namespace orva {

// UTC with milliseconds: "2026-11-21T10:00:00.123Z".
std::string FormatInstant(absl::Time time);

// "run", "task", "name", "reason", "state", "why", "asked_program", "asked_account", "occurrence",
// "queued", "started", "ended", "exit_status", "signal" and "output" (a count of bytes). What a run
// does not have is null.
Json::Value RunDocument(const Run& run);

}  // namespace orva
