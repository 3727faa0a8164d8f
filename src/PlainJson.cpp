#include "include/PlainJson.h"

#include <array>
#include <charconv>
#include <cstddef>
#include <cstring>
#include <string>
#include <utility>

namespace {

constexpr int kMostLevels = 32;
constexpr int kMostDigits = 9;

bool IsDigit(char byte) { return byte >= '0' && byte <= '9'; }

int HexDigit(char byte) {
    if (IsDigit(byte)) {
        return byte - '0';
    }
    if (byte >= 'a' && byte <= 'f') {
        return byte - 'a' + 10;
    }
    return byte >= 'A' && byte <= 'F' ? byte - 'A' + 10 : -1;
}

void AppendUtf8(std::string& text, unsigned codePoint) {
    const auto append = [&text](unsigned byte) { text += static_cast<char>(byte); };
    if (codePoint < 0x80) {
        append(codePoint);
    } else if (codePoint < 0x800) {
        append(0xC0 | (codePoint >> 6));
        append(0x80 | (codePoint & 0x3F));
    } else {
        append(0xE0 | (codePoint >> 12));
        append(0x80 | ((codePoint >> 6) & 0x3F));
        append(0x80 | (codePoint & 0x3F));
    }
}

// Each function reads one piece at the current place; false when it is not plain.
class PlainReader {
  public:
    PlainReader(std::string_view text, std::span<const std::string_view> frequentNames)
        : at(text.data()), end(text.data() + text.size()), frequent(frequentNames) {}

    bool Document(Json::Value& value) {
        SkipBlanks();
        if (at == end || (*at != '{' && *at != '[') || !Value(value, 0)) {
            return false;
        }
        SkipBlanks();
        return at == end;
    }

  private:
    void SkipBlanks() {
        while (at != end && (*at == ' ' || *at == '\n' || *at == '\t' || *at == '\r')) {
            ++at;
        }
    }

    // The next byte after blanks; NUL at the end, which is plain nowhere.
    char Next() {
        SkipBlanks();
        return at != end ? *at : '\0';
    }

    bool Take(char byte) {
        if (Next() != byte) {
            return false;
        }
        ++at;
        return true;
    }

    bool Word(std::string_view word, Json::Value& value, Json::Value meaning) {
        if (std::string_view(at, static_cast<std::size_t>(end - at)).substr(0, word.size()) !=
            word) {
            return false;
        }
        at += word.size();
        value = std::move(meaning);
        return true;
    }

    bool Value(Json::Value& value, int level) {
        switch (Next()) {
            case '{':
                return Object(value, level + 1);
            case '[':
                return Array(value, level + 1);
            case '"': {
                std::string_view text;
                if (!Text(text)) {
                    return false;
                }
                value = Json::Value(text.data(), text.data() + text.size());
                return true;
            }
            case 't':
                return Word("true", value, true);
            case 'f':
                return Word("false", value, false);
            case 'n':
                return Word("null", value, Json::Value());
            default:
                return Integer(value);
        }
    }

    bool Object(Json::Value& value, int level) {
        ++at;
        value = Json::Value(Json::objectValue);
        if (level > kMostLevels) {
            return false;
        }
        if (Take('}')) {
            return true;
        }
        do {
            std::string_view name;
            if (Next() != '"' || !Text(name) || name.empty()) {
                return false;
            }
            Json::Value& member = Member(value, name);
            if (!Take(':') || !Value(member, level)) {
                return false;
            }
        } while (Take(','));
        return Take('}');
    }

    Json::Value& Member(Json::Value& object, std::string_view name) {
        for (const std::string_view each : frequent) {
            if (name == each) {
                return object[Json::StaticString(each.data())];
            }
        }
        return *object.demand(name.data(), name.data() + name.size());
    }

    bool Array(Json::Value& value, int level) {
        ++at;
        value = Json::Value(Json::arrayValue);
        if (level > kMostLevels) {
            return false;
        }
        if (Take(']')) {
            return true;
        }
        do {
            if (!Value(value.append(Json::Value()), level)) {
                return false;
            }
        } while (Take(','));
        return Take(']');
    }

    bool Integer(Json::Value& value) {
        const bool negative = at != end && *at == '-';
        const char* digit = negative ? at + 1 : at;
        const char* const first = digit;
        int number = 0;
        while (digit != end && IsDigit(*digit) && digit - first < kMostDigits) {
            number = number * 10 + (*digit++ - '0');
        }
        constexpr std::string_view kAfter = ",]} \n\t\r";
        if (digit == first || digit == end || kAfter.find(*digit) == std::string_view::npos) {
            return false;
        }
        at = digit;
        value = negative ? -number : number;
        return true;
    }

    // `text` is good until the next call.
    bool Text(std::string_view& text) {
        const char* const first = ++at;
        while (at != end && *at != '"' && *at != '\\') {
            ++at;
        }
        if (at != end && *at == '"') {
            text = {first, static_cast<std::size_t>(at++ - first)};
            return true;
        }
        unescaped.assign(first, at);
        while (at != end && *at != '"') {
            if (*at != '\\') {
                unescaped += *at++;
            } else if (++at == end || !Escape()) {
                return false;
            }
        }
        text = unescaped;
        return at++ != end;
    }

    bool Escape() {
        constexpr std::string_view kEscapes = "\"\\/bfnrt";
        constexpr std::string_view kMeanings = "\"\\/\b\f\n\r\t";
        if (*at == 'u') {
            ++at;
            return CodeUnit();
        }
        const std::size_t which = kEscapes.find(*at++);
        if (which == std::string_view::npos) {
            return false;
        }
        unescaped += kMeanings[which];
        return true;
    }

    bool CodeUnit() {
        if (end - at < 4) {
            return false;
        }
        unsigned unit = 0;
        for (int i = 0; i < 4; ++i) {
            const int digit = HexDigit(*at++);
            if (digit < 0) {
                return false;
            }
            unit = unit * 16 + static_cast<unsigned>(digit);
        }
        if (unit >= 0xD800 && unit <= 0xDFFF) {
            return false;
        }
        AppendUtf8(unescaped, unit);
        return true;
    }

    const char* at;
    const char* const end;
    const std::span<const std::string_view> frequent;
    std::string unescaped;
};

// Each function appends one piece; false when it is not plain.
class PlainWriter {
  public:
    explicit PlainWriter(std::string& appendedTo) : text(appendedTo) {}

    bool Value(const Json::Value& value, int level) {
        switch (value.type()) {
            case Json::objectValue:
                return Object(value, level + 1);
            case Json::arrayValue:
                return Array(value, level + 1);
            case Json::stringValue: {
                const char* first = nullptr;
                const char* end = nullptr;
                return value.getString(&first, &end) && Text(first, end);
            }
            case Json::intValue:
                return Integer(value.asLargestInt());
            case Json::uintValue:
                return Integer(value.asLargestUInt());
            case Json::booleanValue:
                text += value.asBool() ? "true" : "false";
                return true;
            case Json::nullValue:
                text += "null";
                return true;
            default:
                return false;
        }
    }

  private:
    bool Object(const Json::Value& value, int level) {
        if (level > kMostLevels) {
            return false;
        }
        text += '{';
        bool isFirst = true;
        for (auto member = value.begin(); member != value.end(); ++member) {
            const char* end = nullptr;
            const char* const name = member.memberName(&end);
            Separate(isFirst);
            if (!Text(name, end)) {
                return false;
            }
            text += ':';
            if (!Value(*member, level)) {
                return false;
            }
        }
        text += '}';
        return true;
    }

    bool Array(const Json::Value& value, int level) {
        if (level > kMostLevels) {
            return false;
        }
        text += '[';
        bool isFirst = true;
        Json::ArrayIndex expected = 0;
        for (auto element = value.begin(); element != value.end(); ++element) {
            Separate(isFirst);
            // An array may have holes.
            if (element.index() != expected++ || !Value(*element, level)) {
                return false;
            }
        }
        text += ']';
        return true;
    }

    void Separate(bool& isFirst) {
        if (!isFirst) {
            text += ',';
        }
        isFirst = false;
    }

    bool Text(const char* first, const char* end) {
        text += '"';
        for (const char* at = first; at != end; ++at) {
            if (*at < ' ' || *at > '~' || *at == '"' || *at == '\\') {
                return false;
            }
        }
        text.append(first, static_cast<std::size_t>(end - first));
        text += '"';
        return true;
    }

    template <class Number>
    bool Integer(Number number) {
        std::array<char, 24> digits{};
        const auto written = std::to_chars(digits.begin(), digits.end(), number);
        text.append(digits.data(), written.ptr);
        return true;
    }

    std::string& text;
};

}  // namespace

bool ReadPlainJson(std::string_view text, std::span<const std::string_view> frequentNames,
                   Json::Value& value) {
    Json::Value read;
    if (!PlainReader(text, frequentNames).Document(read)) {
        return false;
    }
    value = std::move(read);
    return true;
}

std::optional<std::string> WritePlainJson(const Json::Value& value) {
    // Few sections are longer.
    constexpr std::size_t kUsualLength = 512;
    std::string text;
    text.reserve(kUsualLength);
    if (!PlainWriter(text).Value(value, 0)) {
        return std::nullopt;
    }
    text += '\n';
    return text;
}
