#pragma once

#include <memory>
#include <string>
#include <vector>

namespace orva {

// Where the kernel shows its input devices, where their nodes are, and the consoles whose tone call
// reaches the buzzer when no node can be used.
struct BuzzerPlaces {
    std::string inputs = "/sys/class/input";
    std::string nodes = "/dev/input";
    std::vector<std::string> consoles = {"/dev/tty0", "/dev/console"};
};

// An opened buzzer, silent until it is told to sound.
class Buzzer {
  public:
    virtual ~Buzzer() = default;
    // Sounds until Silence, or for kToneTime at least: to be called again before that is over.
    // False with errno set.
    [[nodiscard]] virtual bool Sound() = 0;
    // False with errno set.
    virtual bool Silence() = 0;
};

// How often a sounding buzzer is told again, in milliseconds; a tone lasts longer than that.
inline constexpr int kToneInterval = 500;
inline constexpr int kToneTime = 1500;

// Whether this machine has a buzzer: an input device that can ring or sound a tone. A console's
// tone call alone does not tell, it succeeds on machines without any.
bool HasBuzzer(const BuzzerPlaces& places = {});

// The machine's buzzer: the first one's own device node, else a console. Null when there is none
// (`problem` is empty then) or none can be used (`problem` is one line that says why).
std::unique_ptr<Buzzer> OpenBuzzer(const BuzzerPlaces& places, std::string& problem);

}  // namespace orva
