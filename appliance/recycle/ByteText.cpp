#include "appliance/recycle/ByteText.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <cstdio>

namespace orva {
namespace {

constexpr std::string_view kHex = "0123456789abcdef";

struct Character {
    std::size_t length;  // bytes; 0 when the bytes are no UTF-8
    std::uint32_t code;
};

// The character at the start of `bytes`, which is not empty. Overlong forms, surrogates and what is
// beyond U+10FFFF count as no UTF-8.
Character FirstCharacter(std::string_view bytes) {
    const auto byteAt = [bytes](std::size_t at) { return static_cast<unsigned char>(bytes[at]); };
    const unsigned char first = byteAt(0);
    if (first < 0x80) {
        return {1, first};
    }
    std::size_t length = 0;
    std::uint32_t code = 0;
    std::uint32_t smallest = 0;
    if ((first & 0xE0) == 0xC0) {
        length = 2;
        code = first & 0x1FU;
        smallest = 0x80;
    } else if ((first & 0xF0) == 0xE0) {
        length = 3;
        code = first & 0x0FU;
        smallest = 0x800;
    } else if ((first & 0xF8) == 0xF0) {
        length = 4;
        code = first & 0x07U;
        smallest = 0x10000;
    } else {
        return {0, 0};
    }
    if (bytes.size() < length) {
        return {0, 0};
    }
    for (std::size_t at = 1; at < length; ++at) {
        if ((byteAt(at) & 0xC0) != 0x80) {
            return {0, 0};
        }
        code = (code << 6) | (byteAt(at) & 0x3FU);
    }
    const bool surrogate = code >= 0xD800 && code <= 0xDFFF;
    if (code < smallest || code > 0x10FFFF || surrogate) {
        return {0, 0};
    }
    return {length, code};
}

// Controls, line separators, and marks that change the direction of the text after them.
bool DisturbsTerminal(std::uint32_t code) {
    return code < 0x20 || (code >= 0x7F && code <= 0x9F) || code == 0x061C ||
           (code >= 0x200E && code <= 0x200F) || (code >= 0x2028 && code <= 0x202E) ||
           (code >= 0x2066 && code <= 0x2069) || code == 0xFEFF;
}

void AppendHexByte(std::string& text, char byte) {
    const auto value = static_cast<unsigned char>(byte);
    text += "\\x";
    text += kHex[value >> 4];
    text += kHex[value & 0x0F];
}

}  // namespace

bool IsUtf8(std::string_view bytes) {
    while (!bytes.empty()) {
        const std::size_t length = FirstCharacter(bytes).length;
        if (length == 0) {
            return false;
        }
        bytes.remove_prefix(length);
    }
    return true;
}

std::string QuoteForTerminal(std::string_view bytes) {
    std::string text;
    bool escaped = false;
    while (!bytes.empty()) {
        const Character character = FirstCharacter(bytes);
        const std::size_t length = character.length == 0 ? 1 : character.length;
        if (character.length == 0 || DisturbsTerminal(character.code)) {
            for (const char byte : bytes.substr(0, length)) {
                AppendHexByte(text, byte);
            }
            escaped = true;
        } else if (character.code == '\'' || character.code == '\\') {
            text += '\\';
            text += bytes[0];
            escaped = true;
        } else {
            text += bytes.substr(0, length);
        }
        bytes.remove_prefix(length);
    }
    return (escaped ? "$'" : "'") + text + "'";
}

std::string QuoteIfNeeded(std::string_view bytes) {
    const std::string quoted = QuoteForTerminal(bytes);
    const bool plain = quoted.size() == bytes.size() + 2 && !bytes.empty() &&
                       bytes.find_first_of(" :") == std::string_view::npos;
    return plain ? std::string(bytes) : quoted;
}

std::string QuoteForJson(std::string_view bytes) {
    std::string text = "\"";
    while (!bytes.empty()) {
        const Character character = FirstCharacter(bytes);
        const std::size_t length = character.length == 0 ? 1 : character.length;
        if (character.length == 0) {
            text += "\xEF\xBF\xBD";
        } else if (character.code == '"' || character.code == '\\') {
            text += '\\';
            text += bytes[0];
        } else if (character.code < 0x20 || character.code == 0x7F) {
            text += "\\u00";
            text += kHex[character.code >> 4];
            text += kHex[character.code & 0x0F];
        } else {
            text += bytes.substr(0, length);
        }
        bytes.remove_prefix(length);
    }
    text += '"';
    return text;
}

std::string Base64(std::string_view bytes) {
    constexpr std::string_view kDigits =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string text;
    text.reserve((bytes.size() + 2) / 3 * 4);
    while (!bytes.empty()) {
        const std::size_t count = bytes.size() < 3 ? bytes.size() : 3;
        std::uint32_t group = 0;
        for (std::size_t at = 0; at < 3; ++at) {
            group = (group << 8) | (at < count ? static_cast<unsigned char>(bytes[at]) : 0U);
        }
        for (std::size_t digit = 0; digit < 4; ++digit) {
            text += digit <= count ? kDigits[(group >> (18 - 6 * digit)) & 0x3F] : '=';
        }
        bytes.remove_prefix(count);
    }
    return text;
}

std::string HumanBytes(unsigned long long bytes) {
    constexpr std::array<const char*, 6> kUnits = {"KB", "MB", "GB", "TB", "PB", "EB"};
    if (bytes < 1024) {
        return std::to_string(bytes) + (bytes == 1 ? " byte" : " bytes");
    }
    double value = static_cast<double>(bytes) / 1024;
    std::size_t unit = 0;
    while (value >= 1024 && unit + 1 < kUnits.size()) {
        value /= 1024;
        ++unit;
    }
    std::array<char, 32> text{};
    std::snprintf(text.data(), text.size(), "%.1f %s", value, kUnits[unit]);
    return text.data();
}

}  // namespace orva
