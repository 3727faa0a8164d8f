#pragma once

#include <string>

namespace orva {

// Makes the folder ".recycle" in `directory`, a real path, unless it is there; durable on return.
// The new folder belongs to the directory's owner and group and gives them the directory's rights,
// everybody else none; it appears complete or, after a crash, not at all. An existing folder keeps
// its rights. Neither `directory` itself nor the folder may be a link: a user of the share could
// point it anywhere.
//
// A process that may not give folders away makes one of its own owner in the share's group. Where
// even the group is out of its reach and the share lets its group in, nothing is made: the share's
// people could not use it (kErrNotAllowed, with a line in the log). 0, negative with the last error
// set.
[[nodiscard]] int MakeRecycleBin(const std::string& directory);

}  // namespace orva
