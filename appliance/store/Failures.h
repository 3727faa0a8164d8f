#pragma once

#include <new>

#include "appliance/store/StoreFailure.h"

namespace orva {

// Records the failure as this thread's last error; yields -1.
inline int RecordFailure(const StoreFailure& failure) {
    return Fail(failure.Code(), failure.File(), failure.Line());
}

// Runs `operation`, which yields an int, and turns the exceptions of the store into the last error
// and -1.
template <class Operation>
[[nodiscard]] int OrFail(Operation operation, const char* file = __builtin_FILE(),
                         int line = __builtin_LINE()) {
    try {
        return operation();
    } catch (const StoreFailure& failure) {
        return RecordFailure(failure);
    } catch (const std::bad_alloc&) {
        return Fail(kErrNoMemory, file, line);
    }
}

}  // namespace orva
