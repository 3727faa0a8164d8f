#include "appliance/webapi/JsonWriter.h"

#include <array>
#include <charconv>
#include <cmath>
#include <string_view>

#include "appliance/util/Utf8.h"

namespace orva {
namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";

// What stands for an ASCII byte inside a JSON string: nothing when the byte stands for itself, 'u'
// for the six-character form, else the letter after the backslash.
constexpr std::array<char, 128> kEscapes = [] {
    std::array<char, 128> table{};
    for (std::size_t c = 0; c < 0x20; ++c) {
        table[c] = 'u';
    }
    table['\b'] = 'b';
    table['\f'] = 'f';
    table['\n'] = 'n';
    table['\r'] = 'r';
    table['\t'] = 't';
    table['"'] = '"';
    table['\\'] = '\\';
    table[0x7F] = 'u';
    return table;
}();

void AppendEscape(unsigned char byte, std::string& text) {
    constexpr char kDigits[] = "0123456789abcdef";
    text += '\\';
    if (kEscapes[byte] != 'u') {
        text += kEscapes[byte];
        return;
    }
    text += "u00";
    text += kDigits[byte >> 4U];
    text += kDigits[byte & 0x0FU];
}

// `content` is valid UTF-8.
void AppendEscaped(std::string_view content, std::string& text) {
    std::size_t done = 0;
    for (std::size_t at = 0; at < content.size(); ++at) {
        const auto byte = static_cast<unsigned char>(content[at]);
        if (byte < kEscapes.size() && kEscapes[byte] != 0) {
            text.append(content, done, at - done);
            AppendEscape(byte, text);
            done = at + 1;
        }
    }
    text.append(content, done);
}

void AppendString(std::string_view content, std::string& text) {
    text += '"';
    while (true) {
        const std::size_t valid = ValidUtf8Length(content);
        AppendEscaped(content.substr(0, valid), text);
        if (valid == content.size()) {
            break;
        }
        text += kReplacement;
        content.remove_prefix(valid + 1);
    }
    text += '"';
}

template <class Number>
void AppendNumber(Number number, std::string& text) {
    std::array<char, 40> digits{};
    const auto result = std::to_chars(digits.data(), digits.data() + digits.size(), number);
    text.append(digits.data(), result.ptr);
}

void AppendReal(double number, std::string& text) {
    if (!std::isfinite(number)) {
        text += "null";
        return;
    }
    const std::size_t start = text.size();
    AppendNumber(number, text);
    // 5.0 written as 5 would come back as an integer.
    if (text.find_first_of(".e", start) == std::string::npos) {
        text += ".0";
    }
}

void AppendArray(const Json::Value& value, std::string& text) {
    text += '[';
    bool first = true;
    for (const Json::Value& element : value) {
        if (!first) {
            text += ',';
        }
        first = false;
        AppendJson(element, text);
    }
    text += ']';
}

void AppendObject(const Json::Value& value, std::string& text) {
    text += '{';
    bool first = true;
    for (auto member = value.begin(); member != value.end(); ++member) {
        if (!first) {
            text += ',';
        }
        first = false;
        const char* end = nullptr;
        const char* name = member.memberName(&end);
        AppendString(std::string_view(name, static_cast<std::size_t>(end - name)), text);
        text += ':';
        AppendJson(*member, text);
    }
    text += '}';
}

}  // namespace

void AppendJson(const Json::Value& value, std::string& text) {
    switch (value.type()) {
        case Json::nullValue:
            text += "null";
            break;
        case Json::intValue:
            AppendNumber(value.asInt64(), text);
            break;
        case Json::uintValue:
            AppendNumber(value.asUInt64(), text);
            break;
        case Json::realValue:
            AppendReal(value.asDouble(), text);
            break;
        case Json::stringValue: {
            const char* begin = nullptr;
            const char* end = nullptr;
            // False for a string value without content.
            if (value.getString(&begin, &end)) {
                AppendString(std::string_view(begin, static_cast<std::size_t>(end - begin)), text);
            } else {
                text += "\"\"";
            }
            break;
        }
        case Json::booleanValue:
            text += value.asBool() ? "true" : "false";
            break;
        case Json::arrayValue:
            AppendArray(value, text);
            break;
        case Json::objectValue:
            AppendObject(value, text);
            break;
    }
}

std::string WriteJson(const Json::Value& value) {
    std::string text;
    AppendJson(value, text);
    return text;
}

}  // namespace orva
