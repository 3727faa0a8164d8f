#include "appliance/util/StrictJson.h"

#include <json/reader.h>

#include <algorithm>
#include <cstddef>
#include <exception>
#include <memory>
#include <new>

#include "appliance/util/Text.h"
#include "appliance/util/Utf8.h"

namespace orva {
namespace {

constexpr int kMaxDepth = 64;

// Checks what jsoncpp's reader lets pass: bytes, texts, escapes, numbers and nesting. The order of
// the tokens is left to that reader.
class Scanner {
  public:
    explicit Scanner(std::string_view document) : text(document) {}

    // The first fault; null when there is none. Position() is where it was met.
    const char* Scan() {
        if (ValidUtf8Length(text) != text.size()) {
            at = ValidUtf8Length(text);
            return "text that is not UTF-8";
        }
        int depth = 0;
        while (at < text.size()) {
            const char byte = text[at];
            const char* fault = nullptr;
            if (byte == '"') {
                fault = String();
            } else if (byte == '-' || IsDigit(byte)) {
                fault = Number();
            } else if (byte == '[' || byte == '{') {
                if (++depth > kMaxDepth) {
                    return "arrays and objects nested too deeply";
                }
                ++at;
            } else if (byte == ']' || byte == '}') {
                --depth;
                ++at;
            } else if (kOther.find(byte) != std::string_view::npos) {
                ++at;
            } else {
                return "an unexpected character";
            }
            if (fault != nullptr) {
                return fault;
            }
        }
        return nullptr;
    }

    std::size_t Position() const { return at; }

  private:
    // Blanks, separators and the letters of true, false and null.
    static constexpr std::string_view kOther = " \t\r\n,:truefalsn";

    const char* String() {
        for (++at; at < text.size(); ++at) {
            const auto byte = static_cast<unsigned char>(text[at]);
            if (byte == '"') {
                ++at;
                return nullptr;
            }
            if (byte < 0x20) {
                return "a control character in a text";
            }
            if (byte == '\\') {
                if (const char* fault = Escape()) {
                    return fault;
                }
            }
        }
        return "a text without an end";
    }

    // Leaves `at` at the escape's last byte.
    const char* Escape() {
        constexpr std::string_view kSimple = "\"\\/bfnrt";
        ++at;
        if (at < text.size() && kSimple.find(text[at]) != std::string_view::npos) {
            return nullptr;
        }
        const int unit = CodeUnit();
        if (unit < 0) {
            return "a bad escape";
        }
        if (unit == 0) {
            return "a NUL in a text";
        }
        if (unit >= 0xDC00 && unit <= 0xDFFF) {
            return "half of a surrogate pair";
        }
        if (unit >= 0xD800 && unit <= 0xDBFF) {
            ++at;
            if (at >= text.size() || text[at] != '\\') {
                return "half of a surrogate pair";
            }
            ++at;
            const int low = CodeUnit();
            if (low < 0xDC00 || low > 0xDFFF) {
                return "half of a surrogate pair";
            }
        }
        return nullptr;
    }

    // The value of "uXXXX" at `at`, negative when it is none. Leaves `at` at its last byte.
    int CodeUnit() {
        if (at + 5 > text.size() || text[at] != 'u') {
            return -1;
        }
        int unit = 0;
        for (int i = 0; i < 4; ++i) {
            const char byte = text[++at];
            int digit = 0;
            if (IsDigit(byte)) {
                digit = byte - '0';
            } else if (byte >= 'a' && byte <= 'f') {
                digit = byte - 'a' + 10;
            } else if (byte >= 'A' && byte <= 'F') {
                digit = byte - 'A' + 10;
            } else {
                return -1;
            }
            unit = unit * 16 + digit;
        }
        return unit;
    }

    const char* Number() {
        constexpr const char* kFault = "a malformed number";
        if (text[at] == '-') {
            ++at;
        }
        if (Peek() == '0') {
            ++at;
        } else if (!Digits()) {
            return kFault;
        }
        if (Peek() == '.') {
            ++at;
            if (!Digits()) {
                return kFault;
            }
        }
        if (Peek() == 'e' || Peek() == 'E') {
            ++at;
            if (Peek() == '+' || Peek() == '-') {
                ++at;
            }
            if (!Digits()) {
                return kFault;
            }
        }
        constexpr std::string_view kAfter = " \t\r\n,]}";
        if (at < text.size() && kAfter.find(text[at]) == std::string_view::npos) {
            return kFault;
        }
        return nullptr;
    }

    bool Digits() {
        const std::size_t start = at;
        while (IsDigit(Peek())) {
            ++at;
        }
        return at > start;
    }

    char Peek() const { return at < text.size() ? text[at] : '\0'; }

    std::string_view text;
    std::size_t at = 0;
};

std::string Describe(const char* fault, std::string_view text, std::size_t position) {
    const std::string_view before = text.substr(0, position);
    const auto line = std::count(before.begin(), before.end(), '\n') + 1;
    const std::size_t lineStart = before.rfind('\n') + 1;  // npos + 1 is 0: the first line
    return "line " + std::to_string(line) + ", column " + std::to_string(position - lineStart + 1) +
           ": " + fault;
}

char Small(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; }

// Takes the next line from `text`, without its bullet, its indent and its full stop.
std::string TakeLine(std::string_view& text) {
    text.remove_prefix(std::min(text.find_first_not_of("* \n"), text.size()));
    std::string line(text.substr(0, text.find('\n')));
    text.remove_prefix(line.size());
    if (!line.empty() && line.back() == '.') {
        line.pop_back();
    }
    return line;
}

// The first of jsoncpp's messages ("* Line 1, Column 2\n  Missing ...\n") as Describe() writes
// them.
std::string OneLine(std::string_view message) {
    std::string place = TakeLine(message);
    std::string fault = TakeLine(message);
    if (fault.empty()) {
        return place;
    }
    std::transform(place.begin(), place.end(), place.begin(), Small);
    fault[0] = Small(fault[0]);
    return place + ": " + fault;
}

std::unique_ptr<Json::CharReader> NewReader() {
    static const Json::CharReaderBuilder builder = [] {
        Json::CharReaderBuilder strict;
        Json::CharReaderBuilder::strictMode(&strict.settings_);
        strict["strictRoot"] = false;
        strict["skipBom"] = false;
        // The scanner has limited the nesting already; the reader throws at its own limit.
        strict["stackLimit"] = kMaxDepth + 2;
        return strict;
    }();
    return std::unique_ptr<Json::CharReader>(builder.newCharReader());
}

}  // namespace

std::optional<Json::Value> ParseStrictJson(std::string_view text, std::string& error) {
    Scanner scanner(text);
    if (const char* fault = scanner.Scan()) {
        error = Describe(fault, text, scanner.Position());
        return std::nullopt;
    }
    std::string message;
    try {
        Json::Value document;
        if (NewReader()->parse(text.data(), text.data() + text.size(), &document, &message)) {
            return document;
        }
    } catch (const std::bad_alloc&) {
        throw;
    } catch (const std::exception& exception) {
        message = exception.what();
    }
    error = OneLine(message);
    return std::nullopt;
}

std::optional<Json::Value> ParseStrictObject(std::string_view text, std::string& error) {
    std::optional<Json::Value> document = ParseStrictJson(text, error);
    if (document && !document->isObject()) {
        error = "the document is no object";
        return std::nullopt;
    }
    return document;
}

}  // namespace orva
