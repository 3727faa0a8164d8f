// The way from those who change tasks to the scheduler. The scheduler holds an exclusive flock on
// the lock file for as long as it lives, and wakes up at every datagram that comes to its socket.
//
// A look at the lock takes it in shared mode for an instant: a scheduler that starts just then
// finds it held and has to try again shortly.
//
// Threads: any.
#pragma once

namespace orva {

class SchedulerLink {
  public:
    static constexpr const char* kLockFile = "/run/orva/schedd.lock";
    static constexpr const char* kSocket = "/run/orva/schedd.sock";

    // Whether a scheduler of this root is running.
    static bool IsAlive();

    // Tells the scheduler, if there is one, to look at the store again. Never waits; a scheduler
    // with more messages than it can hold has been told already.
    static void Wake();
};

}  // namespace orva
