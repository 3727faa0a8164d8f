#pragma once

#include <chrono>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace orva {

// What starting and stopping one service means: systemd units, or a command line each.
struct Service {
    std::vector<std::string> units;
    std::string startCommand;
    std::string stopCommand;
    // How long each unit, or the command, may take.
    std::chrono::seconds limit{60};
};

// The services of this appliance by the names that tasks know them by.
using ServiceTable = std::map<std::string, Service, std::less<>>;

// The table that is shipped, and the appliance's own, whose entries replace those of the same name.
// Either may be missing.
inline constexpr const char* kShippedServices = "/usr/orva/share/services.json";
inline constexpr const char* kOwnServices = "/usr/orva/etc/services.json";

// What a table says: {"services": {NAME: {"units": [unit, ...]} or {"start": command, "stop":
// command}}}; beside either "seconds" (1 to 3600) limits its time, and other members are ignored.
// Nothing for anything else; `error` is then one line that says what is wrong.
[[nodiscard]] std::optional<ServiceTable> ParseServiceTable(const std::string& content,
                                                            std::string& error);

// Both tables together. Nothing when one cannot be read or is damaged, or both are missing: with
// half a table a name could mean something else. `error` is then one line.
[[nodiscard]] std::optional<ServiceTable> LoadServiceTable(std::string& error);

}  // namespace orva
