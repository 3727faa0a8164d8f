#include "appliance/tools/ServiceTable.h"

#include <json/value.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <string_view>
#include <system_error>
#include <utility>

#include "appliance/root/Root.h"
#include "appliance/util/FileRead.h"
#include "appliance/util/StrictJson.h"

namespace orva {
namespace {

constexpr std::size_t kLargestTable = 1 << 20;
constexpr int kLongestLimit = 3600;

const Json::Value* FindMember(const Json::Value& object, std::string_view name) {
    return object.find(name.data(), name.data() + name.size());
}

// What systemctl takes as one unit and nothing else: no switch, no pattern, no path.
bool IsUnitName(const std::string& name) {
    static constexpr std::string_view kSigns = ":-_.\\@";
    const auto isPlain = [](unsigned char byte) {
        return std::isalnum(byte) != 0 ||
               kSigns.find(static_cast<char>(byte)) != std::string_view::npos;
    };
    return !name.empty() && name.front() != '-' && name.find('.') != std::string::npos &&
           std::all_of(name.begin(), name.end(), isPlain);
}

bool ReadUnits(const Json::Value& value, std::vector<std::string>& units) {
    if (!value.isArray() || value.empty()) {
        return false;
    }
    for (const Json::Value& unit : value) {
        if (!unit.isString() || !IsUnitName(unit.asString())) {
            return false;
        }
        units.push_back(unit.asString());
    }
    return true;
}

bool ReadCommand(const Json::Value* value, std::string& command) {
    if (value == nullptr || !value->isString()) {
        return false;
    }
    command = value->asString();
    return !command.empty();
}

// What is wrong with the entry; empty when it was read.
std::string ReadService(const Json::Value& entry, Service& service) {
    if (!entry.isObject()) {
        return "is no object";
    }
    const Json::Value* units = FindMember(entry, "units");
    const Json::Value* start = FindMember(entry, "start");
    const Json::Value* stop = FindMember(entry, "stop");
    if (units != nullptr) {
        if (start != nullptr || stop != nullptr) {
            return "has both \"units\" and commands";
        }
        if (!ReadUnits(*units, service.units)) {
            return "\"units\" is no list of unit names";
        }
    } else if (!ReadCommand(start, service.startCommand) ||
               !ReadCommand(stop, service.stopCommand)) {
        return "has neither \"units\" nor the commands \"start\" and \"stop\"";
    }
    if (const Json::Value* seconds = FindMember(entry, "seconds")) {
        if (seconds->type() != Json::intValue || seconds->asLargestInt() < 1 ||
            seconds->asLargestInt() > kLongestLimit) {
            return "\"seconds\" is no whole number from 1 to 3600";
        }
        service.limit = std::chrono::seconds(seconds->asLargestInt());
    }
    return {};
}

enum class Loaded { kYes, kMissing, kFailed };

// Adds what the table at `path` says to `table`, in the place of what is there.
Loaded Load(const char* path, ServiceTable& table, std::string& error) {
    const std::string file = ResolvePath(path);
    std::string content;
    FileIdentity identity;
    if (const int number = ReadFile(file, kLargestTable, content, identity)) {
        error = file + ": " + std::generic_category().message(number);
        return number == ENOENT ? Loaded::kMissing : Loaded::kFailed;
    }
    std::optional<ServiceTable> read = ParseServiceTable(content, error);
    if (!read) {
        error = file + ": " + error;
        return Loaded::kFailed;
    }
    read->merge(table);
    table = std::move(*read);
    return Loaded::kYes;
}

}  // namespace

std::optional<ServiceTable> ParseServiceTable(const std::string& content, std::string& error) {
    const std::optional<Json::Value> document = ParseStrictObject(content, error);
    if (!document) {
        return std::nullopt;
    }
    const Json::Value* services = FindMember(*document, "services");
    if (services == nullptr || !services->isObject()) {
        error = "\"services\" is no object";
        return std::nullopt;
    }
    ServiceTable table;
    for (auto entry = services->begin(); entry != services->end(); ++entry) {
        const std::string problem = ReadService(*entry, table[entry.name()]);
        if (!problem.empty()) {
            error = "\"" + entry.name() + "\" " + problem;
            return std::nullopt;
        }
    }
    return table;
}

std::optional<ServiceTable> LoadServiceTable(std::string& error) {
    ServiceTable table;
    const Loaded shipped = Load(kShippedServices, table, error);
    if (shipped == Loaded::kFailed) {
        return std::nullopt;
    }
    std::string ownError;
    const Loaded own = Load(kOwnServices, table, ownError);
    if (own == Loaded::kFailed) {
        error = ownError;
        return std::nullopt;
    }
    if (shipped == Loaded::kMissing && own == Loaded::kMissing) {
        return std::nullopt;
    }
    error.clear();
    return table;
}

}  // namespace orva
