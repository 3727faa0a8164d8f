#pragma once

#include <string_view>

#include "appliance/tools/Buzzer.h"

namespace orva {

// The exit status on a machine without a buzzer.
inline constexpr int kBeepNoBuzzer = 3;

// `orvaschedtool --beep SECONDS`: sounds the machine's buzzer for `seconds`, a plain decimal number
// from 1 to 600. Yields the exit status: kToolDone, kToolFailed when the buzzer cannot be used,
// kToolUsage for any other text, kBeepNoBuzzer. Whatever keeps it from sounding is one line on
// standard error; a terminal there, or else on standard output, rings its bell in the buzzer's
// place. TERM, INT and HUP end the sound and then the program, by the same signal.
int Beep(std::string_view seconds);

// As above with other places to look for devices in and the descriptor of a terminal to ring (-1:
// none).
int Beep(std::string_view seconds, const BuzzerPlaces& places, int terminal);

}  // namespace orva
