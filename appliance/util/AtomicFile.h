#pragma once

#include <string>
#include <string_view>

namespace orva {

// Replaces the file at `path` by one that holds `content`: readers see the old bytes or the new
// ones, and so does the machine after a power cut. Mode and owner of a former file are kept, a new
// file gets 0644. The caller keeps other writers of the same file away (it is prepared beside it
// under a fixed name). Whatever stands at `path` is replaced, a link or a device too.
//
// 0, or negative with the last error and errno set: the former file is untouched then, unless only
// the record of the replacement itself could not be made durable.
[[nodiscard]] int WriteFileAtomically(const std::string& path, std::string_view content);

}  // namespace orva
