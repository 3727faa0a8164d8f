// Codes that sign a browser in without the token: a person opens a link that carries one.
#pragma once

#include <chrono>
#include <map>
#include <mutex>
#include <string>
#include <string_view>

#include "appliance/server/AccessToken.h"
#include "appliance/server/BootTime.h"

namespace orva {

// A new code, 64 hexadecimal digits: the machine's running time, random digits, and a digest of
// both that only the holder of the token can make. So whoever can read the token's file can make a
// code, in any process; nothing of it is stored. Throws std::runtime_error when the kernel gives no
// random bits.
std::string MakeSignInCode(const AccessToken& token, const BootClock& clock = BootTime);

// Takes codes, each once, for ten minutes. Codes that were made before this object, or before the
// machine's last start, are refused: which of them had been taken is not known.
//
// Threads: any.
class SignInCodes {
  public:
    static constexpr std::chrono::minutes kLifetime{10};

    explicit SignInCodes(const AccessToken& token, BootClock clock = BootTime);

    bool Redeem(std::string_view code);

  private:
    const AccessToken& token;
    const BootClock now;
    const std::chrono::milliseconds begin;
    std::mutex mutex;
    // Those that were taken, and when they were made, while they would still be good.
    std::map<std::string, std::chrono::milliseconds, std::less<>> redeemed;
};

}  // namespace orva
