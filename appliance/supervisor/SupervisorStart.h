#pragma once

#include <sys/types.h>

#include <optional>
#include <string>

#include "appliance/supervisor/RunFolder.h"

namespace orva {

// Starts `program`, the full path of `orva-run`, for a folder that RunFolder::Create has made;
// `lock` is what that yielded. It runs in a session of its own, with no signal blocked or ignored,
// without any other open file of the caller's, and reads and writes nothing but the folder. Wait
// for it by its pidfd and reap it; it exits when the ending is in the folder.
//
// The process's id; none with `error` set.
[[nodiscard]] std::optional<pid_t> StartSupervisor(const std::string& program,
                                                   const RunFolder& folder, FileDescriptor lock,
                                                   std::string& error);

}  // namespace orva
