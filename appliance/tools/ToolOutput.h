// What the verbs of orvaschedtool share: exit statuses and how they speak.
#pragma once

#include <string>
#include <string_view>

namespace orva {

inline constexpr int kToolDone = 0;
inline constexpr int kToolFailed = 1;
inline constexpr int kToolUsage = 2;

// One line on standard error, after the program's name. Yields kToolFailed.
int Complain(const std::string& about);

// The same for a command line that makes no sense, with the way to help. Yields kToolUsage.
int ComplainOfUsage(const std::string& about);

// Writes all of `text` to standard output. Yields kToolDone, or complains when it cannot be
// written.
int WriteOut(std::string_view text);

}  // namespace orva
