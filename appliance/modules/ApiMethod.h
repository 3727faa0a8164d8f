// What the methods of these modules are made of: checked parameters in, a document or a failure
// out.
#pragma once

#include <json/value.h>

#include <cstddef>
#include <cstdint>
#include <exception>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "platform/webapi.h"

namespace orva {

// The codes that callers are told, besides a text under "msg".
enum class ModuleError : int {
    kBadParameter = 120,  // a parameter is missing or wrong; the text begins with its name
    kStoreFailed = 121,   // the task store, or another of the appliance's files, failed
    kNoSuchRun = 122,
    kCannotStop = 123,
    kPreviewFailed = 124,
};

// Ends a method with an error instead of an answer.
class ApiFailure : public std::exception {
  public:
    ApiFailure(ModuleError errorCode, std::string message)
        : code(errorCode), text(std::move(message)) {}

    const char* what() const noexcept override { return text.c_str(); }
    ModuleError Code() const { return code; }

  private:
    ModuleError code;
    std::string text;
};

// The parameters of one call. Every reader throws ApiFailure when the parameter is of another type
// or out of its range; one that is null counts as absent. Numbers are JSON integers: 5.0 is none.
class Parameters {
  public:
    explicit Parameters(const ORVA::APIRequest& request);

    std::optional<std::int64_t> Integer(const char* name, std::int64_t low,
                                        std::int64_t high) const;
    std::optional<std::string> Text(const char* name) const;
    // At most `most` elements; an absent one is an empty one.
    std::vector<std::string> Texts(const char* name, std::size_t most) const;
    std::vector<std::int64_t> Integers(const char* name, std::int64_t low, std::int64_t high,
                                       std::size_t most) const;
    // As it came; null when it is absent.
    const Json::Value& Any(const char* name) const;

    // As above, of a parameter that must be there.
    std::int64_t RequiredInteger(const char* name, std::int64_t low, std::int64_t high) const;
    void Require(const char* name) const;

    const std::string& Language() const { return language; }

  private:
    Json::Value document;
    std::string language;
};

[[noreturn]] void RefuseParameter(const std::string& name, const std::string& reason);

using ApiMethod = Json::Value (*)(const Parameters& parameters);

// Calls the method and answers with its document, or with the failure that it threw.
void ServeMethod(ApiMethod method, const ORVA::APIRequest& request, ORVA::APIResponse& response);

// The method as a row of a module's table takes it.
template <ApiMethod method>
void Serve(ORVA::APIRequest* request, ORVA::APIResponse* response) {
    ServeMethod(method, *request, *response);
}

}  // namespace orva
