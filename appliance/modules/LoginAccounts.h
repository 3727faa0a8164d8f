#pragma once

#include <string>
#include <vector>

namespace orva {

// The accounts that people log in to, by name, after "root", which is always among them: those with
// a shell that the machine counts among the login shells (/etc/shells). May ask the name services,
// which may be slow.
//
// Threads: any.
std::vector<std::string> LoginAccounts();

}  // namespace orva
