// Tasks name the appliance's programs by fixed paths: /usr/orva/bin/..., and /tmp/orvaschedtool,
// where in the machine's own /tmp anybody could put a program of theirs. So the scheduler, and with
// it all that it starts, lives in a view of the file system in which
//
//   /tmp                is private, empty at first, sticky and root's,
//   /tmp/orvaschedtool  is the appliance's program, and cannot be changed or removed,
//   /usr/orva           is the one below the root.
//
// All else is the machine's own, at its place: the root's directory too, wherever it lies. What
// does not exist yet when the view is made cannot be made in / and /usr from within. Set-user-id
// programs (sudo, su) have no effect in it.
#pragma once

#include <string>

namespace orva {

// Moves this process, which keeps its id and open files, into such a view, which ends with the last
// process in it; bubblewrap makes it. Nothing is done when the process lives in one already: a
// service unit makes one too.
//
// False with `error`, one line, when there is none: bubblewrap is not installed, or the kernel
// forbids it, as in many containers. The process is not to start any task then.
//
// Call it before the first thread starts; root must be set. As an ordinary user the process is
// alone in a user namespace afterwards, with the same user and no more rights than before.
[[nodiscard]] bool EnterPrivateView(std::string& error);

}  // namespace orva
