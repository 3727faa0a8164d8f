#pragma once

#include <optional>
#include <string>

#include "platform/package.h"

namespace orva {

// The folder with a folder for each installed package, named after its id.
inline constexpr const char* kPackages = "/usr/orva/packages";

// What a package.json says: {"display_name": text, "startable": boolean, "start": command, "stop":
// command, "status": command}. Only "display_name" must be there; a missing "startable" is false, a
// missing command empty; other members are ignored. Nothing for anything else; `error` is then one
// line that says what is wrong.
[[nodiscard]] std::optional<ORVAPackageTool::PackageInfo> ParsePackageFile(
    const std::string& content, std::string& error);

}  // namespace orva
