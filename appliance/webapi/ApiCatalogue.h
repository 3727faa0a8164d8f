#pragma once

#include <json/value.h>

#include <cstdint>
#include <functional>
#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "platform/webapi.h"

namespace orva {

// One row of a module's table, checked.
struct ApiMethodEntry {
    std::string api;
    std::int32_t version = 0;
    std::string method;
    ORVA::APIMethod function = nullptr;
};

// Every method that the loaded modules offer.
//
// Threads: filled while the program starts; from then on any thread may read it.
class ApiCatalogue {
  public:
    enum class Found { kMethod, kUnknownApi, kUnknownVersion, kUnknownMethod };
    struct LookupResult {
        Found found = Found::kUnknownApi;
        // Null unless a method was found.
        ORVA::APIMethod function = nullptr;
    };

    // Adds a module's entries. An API's version belongs to the module that brought it first: none
    // is added when one of them has an API and version of an earlier call, or when two of them have
    // the same API, version and method; `conflict` then says which.
    [[nodiscard]] bool Add(const std::vector<ApiMethodEntry>& entries, std::string& conflict);

    LookupResult Lookup(std::string_view api, std::int32_t version, std::string_view method) const;

    // An array of {"api", "version", "methods"} in ascending order.
    Json::Value Describe() const;

  private:
    using Methods = std::map<std::string, ORVA::APIMethod, std::less<>>;
    using Versions = std::map<std::int32_t, Methods>;
    std::map<std::string, Versions, std::less<>> apis;
};

}  // namespace orva
