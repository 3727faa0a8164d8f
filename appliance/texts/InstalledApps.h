#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace orva {

// What an application's app.json says.
struct AppDescription {
    std::string id;
    // Directory of its texts, one folder a language in it, relative to the application's folder.
    std::string texts;
};

// An application whose texts are to be used.
struct InstalledApp {
    std::string folder;  // its name below apps/
    AppDescription description;
};

// The description in `content`, {"id": text, "texts": directory}; other members are ignored.
// Nothing for anything else, for an empty id, and for a directory that is empty, absolute or leads
// upwards; `error` is then one line that says what is wrong.
[[nodiscard]] std::optional<AppDescription> ParseAppDescription(const std::string& content,
                                                                std::string& error);

// The applications below `directory` (<directory>/<name>/app.json) in ascending order of the bytes
// of their folders' names, without the damaged ones. Of two with the same id the first one counts.
// What is left out is logged once for every version of it. Shared as long as nothing changes;
// never null.
//
// Threads: any.
[[nodiscard]] std::shared_ptr<const std::vector<InstalledApp>> FindInstalledApps(
    const std::string& directory);

}  // namespace orva
