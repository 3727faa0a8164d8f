#include "appliance/texts/TextFile.h"

#include <json/writer.h>

#include <cstddef>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "appliance/util/StrictJson.h"

namespace orva {
namespace {

// Removes the members of `object` that are not of `type`; gives their names.
std::vector<std::string> RemoveOthers(Json::Value& object, Json::ValueType type) {
    std::vector<std::string> names;
    for (auto member = object.begin(); member != object.end(); ++member) {
        if (member->type() != type) {
            names.push_back(member.name());
        }
    }
    for (const std::string& name : names) {
        object.removeMember(name);
    }
    return names;
}

// On one line, whatever the name holds.
std::string Quoted(const std::string& name) { return Json::valueToQuotedString(name.c_str()); }

// Removes what is no section of texts and no text. One line about it; empty when all is well.
std::string RemoveFaults(Json::Value& document) {
    std::string first;
    std::size_t count = 0;
    const std::vector<std::string> sections = RemoveOthers(document, Json::objectValue);
    if (!sections.empty()) {
        first = "section " + Quoted(sections.front()) + " is no object";
        count = sections.size();
    }
    for (auto section = document.begin(); section != document.end(); ++section) {
        const std::vector<std::string> keys = RemoveOthers(*section, Json::stringValue);
        if (first.empty() && !keys.empty()) {
            first = Quoted(section.name() + ":" + keys.front()) + " is no text";
        }
        count += keys.size();
    }
    if (count > 1) {
        first += " (faults in all: " + std::to_string(count) + ")";
    }
    return first;
}

}  // namespace

Json::Value ParseTextFile(const std::string& content, std::string& error) {
    std::optional<Json::Value> document = ParseStrictObject(content, error);
    if (!document) {
        return Json::Value(Json::objectValue);
    }
    std::string fault = RemoveFaults(*document);
    if (!fault.empty()) {
        error = std::move(fault);
    }
    return *std::move(document);
}

}  // namespace orva
