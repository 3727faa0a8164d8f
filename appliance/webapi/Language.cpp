#include "appliance/webapi/Language.h"

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <vector>

#include "appliance/root/Root.h"
#include "appliance/util/Text.h"

namespace orva {
namespace {

constexpr std::size_t kLongestGroup = 8;
constexpr std::size_t kLongestTag = 35;
// Of a header with more languages than anybody reads, the first ones count.
constexpr std::size_t kMostRanges = 16;

bool IsLetter(char c) { return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z'); }

bool HaveTexts(const std::string& language) {
    std::error_code error;
    return std::filesystem::is_directory(ResolvePath(kTextsDirectory + language), error);
}

// The part of `text` before `separator`, taken away from it together with the separator.
std::string_view TakeUpTo(char separator, std::string_view& text) {
    const std::size_t at = text.find(separator);
    const std::string_view part = text.substr(0, at);
    text.remove_prefix(at == std::string_view::npos ? text.size() : at + 1);
    return part;
}

// A weight "0.5" as 500; nothing when it is malformed.
std::optional<int> ReadWeight(std::string_view text) {
    if (text.empty() || text.size() > 5 || (text[0] != '0' && text[0] != '1') ||
        (text.size() > 1 && text[1] != '.')) {
        return std::nullopt;
    }
    int weight = (text[0] - '0') * 1000;
    int unit = 100;
    for (const char c : text.substr(std::min<std::size_t>(2, text.size()))) {
        if (!IsDigit(c)) {
            return std::nullopt;
        }
        weight += (c - '0') * unit;
        unit /= 10;
    }
    return weight <= 1000 ? std::optional<int>(weight) : std::nullopt;
}

struct Range {
    std::string_view tag;
    int weight = 1000;
};

std::vector<Range> ReadRanges(std::string_view header) {
    std::vector<Range> ranges;
    while (!header.empty() && ranges.size() < kMostRanges) {
        std::string_view element = TakeUpTo(',', header);
        Range range;
        range.tag = TrimBlanks(TakeUpTo(';', element));
        const std::string_view parameter = TrimBlanks(element);
        if (!parameter.empty()) {
            const bool isWeight = parameter.substr(0, 2) == "q=" || parameter.substr(0, 2) == "Q=";
            range.weight = isWeight ? ReadWeight(parameter.substr(2)).value_or(0) : 0;
        }
        if (range.weight > 0) {
            ranges.push_back(range);
        }
    }
    std::stable_sort(ranges.begin(), ranges.end(),
                     [](const Range& a, const Range& b) { return a.weight > b.weight; });
    return ranges;
}

}  // namespace

bool IsLanguageTag(std::string_view tag) {
    if (tag.size() > kLongestTag) {
        return false;
    }
    std::size_t inGroup = 0;
    bool firstGroup = true;
    for (const char c : tag) {
        if (c == '-' || c == '_') {
            if (inGroup < (firstGroup ? 2U : 1U)) {
                return false;
            }
            inGroup = 0;
            firstGroup = false;
        } else if (!(IsLetter(c) || (!firstGroup && IsDigit(c))) || ++inGroup > kLongestGroup) {
            return false;
        }
    }
    return inGroup >= (firstGroup ? 2U : 1U);
}

std::optional<std::string> FindLanguage(std::string_view tag) {
    if (!IsLanguageTag(tag)) {
        return std::nullopt;
    }
    std::string candidate(tag);
    while (true) {
        if (HaveTexts(candidate)) {
            return candidate;
        }
        std::string lower = candidate;
        std::transform(lower.begin(), lower.end(), lower.begin(),
                       [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
        if (lower != candidate && HaveTexts(lower)) {
            return lower;
        }
        const std::size_t lastGroup = candidate.find_last_of("-_");
        if (lastGroup == std::string::npos) {
            return std::nullopt;
        }
        candidate.resize(lastGroup);
    }
}

std::string ChooseLanguage(std::optional<std::string_view> asked, std::string_view acceptLanguage) {
    if (asked) {
        return FindLanguage(*asked).value_or(kDefaultLanguage);
    }
    for (const Range& range : ReadRanges(acceptLanguage)) {
        if (std::optional<std::string> language = FindLanguage(range.tag)) {
            return *language;
        }
    }
    return kDefaultLanguage;
}

}  // namespace orva
