#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "appliance/recycle/CleanRules.h"
#include "appliance/recycle/FileInfo.h"

namespace orva {

enum class RecycleAction : std::uint8_t { kEnable, kDisable, kClean, kHelp };

struct RecycleCommand {
    RecycleAction action = RecycleAction::kHelp;
    std::vector<std::string> shares;  // without repetitions, in the order given; empty: all
    CleanRules rules;
    bool preview = false;
    bool json = false;
    std::optional<FileTime> at;  // the instant that a preview is for
    std::optional<std::string> root;
};

struct ParsedCommandLine {
    std::optional<RecycleCommand> command;
    std::string error;  // one line for the user, when there is no command
};

// Understands the arguments after the program's name. Nothing is guessed: an unknown switch, a
// number that is not all digits, a switch without its value or with one that does not fit the
// others is an error.
ParsedCommandLine ParseCommandLine(std::span<const char* const> arguments);

// The help, with a line end at its end.
const char* RecycleHelp();

}  // namespace orva
