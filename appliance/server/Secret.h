// What the server's secrets have in common: how they are made, compared and kept.
#pragma once

#include <array>
#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace orva {

using Sha256Digest = std::array<unsigned char, 32>;

// `bytes` bytes of the kernel's random source as twice as many hexadecimal digits. Nothing when the
// kernel gives none.
std::optional<std::string> MakeSecret(std::size_t bytes);

// Takes the same time wherever two texts of one length differ. The length is no secret.
bool SameSecret(std::string_view a, std::string_view b);
bool SameSecret(const Sha256Digest& a, const Sha256Digest& b);

Sha256Digest Sha256(std::string_view text);

// The keyed digest (HMAC with SHA-256): only who has `key` can make the one of a text.
Sha256Digest Sha256Keyed(std::string_view key, std::string_view text);

// Small letters, two for each byte.
std::string ToHex(std::string_view bytes);
std::string ToHex(const Sha256Digest& digest);

// What is wrong with the open file of a secret: it is no regular file, belongs to another account
// than this program's or root, or group or others may do anything with it. Empty when nothing is.
std::string ExamineSecretFile(int descriptor);

}  // namespace orva
