#pragma once

#include <string>
#include <string_view>

namespace orva {

// The directory below which every absolute path of the appliance is found: "/" on an installed one,
// any directory for a second appliance on the same machine. Starts as the environment's ORVA_ROOT,
// "/" when that is unset or empty.
//
// Threads: reading is safe at any time; SetRoot belongs to a program's start, before its threads.
std::string Root();

// Takes over `directory`, made absolute against the working directory. Open stores and cached files
// of the former root are left to their owners. The environment's ORVA_ROOT is set too, so that
// children find the same appliance.
void SetRoot(const std::string& directory);

// Why the root can hold no appliance, as "the root /x: No such file or directory"; empty when it is
// a directory. Programs that make what they miss ask first: a mistyped root would become a second
// appliance.
[[nodiscard]] std::string RootProblem();

// The place of `path`, an absolute path of the appliance ("/usr/orva/etc/orva.conf"), below the
// root.
std::string ResolvePath(std::string_view path);

}  // namespace orva
