#include "appliance/supervisor/ProcessGroup.h"

#include <dirent.h>
#include <fcntl.h>

#include <cstdio>
#include <memory>
#include <string>
#include <string_view>

#include "appliance/util/FileDescriptor.h"

namespace orva {
namespace {

struct DirectoryClose {
    void operator()(DIR* directory) const { ::closedir(directory); }
};

bool LivesInGroup(const std::string& statusFile, pid_t group) {
    const FileDescriptor file(::open(statusFile.c_str(), O_RDONLY | O_CLOEXEC));
    char buffer[512];
    const ssize_t got = file.IsOpen() ? ::read(file.Get(), buffer, sizeof buffer - 1) : 0;
    const std::string status(buffer, got > 0 ? static_cast<std::size_t>(got) : 0);
    // The program's name in parentheses may hold blanks and parentheses.
    const std::size_t nameEnd = status.rfind(')');
    char state = 0;
    pid_t parent = 0;
    pid_t found = 0;
    return nameEnd != std::string::npos &&
           std::sscanf(status.c_str() + nameEnd + 1, " %c %d %d", &state, &parent, &found) == 3 &&
           found == group && state != 'Z' && state != 'X';
}

}  // namespace

bool HasLivingProcess(pid_t group) {
    const std::unique_ptr<DIR, DirectoryClose> processes(::opendir("/proc"));
    if (!processes) {
        return true;
    }
    while (const dirent* const entry = ::readdir(processes.get())) {
        const std::string_view name = entry->d_name;
        if (name.front() >= '1' && name.front() <= '9' &&
            LivesInGroup("/proc/" + std::string(name) + "/stat", group)) {
            return true;
        }
    }
    return false;
}

}  // namespace orva
