#include "appliance/supervisor/SupervisorStart.h"

#include <fcntl.h>
#include <spawn.h>
#include <unistd.h>

#include <cstring>

#include "appliance/supervisor/RunFiles.h"
#include "appliance/supervisor/Spawn.h"

namespace orva {
std::optional<pid_t> StartSupervisor(const std::string& program, const RunFolder& folder,
                                     FileDescriptor lock, std::string& error) {
    SpawnActions actions;
    ::posix_spawn_file_actions_adddup2(actions.Get(), lock.Get(), kSupervisorLock);
    ::posix_spawn_file_actions_addopen(actions.Get(), STDIN_FILENO, "/dev/null", O_RDWR, 0);
    ::posix_spawn_file_actions_adddup2(actions.Get(), STDIN_FILENO, STDOUT_FILENO);
    ::posix_spawn_file_actions_adddup2(actions.Get(), STDIN_FILENO, STDERR_FILENO);
    ::posix_spawn_file_actions_addclosefrom_np(actions.Get(), kSupervisorLock + 1);

    const SpawnAttributes attributes;
    char* const arguments[] = {const_cast<char*>(program.c_str()),
                               const_cast<char*>(folder.Path().c_str()), nullptr};
    pid_t pid = -1;
    const int failed =
        ::posix_spawn(&pid, program.c_str(), actions.Get(), attributes.Get(), arguments, environ);
    if (failed != 0) {
        error = "cannot start " + program + ": " + std::strerror(failed);
        return std::nullopt;
    }
    return pid;
}

}  // namespace orva
