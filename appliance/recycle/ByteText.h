#pragma once

#include <string>
#include <string_view>

namespace orva {

// File names are bytes without any promise of an encoding. These functions write them where people,
// terminals and programs read.

bool IsUtf8(std::string_view bytes);

// As one word that bash reads back as the same bytes: 'name', or $'name' with escapes when a byte
// could move a cursor, end a line or reorder the text around it.
std::string QuoteForTerminal(std::string_view bytes);

// Without quotes where the name is plain (no blanks, no special bytes, not empty), else as above.
std::string QuoteIfNeeded(std::string_view bytes);

// As a JSON string with its quotes. What is not UTF-8 becomes U+FFFD, one per byte.
std::string QuoteForJson(std::string_view bytes);

std::string Base64(std::string_view bytes);

// A count with thousands left alone and a unit: "512 bytes", "1 byte", "1.5 GB" (of 1024 each).
std::string HumanBytes(unsigned long long bytes);

}  // namespace orva
