#include "appliance/tools/Services.h"

#include <algorithm>
#include <cstdio>
#include <optional>

#include "appliance/recycle/ByteText.h"
#include "appliance/tools/ServiceTable.h"
#include "appliance/tools/ToolOutput.h"
#include "appliance/util/RunCommand.h"
#include "appliance/util/StopSignals.h"

namespace orva {
namespace {

// A verb, in the forms that it is needed in.
struct Verb {
    const char* word;  // of systemctl
    const char* done;
    std::string Service::*command;
};
constexpr Verb kStart{"start", "started", &Service::startCommand};
constexpr Verb kStop{"stop", "stopped", &Service::stopCommand};

// A command and how it is called in reports.
struct Step {
    Command command;
    std::string title;
};

std::vector<Step> StepsOf(const Service& service, const Verb& verb) {
    std::vector<Step> steps;
    for (const std::string& unit : service.units) {
        Step step;
        // Nobody is there to type a password.
        step.command.arguments = {"systemctl", "--no-ask-password", verb.word, "--", unit};
        step.title = "systemctl " + std::string(verb.word) + " " + unit;
        steps.push_back(step);
    }
    if (service.units.empty()) {
        Step step;
        step.command.arguments = ShellArguments(service.*verb.command);
        step.title = std::string("its ") + verb.word + " command";
        steps.push_back(step);
    }
    for (Step& step : steps) {
        step.command.limit = service.limit;
    }
    // What was started last may use what was started first.
    if (&verb == &kStop) {
        std::reverse(steps.begin(), steps.end());
    }
    return steps;
}

// Starts or stops one service. A unit that fails does not keep the others of a stop from being
// stopped; a start ends there.
bool Do(const std::string& name, const Service& service, const Verb& verb) {
    bool done = true;
    for (const Step& step : StepsOf(service, verb)) {
        const CommandEnd end = RunCommand(step.command);
        if (end.Succeeded()) {
            continue;
        }
        Complain(name + ": " + step.title + ": " + DescribeEnd(end, step.command));
        if (end.kind == CommandEnd::Kind::kInterrupted) {
            EndBySignal(end.number);
        }
        done = false;
        if (&verb == &kStart) {
            break;
        }
    }
    return done;
}

int DoAll(const std::vector<std::string>& names, const Verb& verb) {
    std::string error;
    const std::optional<ServiceTable> table = LoadServiceTable(error);
    if (!table) {
        return Complain(error + "; no service was " + verb.done);
    }
    int status = kToolDone;
    for (const std::string& name : names) {
        const std::string shown = QuoteIfNeeded(name);
        const auto entry = table->find(name);
        if (entry == table->end()) {
            status = Complain(shown + ": there is no such service");
        } else if (Do(shown, entry->second, verb)) {
            // At once, in the order of what the commands themselves print.
            std::printf("%s: %s\n", shown.c_str(), verb.done);
            std::fflush(stdout);
        } else {
            status = kToolFailed;
        }
    }
    return status;
}

}  // namespace

int StartServices(const std::vector<std::string>& names) { return DoAll(names, kStart); }

int StopServices(const std::vector<std::string>& names) { return DoAll(names, kStop); }

}  // namespace orva
