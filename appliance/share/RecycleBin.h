#pragma once

#include <string>

namespace orva {

// Makes the folder ".recycle" in `directory`, a real path, unless it is there; durable on return.
// The new folder belongs to the directory's owner and group and gives them the directory's rights,
// everybody else none. An existing folder keeps its rights. Neither `directory` itself nor the
// folder may be a link: a user of the share could point it anywhere. 0, negative with the last
// error set.
[[nodiscard]] int MakeRecycleBin(const std::string& directory);

}  // namespace orva
