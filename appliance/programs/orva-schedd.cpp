// The scheduler: starts tasks at their time and keeps their history.
#include <signal.h>
#include <syslog.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <string>

#include "appliance/programs/UsageError.h"
#include "appliance/root/Root.h"
#include "appliance/scheduler/Daemon.h"
#include "appliance/scheduler/PrivateView.h"
#include "appliance/scheduler/RuntimeFiles.h"
#include "appliance/store/TaskStore.h"
#include "appliance/util/Journal.h"

namespace {

// Another scheduler runs for this root, or what it needs around it cannot be made.
constexpr int kRefused = 3;
constexpr const char* kSupervisor = "orva-run";
// The loop stands still while it waits for another process that holds the database.
constexpr std::chrono::milliseconds kBusyTimeout{2000};

// The loop takes them; blocked before anything starts a thread.
void BlockSignals() {
    sigset_t signals;
    ::sigemptyset(&signals);
    for (const int signalNumber : {SIGTERM, SIGINT, SIGHUP, SIGCHLD}) {
        ::sigaddset(&signals, signalNumber);
    }
    ::pthread_sigmask(SIG_BLOCK, &signals, nullptr);
    ::signal(SIGPIPE, SIG_IGN);
}

// Stands beside this program. Asked before the view is entered: from within, a program that was
// started outside has no certain path.
std::string SupervisorProgram() {
    std::error_code error;
    const std::filesystem::path own = std::filesystem::read_symlink("/proc/self/exe", error);
    return (own.parent_path() / kSupervisor).string();
}

int Run(bool withView) {
    BlockSignals();
    const std::string supervisor = SupervisorProgram();
    std::string error;
    if (!withView) {
        ::syslog(LOG_WARNING,
                 "no private view of files: what other users put into /tmp may be run as a "
                 "task's program");
    } else if (!orva::EnterPrivateView(error)) {
        ::syslog(LOG_ERR, "%s", error.c_str());
        return kRefused;
    }
    const orva::FileDescriptor lock = orva::LockAsScheduler(error);
    if (!lock.IsOpen()) {
        ::syslog(LOG_ERR, "%s", error.c_str());
        return kRefused;
    }
    // Holds on to no folder that somebody may want to unmount.
    if (::chdir("/") != 0) {
        ::syslog(LOG_WARNING, "the working directory cannot be changed to /");
    }
    orva::TaskStore::Configure({kBusyTimeout, {}});
    try {
        return orva::Daemon(supervisor).Run();
    } catch (const std::exception& problem) {
        ::syslog(LOG_ERR, "%s", problem.what());
        return EXIT_FAILURE;
    }
}

}  // namespace

int main(int argc, char** argv) {
    CLI::App app("The scheduler of the appliance. Runs in the foreground.");
    std::string root;
    app.add_option("--root", root,
                   "Directory below which the appliance lives (default: ORVA_ROOT, or /)")
        ->type_name("DIR");
    bool withoutView = false;
    app.add_flag("--no-view", withoutView,
                 "Run without a private view of files, where bubblewrap cannot work; /tmp is "
                 "everybody's then, and tasks name a program in it");
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return orva::EndOfCommandLine("orva-schedd", app, error);
    }

    ::openlog("orva-schedd", LOG_PID | orva::ForegroundLogOption(), LOG_DAEMON);
    if (!root.empty()) {
        orva::SetRoot(root);
    }
    return Run(!withoutView);
}
