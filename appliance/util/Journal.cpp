#include "appliance/util/Journal.h"

#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <cstdlib>
#include <string>

namespace orva {

bool IsJournal(int file) {
    const char* const journal = std::getenv("JOURNAL_STREAM");
    struct stat status {};
    return journal != nullptr && ::fstat(file, &status) == 0 &&
           std::to_string(status.st_dev) + ":" + std::to_string(status.st_ino) == journal;
}

int ForegroundLogOption() { return IsJournal(STDERR_FILENO) ? 0 : LOG_PERROR; }

}  // namespace orva
