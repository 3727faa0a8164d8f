#include "appliance/server/SignInCode.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <cstdio>
#include <fstream>
#include <stdexcept>

namespace orva {
namespace {

constexpr char kBootIdFile[] = "/proc/sys/kernel/random/boot_id";
constexpr std::size_t kTimeDigits = 16;
constexpr std::size_t kRandomDigits = 16;
constexpr std::size_t kDigestDigits = 32;
constexpr std::size_t kSignedDigits = kTimeDigits + kRandomDigits;

// The digest that belongs to a code's first part. The machine's start is part of it, since running
// times repeat after the next one.
std::string DigestOf(const AccessToken& token, std::string_view signedPart) {
    std::string bootId;
    std::getline(std::ifstream(kBootIdFile), bootId);
    return ToHex(token.Sign("sign-in code " + bootId + std::string(signedPart)))
        .substr(0, kDigestDigits);
}

}  // namespace

std::string MakeSignInCode(const AccessToken& token, const BootClock& clock) {
    const std::optional<std::string> random = MakeSecret(kRandomDigits / 2);
    if (!random) {
        throw std::runtime_error("the kernel gives no random bits");
    }
    char time[kTimeDigits + 1];
    std::snprintf(time, sizeof time, "%016llx", static_cast<unsigned long long>(clock().count()));
    const std::string signedPart = time + *random;
    return signedPart + DigestOf(token, signedPart);
}

SignInCodes::SignInCodes(const AccessToken& givenToken, BootClock clock)
    : token(givenToken), now(std::move(clock)), begin(now()) {}

bool SignInCodes::Redeem(std::string_view code) {
    if (code.size() != kSignedDigits + kDigestDigits) {
        return false;
    }
    const std::string_view signedPart = code.substr(0, kSignedDigits);
    if (!SameSecret(DigestOf(token, signedPart), code.substr(kSignedDigits))) {
        return false;
    }
    std::int64_t count = -1;
    std::from_chars(code.data(), code.data() + kTimeDigits, count, 16);
    const std::chrono::milliseconds made(count);
    const std::lock_guard lock(mutex);
    const std::chrono::milliseconds time = now();
    if (made < begin || made > time || time - made >= kLifetime) {
        return false;
    }
    std::erase_if(redeemed, [time](const auto& entry) { return time - entry.second >= kLifetime; });
    return redeemed.emplace(signedPart, made).second;
}

}  // namespace orva
