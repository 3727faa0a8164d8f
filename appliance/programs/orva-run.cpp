// The supervisor of one run; the scheduler starts one for each.
#include <fcntl.h>
#include <syslog.h>

#include <cstdio>
#include <cstring>

#include "appliance/supervisor/CommandStart.h"
#include "appliance/supervisor/RunFiles.h"
#include "appliance/supervisor/Supervisor.h"

namespace {

enum ExitStatus : int { kRecorded = 0, kNotRecorded = 1, kWrongUsage = 2 };

}  // namespace

int main(int argc, char** argv) {
    if (argc == 3 && std::strcmp(argv[1], orva::kCommandStep) == 0) {
        return orva::BecomeShell(argv[2]);
    }
    if (argc != 2 || ::fcntl(orva::kSupervisorLock, F_GETFD) < 0) {
        std::fputs("orva-run: started by the scheduler only, with the folder of a run\n", stderr);
        return kWrongUsage;
    }
    ::openlog("orva-run", LOG_PID, LOG_DAEMON);
    return orva::Supervise(argv[1]) ? kRecorded : kNotRecorded;
}
