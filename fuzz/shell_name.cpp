// A name that goes into a shell command line.
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "fuzz/Require.h"
#include "fuzz/ShellWords.h"
#include "include/lib.h"
#include "tests/fakes/RecordingPlatform.h"

// The appliance's own encoder, compiled under this name; the linker sends the module's calls to the
// function below it.
int ApplianceQLIBCEncShParam(const char* text, char* buffer, int size);
extern "C" int __wrap__Z15QLIBCEncShParamPKcPci(const char* text, char* buffer, int size);
extern "C" int __wrap__Z15QLIBCEncShParamPKcPci(const char* text, char* buffer, int size) {
    return ApplianceQLIBCEncShParam(text, buffer, size);
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string bytes(reinterpret_cast<const char*>(data), size);
    // A name cannot hold a NUL.
    const std::string name = bytes.substr(0, bytes.find('\0'));
    const fakes::RecordingPlatform platform;
    const std::string word = EscapeShellName(name);
    if (!word.empty()) {
        Require(SplitShellWords(word) == std::vector<std::string>{name},
                "a shell reads the name back as one word");
    }
    return 0;
}
