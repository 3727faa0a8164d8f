#include "appliance/tools/ToolOutput.h"

#include <cstdio>

namespace orva {

int Complain(const std::string& about) {
    std::fprintf(stderr, "orvaschedtool: %s\n", about.c_str());
    return kToolFailed;
}

int ComplainOfUsage(const std::string& about) {
    Complain(about + " (see orvaschedtool --help)");
    return kToolUsage;
}

int WriteOut(std::string_view text) {
    const bool written = std::fwrite(text.data(), 1, text.size(), stdout) == text.size();
    return std::fflush(stdout) == 0 && written ? kToolDone : Complain("cannot write the output");
}

}  // namespace orva
