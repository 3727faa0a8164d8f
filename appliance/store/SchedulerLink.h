// The way from those who change tasks to the scheduler. The scheduler holds an exclusive flock on
// the lock file for as long as it lives. Its socket takes datagrams: kWakeMessage, or kStopMessage
// and the decimal number of a run. The latter is answered to its sender: an empty datagram when it
// was done, else the reason why not, as text for people.
//
// A look at the lock takes it in shared mode for an instant: a scheduler that starts just then
// finds it held and has to try again shortly.
//
// Threads: any.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>

namespace orva {

class SchedulerLink {
  public:
    static constexpr const char* kLockFile = "/run/orva/schedd.lock";
    static constexpr const char* kSocket = "/run/orva/schedd.sock";
    static constexpr const char* kWakeMessage = "w";
    static constexpr const char* kStopMessage = "stop ";
    // No message or answer is longer than so many bytes.
    static constexpr std::size_t kLongestMessage = 512;

    // Whether a scheduler of this root is running. False as well for an account that may not open
    // the lock file: those who may write the task store's directory may.
    static bool IsAlive();

    // Tells the scheduler, if there is one, to look at the store again. Never waits; a scheduler
    // with more messages than it can hold has been told already.
    static void Wake();

    // Has the scheduler end a run: the processes of its command get SIGTERM, and SIGKILL 10 seconds
    // later if any is left. Does not wait for the end. Nothing when the signal was sent, else why
    // it could not be. Waits up to 16 seconds for the scheduler's answer.
    [[nodiscard]] static std::optional<std::string> Stop(std::int64_t run);
};

}  // namespace orva
