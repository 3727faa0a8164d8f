// The account that a command runs as, and the environment that it finds.
//
// Threads: any.
#pragma once

#include <sys/types.h>

#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace orva {

struct Owner {
    std::string name;
    std::string home;
    uid_t user = 0;
    gid_t group = 0;
};

// The account `name`, if a command may be run as it: by root as anybody, by others as themselves.
// None with `why` set, a text that suits RunEnding::why.
[[nodiscard]] std::optional<Owner> FindOwner(const std::string& name, std::string& why);

// Whether this process has the owner's user, group and login groups already, or has the user and
// cannot change the groups.
bool IsOwner(const Owner& owner);

// All that a command finds in its environment ("NAME=value"), whoever starts it and from wherever:
// PATH, HOME, USER, LOGNAME, SHELL, LANG, TZ (this process's, else the machine's), and ORVA_ROOT
// when this process has one other than /. `more` is added, or takes the place of a variable of that
// name.
std::vector<std::string> CleanEnvironment(
    const Owner& owner, const std::vector<std::pair<std::string, std::string>>& more);

}  // namespace orva
