#pragma once

#include <linux/input.h>

#include <cstring>
#include <string>
#include <vector>

#include "appliance/tools/Buzzer.h"
#include "tests/appliance/util/Sandbox.h"

namespace orva {

// A machine whose input devices are files of the sandbox: what is written to their nodes stays
// there.
class BuzzerTest : public Sandbox {
  protected:
    // No consoles: those of this machine must stay silent.
    BuzzerPlaces Places() const {
        return {RootPath() + "/sys/class/input", RootPath() + "/dev/input", {}};
    }

    // Adds an input device with the bitmap of the sounds that it knows, as the kernel shows it. No
    // node is made for an empty `node`.
    void AddInput(const std::string& name, const std::string& sounds,
                  const std::string& node) const {
        const std::string device = "/sys/class/input/" + name;
        Write(device + "/name", "A device\n");
        Write(device + "/capabilities/snd", sounds + "\n");
        if (!node.empty()) {
            MakeDirectory(device + "/" + node);
            Write("/dev/input/" + node, "");
        }
    }

    std::string NodeOf(const std::string& node) const { return RootPath() + "/dev/input/" + node; }

    // What the device was told: "tone 1000", "bell 0", ... An event that is not followed by its
    // end, or of another kind, is "?".
    std::vector<std::string> Sounds(const std::string& node) const {
        const std::string bytes = Read("/dev/input/" + node);
        std::vector<std::string> sounds;
        for (std::size_t at = 0; at < bytes.size(); at += 2 * sizeof(input_event)) {
            input_event events[2] = {};
            std::memcpy(events, bytes.data() + at, std::min(sizeof events, bytes.size() - at));
            const bool whole = events[0].type == EV_SND && events[1].type == EV_SYN &&
                               events[1].code == SYN_REPORT && events[1].value == 0;
            const char* kind = events[0].code == SND_TONE ? "tone " : "bell ";
            sounds.push_back(whole ? kind + std::to_string(events[0].value) : "?");
        }
        return sounds;
    }
};

}  // namespace orva
