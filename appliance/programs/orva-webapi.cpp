// One web-API call in this process, without the server.
#include <syslog.h>

#include <CLI/CLI.hpp>
#include <cstdint>
#include <cstdio>
#include <iostream>
#include <iterator>
#include <string>

#include "appliance/programs/UsageError.h"
#include "appliance/root/Root.h"
#include "appliance/util/StrictJson.h"
#include "appliance/webapi/Dispatcher.h"
#include "appliance/webapi/Language.h"
#include "appliance/webapi/ModuleLoader.h"

namespace {

enum ExitStatus : int { kSuccess = 0, kFailure = 1, kWrongUsage = 2 };

struct Arguments {
    std::string root;
    std::string language = orva::kDefaultLanguage;
    std::string modules;
    std::string api;
    std::int32_t version = 0;
    std::string method;
    std::string document = "{}";
};

ExitStatus Complain(ExitStatus status, const std::string& message) {
    std::cerr << "orva-webapi: " << message << '\n';
    return status;
}

std::string ReadStandardInput() {
    return std::string(std::istreambuf_iterator<char>(std::cin), std::istreambuf_iterator<char>());
}

int Run(const Arguments& arguments) {
    if (!orva::FindLanguage(arguments.language) && arguments.language != orva::kDefaultLanguage) {
        std::cerr << "orva-webapi: there are no texts for this --lang; those in "
                  << orva::kDefaultLanguage << " are used\n";
    }
    const std::string document =
        arguments.document == "-" ? ReadStandardInput() : arguments.document;
    std::string error;
    const std::optional<Json::Value> parameters = orva::ParseStrictJson(document, error);
    if (!parameters || !parameters->isObject()) {
        return Complain(kWrongUsage, "the parameters are no JSON object" +
                                         (error.empty() ? std::string() : ": " + error));
    }
    const orva::ModuleLoader modules(
        arguments.modules.empty() ? orva::ResolvePath(orva::kModulesDirectory) : arguments.modules);
    const orva::Dispatcher dispatcher(modules.Catalogue());
    const orva::ApiAnswer answer =
        dispatcher.Call(arguments.api, arguments.version, arguments.method, document,
                        orva::ChooseLanguage(arguments.language, {}));
    const bool success = answer.response.IsSuccess();
    std::cout << orva::WriteAnswer(answer.response) << std::endl;
    if (!std::cout) {
        return Complain(kFailure, "the answer could not be written; the call itself " +
                                      std::string(success ? "was carried out" : "failed"));
    }
    return success ? kSuccess : kFailure;
}

}  // namespace

int main(int argc, char** argv) {
    Arguments arguments;
    CLI::App app(
        "Calls one method of the appliance's web API and prints its answer.\n"
        "Exit status: 0 success, 1 the API answered an error or the answer could not be "
        "written, 2 wrong usage.");
    app.add_option("--root", arguments.root,
                   "Directory below which the appliance lives (default: ORVA_ROOT, or /)");
    app.add_option("--lang", arguments.language, "Language of the texts in the answer")
        ->capture_default_str();
    app.add_option("--modules", arguments.modules,
                   std::string("Directory of the API modules (default: ") +
                       orva::kModulesDirectory + " below the root)");
    app.add_option("API", arguments.api, "The API, such as ORVA.Core.TaskScheduler")->required();
    app.add_option("VERSION", arguments.version, "Its version")->required();
    app.add_option("METHOD", arguments.method, "The method, such as list")->required();
    app.add_option("JSON", arguments.document,
                   "The parameters as a JSON object; - reads them from standard input")
        ->capture_default_str();
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return orva::EndOfCommandLine("orva-webapi", app, error);
    }

    ::openlog("orva-webapi", LOG_PID | LOG_PERROR, LOG_DAEMON);
    if (!arguments.root.empty()) {
        orva::SetRoot(arguments.root);
    }
    if (const std::string problem = orva::RootProblem(); !problem.empty()) {
        return Complain(kFailure, problem);
    }
    return Run(arguments);
}
