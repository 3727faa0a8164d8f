#include "appliance/texts/TextFile.h"

#include <json/writer.h>

#include <cstddef>
#include <mutex>
#include <optional>
#include <string>
#include <unordered_set>
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

// Names and texts for as long as the process lives, each kept once: in every version and language
// of a file the names are the same, and so are nearly all texts from one version to the next.
class Interner {
  public:
    // Never destroyed: documents that point into it may outlive whatever the program's end
    // destroys.
    static Interner& Only() {
        static auto& only = *new Interner;
        return only;
    }

    // The kept `text`; nothing when so much is kept already that texts seem to change all the time.
    std::optional<Json::StaticString> Keep(std::string text) {
        constexpr std::size_t kMostBytes = 8 << 20;
        const std::lock_guard lock(mutex);
        auto found = kept.find(text);
        if (found == kept.end()) {
            if (bytes + text.size() > kMostBytes) {
                return std::nullopt;
            }
            bytes += text.size();
            found = kept.insert(std::move(text)).first;
        }
        return Json::StaticString(found->c_str());
    }

  private:
    std::mutex mutex;
    // Its elements never move.
    std::unordered_set<std::string> kept;
    std::size_t bytes = 0;
};

Json::Value& Member(Json::Value& object, const std::string& name) {
    const auto kept = Interner::Only().Keep(name);
    return kept ? object[*kept] : object[name];
}

// The same document, cheaper to copy, which every request does: what is interned is not copied.
Json::Value Interned(const Json::Value& document) {
    Json::Value interned(Json::objectValue);
    for (auto section = document.begin(); section != document.end(); ++section) {
        Json::Value& texts = Member(interned, section.name());
        texts = Json::Value(Json::objectValue);
        for (auto text = section->begin(); text != section->end(); ++text) {
            const auto kept = Interner::Only().Keep(text->asString());
            Member(texts, text.name()) = kept ? Json::Value(*kept) : *text;
        }
    }
    return interned;
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
    return Interned(*document);
}

}  // namespace orva
