#include "appliance/modules/PreviewReader.h"

#include <charconv>
#include <optional>

#include "appliance/util/StrictJson.h"

namespace orva {
namespace {

// Quotes within texts are written with a backslash: these can only be what they seem.
constexpr std::string_view kBin = "{\"share\":";
constexpr std::string_view kBinEntries = ",\"remove\":[";
constexpr std::string_view kKeep = "\"keep\":[";
constexpr std::string_view kFailures = "\"failures\":[";
constexpr std::string_view kTotals = "\"totals\":";
constexpr std::string_view kProblems = "\"problems\":";
constexpr std::string_view kEntry = "{\"path\":";
constexpr std::string_view kFolder = "\"kind\":\"folder\"";
constexpr std::string_view kBytes = ",\"bytes\":";

constexpr const char* kUnreadable = "the preview could not be read";

std::optional<Json::Value> ParseObject(std::string_view text) {
    std::string ignored;
    return ParseStrictObject(text, ignored);
}

// The entry's size; nothing when it has none.
std::optional<Json::Int64> BytesOf(std::string_view entry) {
    const std::size_t at = entry.find(kBytes);
    if (at == std::string_view::npos) {
        return std::nullopt;
    }
    Json::Int64 bytes = 0;
    const char* first = entry.data() + at + kBytes.size();
    const auto [stop, error] = std::from_chars(first, entry.data() + entry.size(), bytes);
    return error == std::errc() ? std::optional(bytes) : std::nullopt;
}

Json::Value SumDocument(Json::Int64 count, Json::Int64 bytes) {
    Json::Value document(Json::objectValue);
    document["count"] = count;
    document["bytes"] = bytes;
    return document;
}

}  // namespace

void PreviewReader::TakeLine(std::string_view line) {
    if (line.starts_with(kEntry)) {
        TakeEntry(line);
    } else if (line.starts_with(kBin)) {
        const std::optional<Json::Value> bin =
            ParseObject(std::string(line.substr(0, line.find(kBinEntries))) + "}");
        share = bin && (*bin)["share"].isString() ? (*bin)["share"].asString() : std::string();
        section = Section::kRemove;
    } else if (line.starts_with(kKeep)) {
        section = Section::kKeep;
    } else if (line.starts_with(kFailures)) {
        section = Section::kFailures;
    } else if (line.starts_with(kTotals)) {
        section = Section::kNone;
    } else if (line.starts_with(kProblems)) {
        TakeProblems(line);
    }
}

void PreviewReader::TakeEntry(std::string_view line) {
    const std::string_view entry = line.substr(0, line.rfind('}') + 1);
    if (section == Section::kFailures) {
        if (problems.size() < kMostProblems) {
            TakeFailure(ParseObject(entry).value_or(Json::Value(Json::objectValue)));
        }
        return;
    }
    if (section == Section::kNone || entry.find(kFolder) != std::string_view::npos) {
        return;
    }
    Side& side = section == Section::kRemove ? removed : kept;
    const std::optional<Json::Int64> bytes = BytesOf(entry);
    if (!bytes) {
        AddProblem(kUnreadable);
        return;
    }
    ++side.count;
    side.bytes += *bytes;
    if (side.listed.size() >= kMostListed) {
        return;
    }
    const std::optional<Json::Value> document = ParseObject(entry);
    if (!document) {
        AddProblem(kUnreadable);
        return;
    }
    Json::Value listed(Json::objectValue);
    listed["share"] = share;
    listed["path"] = (*document)["path"];
    listed["bytes"] = *bytes;
    listed["since"] = (*document)["since"];
    if (section == Section::kKeep) {
        listed["rule"] = (*document)["reason"];
    }
    side.listed.append(std::move(listed));
}

void PreviewReader::TakeFailure(const Json::Value& entry) {
    const auto text = [&entry](const char* name) {
        return entry[name].isString() ? entry[name].asString() : std::string();
    };
    AddProblem(share + ": cannot " + text("action") + " " + text("path") + ": " + text("message"));
}

void PreviewReader::TakeProblems(std::string_view line) {
    const std::optional<Json::Value> document = ParseObject("{" + std::string(line));
    if (!document) {
        AddProblem(kUnreadable);
        return;
    }
    for (const Json::Value& each : (*document)["problems"]) {
        AddProblem(each["share"].asString() + ": " + each["message"].asString());
    }
    ended = true;
}

void PreviewReader::AddProblem(const std::string& text) {
    if (problems.size() < kMostProblems) {
        problems.append(text);
    }
}

Json::Value PreviewReader::Answer() const {
    Json::Value answer(Json::objectValue);
    answer["complete"] = ended && problems.empty();
    answer["remove"] = SumDocument(removed.count, removed.bytes);
    answer["keep"] = SumDocument(kept.count, kept.bytes);
    answer["removed"] = removed.listed;
    answer["kept"] = kept.listed;
    answer["problems"] = problems;
    return answer;
}

}  // namespace orva
