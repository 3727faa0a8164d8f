// How programs end when their command line has been read no further.
#pragma once

#include <CLI/CLI.hpp>
#include <cstdio>
#include <string>
#include <vector>

#include "appliance/recycle/ByteText.h"

namespace orva {

// One line that says what is wrong with the command line; an argument that nobody knows comes
// before all that is missing, which may be but mistyped.
inline std::string UsageProblem(const CLI::App& app, const CLI::ParseError& error) {
    const std::vector<std::string> unknown = app.remaining(true);
    if (!unknown.empty()) {
        return "unknown argument " + QuoteForTerminal(unknown.front());
    }
    std::string text = error.what();
    const std::string name = text.substr(0, text.find(':'));
    const CLI::Option* option = app.get_option_no_throw(name);
    if (error.get_name() == "ArgumentMismatch" && option != nullptr) {
        const bool tooMany = text.find("At Most") != std::string::npos;
        return tooMany ? name + " is given more than once"
                       : name + " needs " + option->get_type_name();
    }
    return text;
}

// What CLI11 has thrown, for people. Yields the exit status: 0 when help was asked for, which is
// printed, else 2.
inline int EndOfCommandLine(const char* program, const CLI::App& app,
                            const CLI::ParseError& error) {
    constexpr int kUsage = 2;
    if (error.get_exit_code() == static_cast<int>(CLI::ExitCodes::Success)) {
        return app.exit(error);
    }
    std::fprintf(stderr, "%s: %s (see %s --help)\n", program, UsageProblem(app, error).c_str(),
                 program);
    return kUsage;
}

}  // namespace orva
