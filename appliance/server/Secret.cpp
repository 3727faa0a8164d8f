#include "appliance/server/Secret.h"

#include <gnutls/crypto.h>
#include <gnutls/gnutls.h>
#include <sys/random.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>

namespace orva {
namespace {

std::string_view View(const Sha256Digest& digest) {
    return {reinterpret_cast<const char*>(digest.data()), digest.size()};
}

}  // namespace

std::optional<std::string> MakeSecret(std::size_t bytes) {
    std::string random(bytes, '\0');
    if (::getrandom(random.data(), bytes, 0) != static_cast<ssize_t>(bytes)) {
        return std::nullopt;
    }
    return ToHex(random);
}

bool SameSecret(std::string_view a, std::string_view b) {
    return a.size() == b.size() && ::gnutls_memcmp(a.data(), b.data(), a.size()) == 0;
}

bool SameSecret(const Sha256Digest& a, const Sha256Digest& b) {
    return SameSecret(View(a), View(b));
}

Sha256Digest Sha256(std::string_view text) {
    Sha256Digest digest{};
    if (::gnutls_hash_fast(GNUTLS_DIG_SHA256, text.data(), text.size(), digest.data()) != 0) {
        throw std::runtime_error("SHA-256 is not available");
    }
    return digest;
}

Sha256Digest Sha256Keyed(std::string_view key, std::string_view text) {
    Sha256Digest digest{};
    if (::gnutls_hmac_fast(GNUTLS_MAC_SHA256, key.data(), key.size(), text.data(), text.size(),
                           digest.data()) != 0) {
        throw std::runtime_error("HMAC is not available");
    }
    return digest;
}

std::string ToHex(std::string_view bytes) {
    constexpr char kDigits[] = "0123456789abcdef";
    std::string digits;
    digits.reserve(2 * bytes.size());
    for (const char byte : bytes) {
        const auto value = static_cast<unsigned char>(byte);
        digits += kDigits[value >> 4U];
        digits += kDigits[value & 0x0FU];
    }
    return digits;
}

std::string ToHex(const Sha256Digest& digest) { return ToHex(View(digest)); }

std::string ExamineSecretFile(int descriptor) {
    struct stat status {};
    if (::fstat(descriptor, &status) != 0) {
        return std::strerror(errno);
    }
    if (!S_ISREG(status.st_mode)) {
        return "it is no regular file";
    }
    if (status.st_uid != ::geteuid() && status.st_uid != 0) {
        return "it belongs to another account";
    }
    if ((status.st_mode & (S_IRWXG | S_IRWXO)) != 0) {
        return "group or others may read or write it; chmod 600 is needed";
    }
    return {};
}

}  // namespace orva
