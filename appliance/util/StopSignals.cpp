#include "appliance/util/StopSignals.h"

#include <pthread.h>

#include <initializer_list>

namespace orva {

StopSignals::StopSignals() {
    sigemptyset(&held);
    for (const int number : {SIGTERM, SIGINT, SIGHUP}) {
        struct sigaction action {};
        if (::sigaction(number, nullptr, &action) == 0 && action.sa_handler != SIG_IGN) {
            sigaddset(&held, number);
        }
    }
    ::pthread_sigmask(SIG_BLOCK, &held, &former);
}

StopSignals::~StopSignals() { ::pthread_sigmask(SIG_SETMASK, &former, nullptr); }

void EndBySignal(int number) {
    ::signal(number, SIG_DFL);
    sigset_t only;
    sigemptyset(&only);
    sigaddset(&only, number);
    ::raise(number);
    ::pthread_sigmask(SIG_UNBLOCK, &only, nullptr);
}

}  // namespace orva
