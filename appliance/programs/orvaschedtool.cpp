// The task tool: one verb a call, each in a file of its own below appliance/tools/.
#include <syslog.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <charconv>
#include <cstdint>
#include <functional>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "appliance/programs/UsageError.h"
#include "appliance/root/Root.h"
#include "appliance/store/StoreFailure.h"
#include "appliance/store/TaskStore.h"
#include "appliance/store/TaskTransfer.h"
#include "appliance/tools/Beep.h"
#include "appliance/tools/ComingStarts.h"
#include "appliance/tools/History.h"
#include "appliance/tools/Services.h"
#include "appliance/tools/StoreToRead.h"
#include "appliance/tools/TaskFiles.h"
#include "appliance/tools/ToolOutput.h"

namespace {

// The words of the command line.
struct Arguments {
    std::string root;
    std::string importFile;
    std::string exportFile;
    bool list = false;
    // The count and the task's id.
    std::vector<int> next;
    std::string historyTask;
    std::int64_t outputRun = 0;
    std::string beepSeconds;
    std::vector<std::string> startServices;
    std::vector<std::string> stopServices;
    std::string from;
    std::string zone;
    bool json = false;
};

struct Verb {
    const CLI::Option* option;
    std::function<int()> run;
    // It reads a task store and makes none.
    bool needsStore = true;
};

constexpr const char* kStartService = "--start-service";
constexpr const char* kStopService = "--stop-service";

// Takes the words after `verb`, up to the next switch, out of the command line: they are names
// whatever they look like, and the parser would read some of them in its own way.
std::vector<std::string> TakeNames(std::vector<std::string>& words, const std::string& verb) {
    std::vector<std::string> names;
    for (auto word = words.begin(); word != words.end();) {
        if (*word++ == verb) {
            const auto end = std::find_if(
                word, words.end(), [](const std::string& each) { return each.starts_with("--"); });
            names.insert(names.end(), word, end);
            word = words.erase(word, end);
        }
    }
    return names;
}

void AddNames(const std::vector<std::string>& taken, std::vector<std::string>& names) {
    // So the parser says that there were none.
    if (names == std::vector<std::string>{""}) {
        names.clear();
    }
    names.insert(names.end(), taken.begin(), taken.end());
}

int ChangeServices(const char* verb, const std::vector<std::string>& names,
                   int (*change)(const std::vector<std::string>&)) {
    return names.empty() ? orva::ComplainOfUsage(std::string(verb) + " needs NAME...")
                         : change(names);
}

// Tasks whose rows are damaged stand in no list: they are named, and the verb has failed.
int NameDamaged(int status) {
    const std::shared_ptr<const orva::Snapshot> tasks = orva::TasksToRead();
    for (const orva::DamagedTask& task : tasks->Damaged()) {
        status = orva::Complain(task.problem + ": it is left out");
    }
    return status;
}

std::vector<Verb> AddTaskVerbs(CLI::Option_group& verbs, Arguments& arguments) {
    const CLI::Option* importing =
        verbs
            .add_option("--import", arguments.importFile,
                        "Store the tasks of a JSON array, all or none (-: standard input). A task "
                        "with the id of a stored one replaces that. Its id may be " +
                            std::to_string(orva::kHighestImportedId) + " at most")
            ->type_name("FILE");
    const CLI::Option* exporting =
        verbs
            .add_option("--export", arguments.exportFile,
                        "Write all tasks as a JSON array (without FILE: to standard output)")
            ->type_name("FILE")
            ->expected(0, 1)
            ->default_str(orva::kStandardStream);
    const CLI::Option* listing =
        verbs.add_flag("--list", arguments.list, "Show all tasks, one line each");
    return {
        {importing, [&] { return orva::ImportTaskFile(arguments.importFile); }, false},
        {exporting,
         [&] {
             return NameDamaged(orva::ExportTaskFile(
                 arguments.exportFile.empty() ? orva::kStandardStream : arguments.exportFile));
         }},
        {listing, [] { return NameDamaged(orva::ListTasks()); }},
    };
}

std::optional<int> ParseTaskId(const std::string& text) {
    int id = 0;
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, id);
    return error == std::errc() && stop == end && id >= 1 ? std::optional(id) : std::nullopt;
}

std::vector<Verb> AddHistoryVerbs(CLI::Option_group& verbs, Arguments& arguments) {
    constexpr int kHighest = std::numeric_limits<int>::max();
    const CLI::Option* next =
        verbs
            .add_option("--next", arguments.next,
                        "Show when task ID starts the next N times (1 to " +
                            std::to_string(orva::ComingStartsRequest::kMost) + ")")
            ->type_name("N ID")
            ->expected(2)
            ->check(CLI::Range(1, kHighest).description(""));
    const CLI::Option* history =
        verbs
            .add_option("--history", arguments.historyTask,
                        "Show the runs of task ID, or of all tasks, the newest first")
            ->type_name("ID")
            ->expected(0, 1)
            ->default_str("");
    const CLI::Option* output =
        verbs.add_option("--output", arguments.outputRun, "Show what a run has printed")
            ->type_name("RUN")
            ->check(CLI::Range(std::int64_t{1}, std::numeric_limits<std::int64_t>::max())
                        .description(""));
    return {
        {next,
         [&] {
             orva::ComingStartsRequest request;
             request.count = arguments.next.at(0);
             request.task = arguments.next.at(1);
             request.from = arguments.from;
             request.zone = arguments.zone;
             request.json = arguments.json;
             return orva::ShowComingStarts(request);
         }},
        {history,
         [&] {
             if (arguments.historyTask.empty()) {
                 return orva::ShowHistory({}, arguments.json);
             }
             const std::optional<int> task = ParseTaskId(arguments.historyTask);
             if (!task) {
                 return orva::ComplainOfUsage("--history takes the id of a task");
             }
             return orva::ShowHistory(task, arguments.json);
         }},
        {output, [&] { return orva::ShowRunOutput(arguments.outputRun); }},
    };
}

std::vector<Verb> AddMachineVerbs(CLI::Option_group& verbs, Arguments& arguments) {
    const CLI::Option* beep =
        verbs
            .add_option("--beep", arguments.beepSeconds,
                        "Sound the machine's buzzer for 1 to 600 seconds; exit status 3 when there "
                        "is none")
            ->type_name("SECONDS");
    const CLI::Option* start =
        verbs.add_option(kStartService, arguments.startServices, "Start these services")
            ->type_name("NAME...")
            ->expected(0, std::numeric_limits<int>::max());
    const CLI::Option* stop =
        verbs.add_option(kStopService, arguments.stopServices, "Stop these services")
            ->type_name("NAME...")
            ->expected(0, std::numeric_limits<int>::max());
    return {
        {beep, [&] { return orva::Beep(arguments.beepSeconds); }, false},
        {start,
         [&] {
             return ChangeServices(kStartService, arguments.startServices, orva::StartServices);
         },
         false},
        {stop,
         [&] { return ChangeServices(kStopService, arguments.stopServices, orva::StopServices); },
         false},
    };
}

int Run(const std::vector<Verb>& verbs) {
    try {
        for (const Verb& verb : verbs) {
            if (verb.option->count() > 0) {
                return verb.needsStore && !orva::HasStoreFolder() ? orva::kToolFailed : verb.run();
            }
        }
    } catch (const orva::StoreFailure& failure) {
        return orva::Complain("task store " + orva::ResolvePath(orva::TaskStore::kDatabaseFile) +
                              ": " + failure.what());
    }
    return orva::kToolUsage;
}

}  // namespace

int main(int argc, char** argv) {
    Arguments arguments;
    CLI::App app(
        "The scheduled tasks of the appliance: in and out, what is coming and what happened; and "
        "what tasks do to the machine itself.\n"
        "Exit status: 0 done, 1 failed, 2 wrong usage.");
    app.name("orvaschedtool");
    app.add_option("--root", arguments.root,
                   "The directory that the appliance lives below (default: ORVA_ROOT, or /)")
        ->type_name("DIR");
    CLI::Option_group* group = app.add_option_group("verb");
    std::vector<Verb> verbs = AddTaskVerbs(*group, arguments);
    for (auto* add : {AddHistoryVerbs, AddMachineVerbs}) {
        for (Verb& verb : add(*group, arguments)) {
            verbs.push_back(std::move(verb));
        }
    }
    group->require_option(1);
    app.add_option("--from", arguments.from,
                   "With --next: later than this UTC instant (default: now)")
        ->type_name("2027-01-31T12:00:00Z")
        ->needs("--next");
    app.add_option("--zone", arguments.zone,
                   "With --next: in this time zone (default: the machine's)")
        ->type_name("NAME")
        ->needs("--next");
    app.add_flag("--json", arguments.json, "With --next and --history: one JSON array");
    std::vector<std::string> words(argv + std::min(argc, 1), argv + argc);
    const std::vector<std::string> starting = TakeNames(words, kStartService);
    const std::vector<std::string> stopping = TakeNames(words, kStopService);
    try {
        // It wants the last word first.
        app.parse(std::vector<std::string>(words.rbegin(), words.rend()));
    } catch (const CLI::ParseError& error) {
        return orva::EndOfCommandLine("orvaschedtool", app, error);
    }
    AddNames(starting, arguments.startServices);
    AddNames(stopping, arguments.stopServices);
    if (arguments.json && app.count("--next") == 0 && app.count("--history") == 0) {
        return orva::ComplainOfUsage("--json goes with --next and --history only");
    }

    // Not to standard error as well: the tool says there itself what failed.
    openlog("orvaschedtool", LOG_PID, LOG_USER);
    if (!arguments.root.empty()) {
        orva::SetRoot(arguments.root);
    }
    return Run(verbs);
}
