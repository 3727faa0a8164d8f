#include "appliance/supervisor/OutputPipe.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>

#include "appliance/supervisor/RunFiles.h"
#include "appliance/supervisor/RunRecords.h"

namespace orva {
namespace {

// A command that prints a lot is not kept waiting for each 64 KiB. Where the machine allows less,
// it stays as it is.
constexpr int kPipeSize = 256 * 1024;

}  // namespace

bool OutputPipe::Open() {
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) != 0) {
        return false;
    }
    reading = FileDescriptor(ends[0]);
    writing = FileDescriptor(ends[1]);
    ::fcntl(reading.Get(), F_SETFL, O_NONBLOCK);
    static_cast<void>(::fcntl(reading.Get(), F_SETPIPE_SZ, kPipeSize));
    return true;
}

void OutputPipe::KeepUntilEnd(OutputWriter& output, int watch) {
    std::array<pollfd, 2> watched = {pollfd{watch, POLLIN, 0}, pollfd{reading.Get(), POLLIN, 0}};
    for (;;) {
        if (::poll(watched.data(), watched.size(), -1) < 0) {
            continue;
        }
        if (watched[0].revents != 0) {
            break;
        }
        if (Take(output, buffer.size()) == 0) {
            // Nobody has it open any more.
            watched[1].fd = -1;
        }
    }
    KeepWhatIsThere(output);
}

void OutputPipe::KeepWhatIsThere(OutputWriter& output) {
    int left = 0;
    if (::ioctl(reading.Get(), FIONREAD, &left) != 0) {
        return;
    }
    while (left > 0) {
        const ssize_t got = Take(output, static_cast<std::size_t>(left));
        if (got <= 0) {
            return;
        }
        left -= static_cast<int>(got);
    }
}

void OutputPipe::KeepFor(OutputWriter& output, int milliseconds) {
    const std::uint64_t end = MonotonicNow() + static_cast<std::uint64_t>(milliseconds) * 1000;
    pollfd watched{reading.Get(), POLLIN, 0};
    for (std::uint64_t now = MonotonicNow(); now < end; now = MonotonicNow()) {
        if (::poll(&watched, 1, static_cast<int>((end - now) / 1000) + 1) == 1 &&
            Take(output, buffer.size()) == 0) {
            // Nobody has it open any more.
            watched.fd = -1;
        }
    }
}

void OutputPipe::LeaveToOthers() {
    // Before there could be a second process that has it.
    ::close(kSupervisorLock);
    pollfd state{reading.Get(), POLLIN, 0};
    if ((::poll(&state, 1, 0) == 1 && (state.revents & POLLHUP) != 0) || ::fork() != 0) {
        return;
    }
    // Everything else is let go of, such as the space of files that will be removed.
    ::fcntl(reading.Get(), F_SETFL, 0);
    ::dup2(reading.Get(), STDIN_FILENO);
    ::close_range(STDIN_FILENO + 1, ~0U, 0);
    static_cast<void>(::chdir("/"));
    while (::read(STDIN_FILENO, buffer.data(), buffer.size()) > 0) {
    }
    ::_exit(EXIT_SUCCESS);
}

ssize_t OutputPipe::Take(OutputWriter& output, std::size_t limit) {
    const ssize_t got = ::read(reading.Get(), buffer.data(), std::min(limit, buffer.size()));
    if (got > 0) {
        output.Append({buffer.data(), static_cast<std::size_t>(got)});
    }
    return got;
}

}  // namespace orva
