#pragma once

#include <sys/types.h>

#include <array>
#include <cstddef>

#include "appliance/supervisor/OutputFile.h"
#include "appliance/util/FileDescriptor.h"

namespace orva {

// The pipe that a command's standard output and error go into. Threads: one at a time.
class OutputPipe {
  public:
    // False with errno. The others want it open.
    bool Open();
    int WritingEnd() const { return writing.Get(); }
    void CloseWritingEnd() { writing = FileDescriptor(); }

    // Keeps what is printed until the process behind `watch` (a pidfd) has ended, and what it had
    // printed by then.
    void KeepUntilEnd(OutputWriter& output, int watch);

    // Keeps what has been printed by now, and no more: what others print from now on is not the
    // command's, and the pipe may never become empty.
    void KeepWhatIsThere(OutputWriter& output);

    // Keeps what is printed in the next so many milliseconds.
    void KeepFor(OutputWriter& output, int milliseconds);

    // Lets a process of its own throw away what is still printed, if there is anybody who could.
    // Gives up the run's lock.
    void LeaveToOthers();

  private:
    // What read() says of one read of at most `limit` bytes.
    ssize_t Take(OutputWriter& output, std::size_t limit);

    FileDescriptor reading;
    FileDescriptor writing;
    std::array<char, std::size_t{64} * 1024> buffer{};
};

}  // namespace orva
