#pragma once

#include <string>

namespace orva {

// What `orvaschedtool --next` is asked for, as it was typed.
struct ComingStartsRequest {
    static constexpr int kMost = 10'000;

    int count = 1;  // 1 to kMost
    int task = 0;
    // Starts later than this UTC instant ("2026-11-21T10:00:00Z"); empty: than now.
    std::string from;
    // The time zone to reckon in ("Europe/Berlin"); empty: the machine's.
    std::string zone;
    bool json = false;
};

// Prints the task's coming starts, one a line or as one JSON array: "utc", "local" (with its
// offset) and, where a change of the clock matters, "note". A disabled task has none. Yields the
// exit status; throws StoreFailure when the store fails.
int ShowComingStarts(const ComingStartsRequest& request);

}  // namespace orva
