#include "appliance/tools/Buzzer.h"

#include <fcntl.h>
#include <linux/input.h>
#include <linux/kd.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <optional>
#include <system_error>
#include <utility>

#include "appliance/util/FileDescriptor.h"

namespace orva {
namespace {

namespace fs = std::filesystem;

constexpr int kTone = 1000;  // hertz
// What the console's tone call counts a period in.
constexpr unsigned long kConsoleClock = 1'193'180;

// An input device that sounds.
struct SoundInput {
    std::string node;         // empty when none was made for it
    bool soundsTone = false;  // otherwise it knows one sound only
};

// The sounds that an input device knows, as bits; none when the file is missing or damaged.
std::uint64_t SoundsOf(const fs::path& device) {
    std::ifstream file(device / "capabilities" / "snd");
    // The words of a bitmap, the lowest bits last.
    std::string word;
    while (file >> word) {
    }
    std::uint64_t bits = 0;
    const char* const end = word.data() + word.size();
    const auto [stop, error] = std::from_chars(word.data(), end, bits, 16);
    return error == std::errc() && stop == end ? bits : 0;
}

std::string NodeOf(const fs::path& device, const std::string& nodes) {
    std::error_code error;
    for (fs::directory_iterator entry(device, error), end; !error && entry != end;
         entry.increment(error)) {
        const std::string name = entry->path().filename();
        if (name.starts_with("event")) {
            return std::string(nodes).append("/").append(name);
        }
    }
    return {};
}

std::vector<SoundInput> FindSoundInputs(const BuzzerPlaces& places) {
    std::vector<fs::path> devices;
    std::error_code error;
    for (fs::directory_iterator entry(places.inputs, error), end; !error && entry != end;
         entry.increment(error)) {
        if (entry->path().filename().string().starts_with("input")) {
            devices.push_back(entry->path());
        }
    }
    std::sort(devices.begin(), devices.end());
    std::vector<SoundInput> found;
    for (const fs::path& device : devices) {
        const std::uint64_t sounds = SoundsOf(device);
        const bool tone = ((sounds >> SND_TONE) & 1) != 0;
        if (tone || ((sounds >> SND_BELL) & 1) != 0) {
            found.push_back({NodeOf(device, places.nodes), tone});
        }
    }
    return found;
}

class InputBuzzer final : public Buzzer {
  public:
    InputBuzzer(FileDescriptor opened, bool tone)
        : node(std::move(opened)), sound(tone ? SND_TONE : SND_BELL), on(tone ? kTone : 1) {}

    bool Sound() override { return Send(on); }
    bool Silence() override { return Send(0); }

  private:
    bool Send(int value) const {
        std::array<input_event, 2> events{};
        events[0].type = EV_SND;
        events[0].code = sound;
        events[0].value = value;
        events[1].type = EV_SYN;
        events[1].code = SYN_REPORT;
        return ::write(node.Get(), events.data(), sizeof events) ==
               static_cast<ssize_t>(sizeof events);
    }

    FileDescriptor node;
    std::uint16_t sound;
    int on;
};

class ConsoleBuzzer final : public Buzzer {
  public:
    explicit ConsoleBuzzer(FileDescriptor opened) : console(std::move(opened)) {}

    // With its length, so that the kernel ends it even when this process is killed.
    bool Sound() override {
        return ::ioctl(console.Get(), KDMKTONE,
                       static_cast<unsigned long>(kToneTime) << 16 | kConsoleClock / kTone) == 0;
    }
    bool Silence() override { return ::ioctl(console.Get(), KDMKTONE, 0UL) == 0; }

  private:
    FileDescriptor console;
};

FileDescriptor OpenToWrite(const std::string& path) {
    return FileDescriptor(::open(path.c_str(), O_WRONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
}

}  // namespace

bool HasBuzzer(const BuzzerPlaces& places) { return !FindSoundInputs(places).empty(); }

std::unique_ptr<Buzzer> OpenBuzzer(const BuzzerPlaces& places, std::string& problem) {
    problem.clear();
    const std::vector<SoundInput> inputs = FindSoundInputs(places);
    if (inputs.empty()) {
        return nullptr;
    }
    const auto complain = [&problem](const std::string& path, int error) {
        problem +=
            (problem.empty() ? "" : "; ") + path + ": " + std::generic_category().message(error);
    };
    for (const SoundInput& input : inputs) {
        if (input.node.empty()) {
            continue;
        }
        FileDescriptor node = OpenToWrite(input.node);
        if (node.IsOpen()) {
            return std::make_unique<InputBuzzer>(std::move(node), input.soundsTone);
        }
        complain(input.node, errno);
    }
    for (const std::string& path : places.consoles) {
        FileDescriptor console = OpenToWrite(path);
        if (!console.IsOpen()) {
            complain(path, errno);
            continue;
        }
        // The device may be a serial line, which has no such call.
        auto buzzer = std::make_unique<ConsoleBuzzer>(std::move(console));
        if (buzzer->Silence()) {
            return buzzer;
        }
        complain(path, errno);
    }
    if (problem.empty()) {
        problem = "it has no device node";
    }
    return nullptr;
}

}  // namespace orva
