// The verbs of orvaschedtool that show what happened. They yield the exit status and throw
// StoreFailure when the store fails.
#pragma once

#include <cstdint>
#include <optional>

namespace orva {

// Prints the runs of the task, or of all, the newest first: one a line, or as one JSON array.
int ShowHistory(std::optional<int> task, bool json);

// Prints what a run has printed, byte for byte: its first and its last part. What is missing
// between them is told on standard error.
int ShowRunOutput(std::int64_t run);

}  // namespace orva
