#pragma once

#include <cstdint>

namespace orva {

// One call of a web-API method, from its beginning to its end, on the thread that serves it. What a
// call has read may serve it again until it ends: it then works on one state of a task from the
// first look to the last, and reads it once.
//
// Threads: belongs to the one that made it. Calls do not nest.
class CallScope {
  public:
    CallScope();
    ~CallScope();
    CallScope(const CallScope&) = delete;
    CallScope& operator=(const CallScope&) = delete;

    // The number of the call that this thread serves; 0 outside of one. No two calls of a thread
    // have the same.
    static std::uint64_t Current();
};

}  // namespace orva
