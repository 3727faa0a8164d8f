#include "appliance/util/Utf8.h"

namespace orva {

std::size_t ValidUtf8Length(std::string_view text) {
    std::size_t at = 0;
    while (at < text.size()) {
        const auto lead = static_cast<unsigned char>(text[at]);
        if (lead < 0x80) {
            ++at;
            continue;
        }
        std::size_t length = 0;
        // What the second byte may be tells over-long forms, surrogates and too high values apart.
        unsigned char lowest = 0x80;
        unsigned char highest = 0xBF;
        if (lead >= 0xC2 && lead <= 0xDF) {
            length = 2;
        } else if (lead >= 0xE0 && lead <= 0xEF) {
            length = 3;
            lowest = lead == 0xE0 ? 0xA0 : 0x80;
            highest = lead == 0xED ? 0x9F : 0xBF;
        } else if (lead >= 0xF0 && lead <= 0xF4) {
            length = 4;
            lowest = lead == 0xF0 ? 0x90 : 0x80;
            highest = lead == 0xF4 ? 0x8F : 0xBF;
        } else {
            return at;
        }
        if (text.size() - at < length) {
            return at;
        }
        for (std::size_t i = 1; i < length; ++i) {
            const auto byte = static_cast<unsigned char>(text[at + i]);
            if (byte < lowest || byte > highest) {
                return at;
            }
            lowest = 0x80;
            highest = 0xBF;
        }
        at += length;
    }
    return at;
}

char32_t TakeCharacter(std::string_view& text) {
    const auto lead = static_cast<unsigned char>(text.front());
    const std::size_t length = lead < 0x80 ? 1 : lead < 0xe0 ? 2 : lead < 0xf0 ? 3 : 4;
    char32_t character = length == 1 ? lead : lead & (0x7fU >> length);
    for (std::size_t at = 1; at < length; ++at) {
        character = character << 6U | (static_cast<unsigned char>(text[at]) & 0x3fU);
    }
    text.remove_prefix(length);
    return character;
}

}  // namespace orva
