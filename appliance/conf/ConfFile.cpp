#include "appliance/conf/ConfFile.h"

#include <algorithm>
#include <cstddef>
#include <optional>
#include <utility>

#include "appliance/util/Text.h"
#include "appliance/util/Utf8.h"

namespace orva {
namespace {

bool IsKey(std::string_view text) {
    return !text.empty() && std::all_of(text.begin(), text.end(), [](char byte) {
        return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') ||
               (byte >= '0' && byte <= '9') || byte == '_' || byte == '-' || byte == '.';
    });
}

// What stands between the quotes at the start of `text`, which loses it; nothing when it is no
// quoted value.
std::optional<std::string> TakeQuoted(std::string_view& text) {
    if (text.empty() || text.front() != '"') {
        return std::nullopt;
    }
    std::string value;
    for (std::size_t i = 1; i < text.size(); ++i) {
        if (text[i] == '"') {
            text.remove_prefix(i + 1);
            return value;
        }
        if (text[i] == '\0') {
            return std::nullopt;
        }
        if (text[i] == '\\') {
            ++i;
            if (i == text.size() || (text[i] != '"' && text[i] != '\\')) {
                return std::nullopt;
            }
        }
        value += text[i];
    }
    return std::nullopt;
}

std::optional<std::pair<std::string, std::string>> ParseLine(std::string_view line) {
    const std::size_t equals = line.find('=');
    if (equals == std::string_view::npos || ValidUtf8Length(line) != line.size()) {
        return std::nullopt;
    }
    const std::string_view key = TrimBlanks(line.substr(0, equals));
    std::string_view rest = TrimBlanks(line.substr(equals + 1));
    std::optional<std::string> value = TakeQuoted(rest);
    rest = TrimBlanks(rest);
    if (!IsKey(key) || !value || (!rest.empty() && rest.front() != '#')) {
        return std::nullopt;
    }
    return std::pair(std::string(key), std::move(*value));
}

}  // namespace

ConfFile ParseConf(std::string_view content) {
    constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";
    if (content.substr(0, kByteOrderMark.size()) == kByteOrderMark) {
        content.remove_prefix(kByteOrderMark.size());
    }
    ConfFile file;
    for (std::size_t number = 1; !content.empty(); ++number) {
        const std::size_t end = std::min(content.find('\n'), content.size());
        std::string_view line = content.substr(0, end);
        content.remove_prefix(std::min(end + 1, content.size()));
        if (!line.empty() && line.back() == '\r') {
            line.remove_suffix(1);
        }
        line = TrimBlanks(line);
        if (line.empty() || line.front() == '#') {
            continue;
        }
        if (auto pair = ParseLine(line)) {
            file.values.insert_or_assign(std::move(pair->first), std::move(pair->second));
        } else {
            file.damagedLines.push_back(number);
        }
    }
    return file;
}

}  // namespace orva
