#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

// The words that a POSIX shell makes of a command line of literal words: quotes and backslashes are
// taken away, blanks outside them separate. Nothing when the line holds anything that a shell gives
// another meaning (expansions, operators, patterns, comments) or a quote without an end.
std::optional<std::vector<std::string>> SplitShellWords(std::string_view line);
