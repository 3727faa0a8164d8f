#include "appliance/tools/Beep.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <chrono>
#include <csignal>
#include <memory>
#include <optional>
#include <string>
#include <system_error>

#include "appliance/tools/ToolOutput.h"
#include "appliance/util/StopSignals.h"

namespace orva {
namespace {

using Clock = std::chrono::steady_clock;

constexpr int kShortest = 1;
constexpr int kLongest = 600;
constexpr std::chrono::milliseconds kBellInterval{1000};

std::optional<std::chrono::seconds> ParseSeconds(std::string_view text) {
    int seconds = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, seconds);
    if (error != std::errc() || stop != end || seconds < kShortest || seconds > kLongest) {
        return std::nullopt;
    }
    return std::chrono::seconds(seconds);
}

// Waits for the time, or for a signal to stop: its number, 0 when the time is over.
int Pause(const StopSignals& signals, Clock::duration time) {
    const Clock::time_point deadline = Clock::now() + time;
    for (;;) {
        const auto left = std::max(deadline - Clock::now(), Clock::duration::zero());
        const auto seconds = std::chrono::floor<std::chrono::seconds>(left);
        const timespec timeout{seconds.count(), std::chrono::nanoseconds(left - seconds).count()};
        const int number = ::sigtimedwait(&signals.Held(), nullptr, &timeout);
        if (number > 0) {
            return number;
        }
        if (errno != EINTR) {
            return 0;
        }
    }
}

// Calls `sound` at once and then each `interval` until `length` is over, a signal to stop comes or
// it fails. The signal, 0 without one.
template <class SoundOnce>
int Repeat(const StopSignals& signals, Clock::duration length, Clock::duration interval,
           SoundOnce sound) {
    const Clock::time_point end = Clock::now() + length;
    int signal = 0;
    for (Clock::duration left = length; signal == 0 && left > Clock::duration::zero();
         left = end - Clock::now()) {
        if (!sound()) {
            break;
        }
        signal = Pause(signals, std::min(left, interval));
    }
    return signal;
}

int RingInstead(int terminal, std::chrono::seconds length, int status) {
    if (terminal < 0) {
        return status;
    }
    int signal = 0;
    {
        const StopSignals signals;
        signal = Repeat(signals, length, kBellInterval,
                        [terminal] { return ::write(terminal, "\a", 1) == 1; });
    }
    if (signal != 0) {
        EndBySignal(signal);
    }
    return status;
}

int TerminalToRing() {
    for (const int stream : {STDERR_FILENO, STDOUT_FILENO}) {
        if (::isatty(stream) != 0) {
            return stream;
        }
    }
    return -1;
}

}  // namespace

int Beep(std::string_view seconds) { return Beep(seconds, BuzzerPlaces(), TerminalToRing()); }

int Beep(std::string_view seconds, const BuzzerPlaces& places, int terminal) {
    const std::optional<std::chrono::seconds> length = ParseSeconds(seconds);
    if (!length) {
        return ComplainOfUsage("--beep needs a number of seconds from 1 to 600");
    }
    std::string problem;
    const std::unique_ptr<Buzzer> buzzer = OpenBuzzer(places, problem);
    if (buzzer == nullptr && problem.empty()) {
        Complain("this machine has no buzzer");
        return RingInstead(terminal, *length, kBeepNoBuzzer);
    }
    if (buzzer == nullptr) {
        Complain("the buzzer cannot be used: " + problem);
        return RingInstead(terminal, *length, kToolFailed);
    }
    int error = 0;
    int signal = 0;
    {
        const StopSignals signals;
        signal =
            Repeat(signals, *length, std::chrono::milliseconds(kToneInterval), [&buzzer, &error] {
                error = buzzer->Sound() ? 0 : errno;
                return error == 0;
            });
        buzzer->Silence();
    }
    if (signal != 0) {
        EndBySignal(signal);
    }
    if (error != 0) {
        return Complain("the buzzer failed: " + std::generic_category().message(error));
    }
    return kToolDone;
}

}  // namespace orva
