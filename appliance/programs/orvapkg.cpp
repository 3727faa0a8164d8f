// Installed packages: orvapkg list | start ID | stop ID | status ID.

#include <syslog.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cstdio>
#include <string>
#include <vector>

#include "appliance/package/PackageControl.h"
#include "appliance/programs/UsageError.h"
#include "appliance/recycle/ByteText.h"
#include "appliance/root/Root.h"
#include "platform/package.h"

namespace {

enum ExitStatus : int { kDone = 0, kFailed = 1, kNotRunning = 3 };

int Complain(const std::string& about) {
    std::fprintf(stderr, "orvapkg: %s\n", about.c_str());
    return kFailed;
}

const char* WordFor(orva::PackageState state) {
    switch (state) {
        case orva::PackageState::kRunning:
            return "running";
        case orva::PackageState::kStopped:
            return "stopped";
        case orva::PackageState::kUnknown:
            break;
    }
    return "unknown";
}

int List() {
    ORVAPackageTool::PackageManager manager;
    if (!manager.init()) {
        return Complain("the folder of the packages cannot be read");
    }
    const std::list<std::string> ids = manager.enumPackages(nullptr);
    std::size_t width = 0;
    for (const std::string& id : ids) {
        width = std::max(width, orva::QuoteIfNeeded(id).size());
    }
    int status = kDone;
    for (const std::string& id : ids) {
        const std::string shown = orva::QuoteIfNeeded(id);
        orva::PackageControl package(id);
        std::string problem;
        if (!package.Load(problem)) {
            status = Complain(std::string(shown).append(": ").append(problem));
            continue;
        }
        const char* const state = package.Info().startable ? WordFor(package.State()) : "-";
        std::printf("%-*s  %-7s  %s\n", static_cast<int>(width), shown.c_str(), state,
                    package.Info().displayName.c_str());
    }
    return status;
}

int StartOrStop(const orva::PackageControl& package, bool start, const std::string& shown) {
    std::string report;
    const bool done = start ? package.Start(report) : package.Stop(report);
    report.insert(0, shown + ": ");
    if (!done) {
        return Complain(report);
    }
    std::printf("%s\n", report.c_str());
    return kDone;
}

int Status(const orva::PackageControl& package, const std::string& shown) {
    const orva::PackageState state = package.State();
    if (state == orva::PackageState::kUnknown) {
        return Complain(shown + ": " +
                        (package.Info().statusCommand.empty()
                             ? "it gives no status command"
                             : "its status command does not work"));
    }
    std::printf("%s: %s\n", shown.c_str(), WordFor(state));
    return state == orva::PackageState::kRunning ? kDone : kNotRunning;
}

}  // namespace

int main(int argc, char** argv) {
    CLI::App app(
        "The installed packages of the appliance.\n"
        "Exit status: 0 done, or running; 1 failed, each failure is named; 2 wrong usage; 3 not "
        "running (status).");
    app.name("orvapkg");
    std::string root;
    std::string id;
    app.add_option("--root", root, "The directory that the appliance lives below")
        ->type_name("DIR");
    app.require_subcommand(1);
    const auto addVerb = [&app, &id](const char* name, const char* description) {
        CLI::App* verb = app.add_subcommand(name, description);
        verb->add_option("ID", id, "The package's id")->required()->type_name("");
        return verb;
    };
    const CLI::App* list = app.add_subcommand(
        "list", "Show all packages: id, whether it runs (-: it is not made to be started), name");
    const CLI::App* start =
        addVerb("start", "Start a package and wait until it runs; one that runs stays as it is");
    const CLI::App* stop = addVerb("stop", "Stop a package and wait until it has stopped");
    addVerb("status", "Tell whether a package runs");
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return orva::EndOfCommandLine("orvapkg", app, error);
    }

    // Not to standard error as well: the tool says there itself what failed.
    ::openlog("orvapkg", LOG_PID, LOG_USER);
    if (!root.empty()) {
        orva::SetRoot(root);
    }
    if (const std::string problem = orva::RootProblem(); !problem.empty()) {
        return Complain(problem);
    }
    if (list->parsed()) {
        return List();
    }
    const std::string shown = orva::QuoteIfNeeded(id);
    orva::PackageControl package(id);
    std::string problem;
    if (!package.Load(problem)) {
        return Complain(shown + ": " + problem);
    }
    if (start->parsed() || stop->parsed()) {
        return StartOrStop(package, start->parsed(), shown);
    }
    return Status(package, shown);
}
