// The web-API server.
#include <malloc.h>
#include <signal.h>
#include <syslog.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "appliance/root/Root.h"
#include "appliance/server/AccessToken.h"
#include "appliance/server/HttpServer.h"
#include "appliance/server/ListenSocket.h"
#include "appliance/server/Router.h"
#include "appliance/webapi/Dispatcher.h"
#include "appliance/webapi/ModuleLoader.h"

namespace {

constexpr char kTokenFile[] = "/usr/orva/etc/webapi.token";
constexpr char kModulesDirectory[] = "/usr/orva/lib";

// How long requests that have begun may still take after the signal to stop.
constexpr std::chrono::seconds kDrainTime{30};
// How often the wait for them looks for a second signal.
constexpr timespec kSignalCheck{0, 50'000'000};

struct Arguments {
    std::string root;
    std::string listen = "127.0.0.1:5080";
    std::string modules;
    int requestTimeout = 10;
};

// Blocked before the first thread starts, so that they come to the main thread alone.
sigset_t BlockStopSignals() {
    sigset_t signals;
    ::sigemptyset(&signals);
    ::sigaddset(&signals, SIGTERM);
    ::sigaddset(&signals, SIGINT);
    ::pthread_sigmask(SIG_BLOCK, &signals, nullptr);
    ::signal(SIGPIPE, SIG_IGN);
    return signals;
}

// One arena for all threads, and what a large answer has needed goes back at once: an arena each
// would keep the largest answer that its threads have ever made. With two cores nothing is slower.
void LimitMemory() {
    ::mallopt(M_ARENA_MAX, 1);
    ::mallopt(M_TRIM_THRESHOLD, 1 << 20);
    ::mallopt(M_MMAP_THRESHOLD, 256 << 10);
}

int Fail(const std::string& error) {
    ::syslog(LOG_ERR, "%s", error.c_str());
    return EXIT_FAILURE;
}

// Serves what has begun, then ends. A second signal, or the time's end, cuts it short.
int Drain(orva::HttpServer& server, const sigset_t& signals) {
    server.StopAccepting();
    const auto deadline = std::chrono::steady_clock::now() + kDrainTime;
    while (!server.WaitUntilEmpty(std::chrono::milliseconds(0))) {
        const bool again = ::sigtimedwait(&signals, nullptr, &kSignalCheck) > 0;
        if (again || std::chrono::steady_clock::now() > deadline) {
            ::syslog(LOG_ERR, "stopped before all requests were answered");
            // A method that still runs would keep an orderly end waiting.
            std::_Exit(EXIT_FAILURE);
        }
    }
    return EXIT_SUCCESS;
}

int Run(const Arguments& arguments) {
    const sigset_t signals = BlockStopSignals();
    LimitMemory();
    std::string error;
    const std::optional<orva::AccessToken> token =
        orva::AccessToken::LoadOrCreate(orva::ResolvePath(kTokenFile), error);
    if (!token) {
        return Fail(error);
    }
    std::optional<orva::ListenSocket> socket = orva::ListenSocket::Open(arguments.listen, error);
    if (!socket) {
        return Fail(error);
    }
    const std::string url = socket->Url();

    const orva::ModuleLoader modules(
        arguments.modules.empty() ? orva::ResolvePath(kModulesDirectory) : arguments.modules);
    const orva::Dispatcher dispatcher(modules.Catalogue());
    orva::Router router(dispatcher, *token);
    orva::HttpServer::Options options;
    options.limits.request = std::chrono::seconds(arguments.requestTimeout);
    const std::unique_ptr<orva::HttpServer> server =
        orva::HttpServer::Start(std::move(*socket), router, options, error);
    if (!server) {
        return Fail(error);
    }
    std::printf("listening on %s\n", url.c_str());
    std::fflush(stdout);

    int signalNumber = 0;
    ::sigwait(&signals, &signalNumber);
    return Drain(*server, signals);
}

}  // namespace

int main(int argc, char** argv) {
    Arguments arguments;
    CLI::App app("The web-API server of the appliance.");
    app.add_option("--root", arguments.root,
                   "Directory below which the appliance lives (default: ORVA_ROOT, or /)");
    app.add_option("--listen", arguments.listen, "ADDRESS:PORT, [ADDRESS]:PORT or unix:PATH")
        ->capture_default_str();
    app.add_option("--modules", arguments.modules,
                   std::string("Directory of the API modules (default: ") + kModulesDirectory +
                       " below the root)");
    app.add_option("--request-timeout", arguments.requestTimeout,
                   "Seconds within which a request must have arrived")
        ->check(CLI::Range(1, 3600))
        ->capture_default_str();
    CLI11_PARSE(app, argc, argv);

    ::openlog("orva-webapid", LOG_PID | LOG_PERROR, LOG_DAEMON);
    if (!arguments.root.empty()) {
        orva::SetRoot(arguments.root);
    }
    return Run(arguments);
}
