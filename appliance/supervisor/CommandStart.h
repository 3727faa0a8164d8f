// Starting a command as its owner, in two steps: the supervisor starts setpriv, which becomes the
// owner and hands over to this program once more; that enters the owner's home, which only the
// owner may be able to, and hands over to the shell.
#pragma once

#include <sys/types.h>

#include <optional>
#include <string>
#include <vector>

#include "appliance/supervisor/Owner.h"
#include "appliance/util/FileDescriptor.h"

namespace orva {

// What the program's first argument is for the second step; the command is the next one.
inline constexpr const char* kCommandStep = "--command";

// A process that is on its way to the command's shell.
class StartedCommand {
  public:
    // In a session and process group of its own, standard input empty, `output` for what it prints.
    // None with `why` set, a text that suits RunEnding::why.
    [[nodiscard]] static std::optional<StartedCommand> Start(
        const Owner& owner, const std::string& command, const std::vector<std::string>& environment,
        int output, std::string& why);

    // Also the id of its process group. Not reaped: that is left to the caller.
    pid_t Id() const { return pid; }
    // Readable when the shell has ended.
    int Watch() const { return watch.Get(); }

    // Waits until the shell runs, or cannot be run any more. True, or false with `why` set; what
    // setpriv has to say to that stands in the output.
    [[nodiscard]] bool WaitForShell(std::string& why);

  private:
    StartedCommand(pid_t process, FileDescriptor watched, FileDescriptor reports)
        : pid(process), watch(std::move(watched)), report(std::move(reports)) {}

    pid_t pid;
    FileDescriptor watch;
    FileDescriptor report;
};

// The second step: becomes the shell with this command. Returns, with a failure's exit status, only
// when it cannot.
int BecomeShell(const char* command);

}  // namespace orva
