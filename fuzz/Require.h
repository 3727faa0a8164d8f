#pragma once

#include <cstdio>
#include <cstdlib>
#include <string_view>

// Ends the process, which the fuzzer counts as a finding, unless the promise is kept.
inline void Require(bool kept, std::string_view promise) {
    if (!kept) {
        std::fprintf(stderr, "broken promise: %.*s\n", static_cast<int>(promise.size()),
                     promise.data());
        std::abort();
    }
}
