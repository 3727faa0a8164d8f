#pragma once

#include <json/value.h>

#include <filesystem>
#include <memory>
#include <string>

#include "appliance/webapi/ApiCatalogue.h"
#include "appliance/webapi/ModuleLoader.h"
#include "platform/webapi.h"

namespace orva {

// A root of its own in the directory that the environment's ORVA_BENCH_DIR names (default: the
// working directory, since a memory file system would make durable writes look free), with a given
// number of tasks and a catalogue of 500 texts; and the module, loaded as the server loads it.
class BenchAppliance {
  public:
    explicit BenchAppliance(int taskCount);
    ~BenchAppliance();
    BenchAppliance(const BenchAppliance&) = delete;
    BenchAppliance& operator=(const BenchAppliance&) = delete;

    // Calls a method of the task scheduler's API in this process; ends the program when it fails.
    ORVA::APIResponse Call(const char* method, ORVA::APIRequest& request) const;
    ORVA::APIResponse Call(const char* method, const Json::Value& parameters) const;

    // A request for any number of calls. The server does not copy the document that it has read, so
    // neither should what is measured.
    static ORVA::APIRequest Request(const Json::Value& parameters) { return {parameters, "en"}; }

    std::filesystem::path Root() const { return root; }
    std::filesystem::path Database() const;

    // Stores one more task and yields its id.
    int AddTask() const;

  private:
    std::filesystem::path root;
    std::unique_ptr<ModuleLoader> modules;
};

// Parses a parameter document of this program's own.
Json::Value Parameters(const char* text);

// Prints the message and ends the program unless the condition holds.
void Require(bool condition, const std::string& message);

}  // namespace orva
