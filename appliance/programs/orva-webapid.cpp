// The web-API server.
#include <malloc.h>
#include <signal.h>
#include <syslog.h>
#include <systemd/sd-daemon.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <string_view>
#include <utility>

#include "appliance/programs/UsageError.h"
#include "appliance/root/Root.h"
#include "appliance/server/AccessToken.h"
#include "appliance/server/Authenticator.h"
#include "appliance/server/HttpServer.h"
#include "appliance/server/ListenSocket.h"
#include "appliance/server/PageFiles.h"
#include "appliance/server/Router.h"
#include "appliance/server/SignInCode.h"
#include "appliance/server/TlsIdentity.h"
#include "appliance/store/StoreFailure.h"
#include "appliance/store/TaskStore.h"
#include "appliance/util/Journal.h"
#include "appliance/webapi/Dispatcher.h"
#include "appliance/webapi/ModuleLoader.h"

namespace {

constexpr char kTokenFile[] = "/usr/orva/etc/webapi.token";
constexpr char kPageDirectory[] = "/usr/orva/webui";

// How long requests that have begun may still take after the signal to stop.
constexpr std::chrono::seconds kDrainTime{30};
// How often the wait for them looks for a second signal.
constexpr timespec kSignalCheck{0, 50'000'000};

struct Arguments {
    std::string root;
    std::string listen = "127.0.0.1:5080";
    std::string modules;
    std::string tlsCertificate;
    std::string tlsKey;
    int requestTimeout = 10;
    bool signInLink = false;
    bool newSignInLink = false;
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

// Where callers find the server that listens there ("http://..." or "unix:...").
std::string UrlFor(const std::string& listenUrl, bool overTls) {
    constexpr std::string_view kScheme = "http://";
    if (listenUrl.rfind(kScheme, 0) != 0) {
        return listenUrl;
    }
    return (overTls ? "https://" : "http://") + listenUrl.substr(kScheme.size());
}

// Prints a link that signs a browser in. Where the server has no address, a browser reaches it in a
// way that only its administrator knows, so there it is the link's end alone.
void PrintSignInLink(const std::string& url, const orva::AccessToken& token) {
    std::string place = url.rfind("unix:", 0) == 0 ? "" : url;
    for (const auto& [all, one] :
         {std::pair<std::string, std::string>{"//0.0.0.0:", "//127.0.0.1:"},
          {"//[::]:", "//[::1]:"}}) {
        const std::size_t at = place.find(all);
        if (at != std::string::npos) {
            place.replace(at, all.size(), one);
        }
    }
    std::printf("sign in, once and within ten minutes: %s/#code=%s\n", place.c_str(),
                orva::MakeSignInCode(token).c_str());
    std::fflush(stdout);
}

int PrintNewSignInLink(const Arguments& arguments) {
    std::string error;
    const std::optional<orva::AccessToken> token =
        orva::AccessToken::Load(orva::ResolvePath(kTokenFile), error);
    if (!token) {
        return Fail(error);
    }
    const bool isUnix = arguments.listen.rfind("unix:", 0) == 0;
    PrintSignInLink(
        UrlFor((isUnix ? "" : "http://") + arguments.listen, !arguments.tlsCertificate.empty()),
        *token);
    return EXIT_SUCCESS;
}

// Reads the task store once, so that what is wrong with it stands in the log from the start. The
// server starts all the same: it answers each request with that error, and works again when the
// store does. A store that is not there yet is not made.
void LookAtTaskStore() {
    std::error_code error;
    if (!std::filesystem::exists(orva::ResolvePath(orva::TaskStore::kDatabaseFile), error)) {
        return;
    }
    try {
        orva::TaskStore::Current()->CurrentSnapshot();
    } catch (const orva::StoreFailure&) {
        // The store has logged it.
    }
}

int Run(const Arguments& arguments) {
    const sigset_t signals = BlockStopSignals();
    LimitMemory();
    std::string error;
    orva::HttpServer::Options options;
    options.limits.request = std::chrono::seconds(arguments.requestTimeout);
    const bool overTls = !arguments.tlsCertificate.empty();
    if (overTls) {
        options.tls = orva::TlsIdentity::Load(arguments.tlsCertificate, arguments.tlsKey, error);
        if (!options.tls) {
            return Fail(error);
        }
    }
    std::optional<orva::ListenSocket> socket = orva::ListenSocket::Open(arguments.listen, error);
    if (!socket) {
        return Fail(error);
    }
    // Only now: a server that cannot start leaves nothing behind.
    const std::optional<orva::AccessToken> token =
        orva::AccessToken::LoadOrCreate(orva::ResolvePath(kTokenFile), error);
    if (!token) {
        return Fail(error);
    }
    const std::string url = UrlFor(socket->Url(), overTls);

    const orva::ModuleLoader modules(
        arguments.modules.empty() ? orva::ResolvePath(orva::kModulesDirectory) : arguments.modules);
    const orva::Dispatcher dispatcher(modules.Catalogue());
    orva::Authenticator authenticator(*token, overTls);
    const orva::PageFiles page(orva::ResolvePath(kPageDirectory));
    orva::Router router(dispatcher, authenticator, page);
    LookAtTaskStore();
    const std::unique_ptr<orva::HttpServer> server =
        orva::HttpServer::Start(std::move(*socket), router, options, error);
    if (!server) {
        return Fail(error);
    }
    std::printf("listening on %s\n", url.c_str());
    std::fflush(stdout);
    ::sd_notify(0, "READY=1");
    if (arguments.signInLink) {
        PrintSignInLink(url, *token);
    }

    int signalNumber = 0;
    ::sigwait(&signals, &signalNumber);
    ::sd_notify(0, "STOPPING=1");
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
                   std::string("Directory of the API modules (default: ") +
                       orva::kModulesDirectory + " below the root)");
    CLI::Option* certificate =
        app.add_option("--tls-cert", arguments.tlsCertificate,
                       "Serve by TLS with the certificates of this file (PEM)");
    CLI::Option* key =
        app.add_option("--tls-key", arguments.tlsKey, "The private key of the first one (PEM)");
    certificate->needs(key);
    key->needs(certificate);
    app.add_flag("--sign-in-link", arguments.signInLink,
                 "Print a link that signs a browser in: once, within ten minutes");
    app.add_flag("--new-sign-in-link", arguments.newSignInLink,
                 "Print such a link for the server that runs with the same options and by the same "
                 "account, and end");
    app.add_option("--request-timeout", arguments.requestTimeout,
                   "Seconds within which a request must have arrived")
        ->check(CLI::Range(1, 3600))
        ->capture_default_str();
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return orva::EndOfCommandLine("orva-webapid", app, error);
    }

    ::openlog("orva-webapid", LOG_PID | orva::ForegroundLogOption(), LOG_DAEMON);
    if (!arguments.root.empty()) {
        orva::SetRoot(arguments.root);
    }
    if (const std::string problem = orva::RootProblem(); !problem.empty()) {
        return Fail(problem);
    }
    return arguments.newSignInLink ? PrintNewSignInLink(arguments) : Run(arguments);
}
