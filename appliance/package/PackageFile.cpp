#include "appliance/package/PackageFile.h"

#include <string_view>

#include "appliance/util/StrictJson.h"

namespace orva {
namespace {

const Json::Value* FindMember(const Json::Value& object, std::string_view name) {
    return object.find(name.data(), name.data() + name.size());
}

// Reads a text that may be missing; false for another type.
bool ReadText(const Json::Value& object, std::string_view name, std::string& text) {
    const Json::Value* value = FindMember(object, name);
    if (value == nullptr) {
        return true;
    }
    if (!value->isString()) {
        return false;
    }
    text = value->asString();
    return true;
}

}  // namespace

std::optional<ORVAPackageTool::PackageInfo> ParsePackageFile(const std::string& content,
                                                             std::string& error) {
    const std::optional<Json::Value> document = ParseStrictObject(content, error);
    if (!document) {
        return std::nullopt;
    }
    ORVAPackageTool::PackageInfo info;
    if (!ReadText(*document, "display_name", info.displayName) || info.displayName.empty()) {
        error = "\"display_name\" is no text, or empty";
        return std::nullopt;
    }
    if (const Json::Value* startable = FindMember(*document, "startable")) {
        if (!startable->isBool()) {
            error = "\"startable\" is no boolean";
            return std::nullopt;
        }
        info.startable = startable->asBool();
    }
    if (!ReadText(*document, "start", info.startCommand) ||
        !ReadText(*document, "stop", info.stopCommand) ||
        !ReadText(*document, "status", info.statusCommand)) {
        error = "\"start\", \"stop\" or \"status\" is no text";
        return std::nullopt;
    }
    return info;
}

}  // namespace orva
