// Tasks in and out: orvaschedtool --import FILE | --export [FILE] | --list.

#include <syslog.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <cstring>
#include <iostream>
#include <iterator>
#include <string>

#include "appliance/root/Root.h"
#include "appliance/store/StoreFailure.h"
#include "appliance/store/TaskStore.h"
#include "appliance/store/TaskTransfer.h"
#include "appliance/util/AtomicFile.h"
#include "appliance/util/FileRead.h"

namespace {

constexpr int kDone = 0;
constexpr int kFailed = 1;
constexpr int kUsage = 2;

constexpr const char* kStandardStream = "-";
// A file of this size is no list of tasks any more.
constexpr std::size_t kLargestImport = std::size_t{512} * 1024 * 1024;

int Complain(const std::string& about) {
    std::fprintf(stderr, "orvaschedtool: %s\n", about.c_str());
    return kFailed;
}

int Import(const std::string& file) {
    std::string json;
    if (file == kStandardStream) {
        json.assign(std::istreambuf_iterator<char>(std::cin), {});
    } else {
        orva::FileIdentity identity;
        if (const int error = orva::ReadFile(file, kLargestImport, json, identity)) {
            return Complain(file + ": " + std::strerror(error));
        }
    }
    const orva::ImportResult result = orva::ImportTasks(*orva::TaskStore::Current(), json);
    if (!result.problem.empty()) {
        return Complain(file + ": " + result.problem + "; nothing was imported");
    }
    std::printf("%zu tasks imported\n", result.count);
    return kDone;
}

int WriteOut(const std::string& text) {
    const bool written = std::fwrite(text.data(), 1, text.size(), stdout) == text.size();
    return std::fflush(stdout) == 0 && written ? kDone : Complain("cannot write the output");
}

int Export(const std::string& file) {
    const std::string text = orva::ExportTasks(*orva::TaskStore::Current());
    if (file == kStandardStream) {
        return WriteOut(text);
    }
    return orva::WriteFileAtomically(file, text) == 0 ? kDone
                                                      : Complain(file + ": cannot be written");
}

}  // namespace

int main(int argc, char** argv) {
    CLI::App app("The stored tasks of the appliance.");
    std::string root;
    std::string importFile;
    std::string exportFile;
    app.add_option("--root", root, "The directory that the appliance lives below")
        ->type_name("DIR");
    CLI::Option_group* action = app.add_option_group("action");
    const CLI::Option* importing =
        action
            ->add_option("--import", importFile,
                         "Store the tasks of a JSON array, all or none (-: standard input). A "
                         "task's own id may be " +
                             std::to_string(orva::kHighestImportedId) + " at most")
            ->type_name("FILE");
    const CLI::Option* exporting =
        action
            ->add_option("--export", exportFile,
                         "Write all tasks as a JSON array (without FILE: to standard output)")
            ->type_name("FILE")
            ->expected(0, 1)
            ->default_str(kStandardStream);
    bool listing = false;
    action->add_flag("--list", listing, "Show all tasks, one line each");
    action->require_option(1);
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return app.exit(error) == 0 ? kDone : kUsage;
    }

    openlog("orvaschedtool", LOG_PID, LOG_USER);
    if (!root.empty()) {
        orva::SetRoot(root);
    }
    try {
        if (importing->count() > 0) {
            return Import(importFile);
        }
        if (exporting->count() > 0) {
            return Export(exportFile.empty() ? kStandardStream : exportFile);
        }
        return WriteOut(orva::TaskOverview(*orva::TaskStore::Current()));
    } catch (const orva::StoreFailure& failure) {
        return Complain("task store " + orva::ResolvePath(orva::TaskStore::kDatabaseFile) + ": " +
                        failure.what());
    }
}
