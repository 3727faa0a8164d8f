#pragma once

#include <csignal>

namespace orva {

// Holds back the signals that ask a program to stop (TERM, INT and HUP, unless they are ignored)
// while it does what it must put in order before it ends. For programs of one thread.
class StopSignals {
  public:
    StopSignals();
    // One that came and that nobody took takes effect now.
    ~StopSignals();
    StopSignals(const StopSignals&) = delete;
    StopSignals& operator=(const StopSignals&) = delete;

    // Those that are held back, to be taken with sigtimedwait or a signalfd.
    const sigset_t& Held() const { return held; }
    // What was blocked before, for children.
    const sigset_t& Former() const { return former; }

  private:
    sigset_t held{};
    sigset_t former{};
};

// Ends this program by `number`, a signal that was held back, so that whoever waits for it sees it
// ended by that.
void EndBySignal(int number);

}  // namespace orva
