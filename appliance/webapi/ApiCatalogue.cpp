#include "appliance/webapi/ApiCatalogue.h"

#include <set>
#include <tuple>

namespace orva {

bool ApiCatalogue::Add(const std::vector<ApiMethodEntry>& entries, std::string& conflict) {
    std::set<std::tuple<std::string_view, std::int32_t, std::string_view>> own;
    for (const ApiMethodEntry& entry : entries) {
        const std::string version = entry.api + " " + std::to_string(entry.version);
        if (const auto api = apis.find(entry.api);
            api != apis.end() && api->second.count(entry.version) != 0) {
            conflict = "another module has " + version + " already";
            return false;
        }
        if (!own.emplace(entry.api, entry.version, entry.method).second) {
            conflict = "another row has " + version + " " + entry.method + " already";
            return false;
        }
    }
    for (const ApiMethodEntry& entry : entries) {
        apis[entry.api][entry.version][entry.method] = entry.function;
    }
    return true;
}

ApiCatalogue::LookupResult ApiCatalogue::Lookup(std::string_view api, std::int32_t version,
                                                std::string_view method) const {
    const auto versions = apis.find(api);
    if (versions == apis.end()) {
        return {Found::kUnknownApi, nullptr};
    }
    const auto methods = versions->second.find(version);
    if (methods == versions->second.end()) {
        return {Found::kUnknownVersion, nullptr};
    }
    const auto function = methods->second.find(method);
    if (function == methods->second.end()) {
        return {Found::kUnknownMethod, nullptr};
    }
    return {Found::kMethod, function->second};
}

Json::Value ApiCatalogue::Describe() const {
    Json::Value description(Json::arrayValue);
    for (const auto& [api, versions] : apis) {
        for (const auto& [version, methods] : versions) {
            Json::Value names(Json::arrayValue);
            for (const auto& method : methods) {
                names.append(method.first);
            }
            Json::Value row;
            row["api"] = api;
            row["version"] = version;
            row["methods"] = std::move(names);
            description.append(std::move(row));
        }
    }
    return description;
}

}  // namespace orva
