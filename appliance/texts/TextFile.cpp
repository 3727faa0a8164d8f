#include "appliance/texts/TextFile.h"

#include <optional>
#include <utility>

#include "appliance/util/StrictJson.h"

namespace orva {
namespace {

// What keeps `document` from being sections of texts; empty when nothing does.
std::string FindFault(const Json::Value& document) {
    if (!document.isObject()) {
        return "the document is no object";
    }
    for (auto section = document.begin(); section != document.end(); ++section) {
        if (!section->isObject()) {
            return "section \"" + section.name() + "\" is no object";
        }
        for (auto text = section->begin(); text != section->end(); ++text) {
            if (!text->isString()) {
                return "\"" + section.name() + ":" + text.name() + "\" is no text";
            }
        }
    }
    return {};
}

}  // namespace

Json::Value ParseTextFile(const std::string& content, std::string& error) {
    std::optional<Json::Value> document = ParseStrictJson(content, error);
    if (document) {
        std::string fault = FindFault(*document);
        if (fault.empty()) {
            return std::move(*document);
        }
        error = std::move(fault);
    }
    return Json::Value(Json::objectValue);
}

}  // namespace orva
