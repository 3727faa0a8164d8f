#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "appliance/server/Secret.h"

namespace orva {

// The secret that every caller of the web API presents: 256 random bits as 64 hexadecimal digits.
// Who can read its file may do whatever the API can do.
class AccessToken {
  public:
    // Reads the token's file, an absolute path, or makes it (mode 0600, complete and on disk before
    // it can be seen under its name) when there is none. Nothing, with the reason, when the file
    // cannot be made, holds something else, belongs to a stranger, or others may read or write it.
    static std::optional<AccessToken> LoadOrCreate(const std::string& file, std::string& error);

    // As LoadOrCreate, but a missing file is a failure too.
    static std::optional<AccessToken> Load(const std::string& file, std::string& error);

    // Takes the same time for every text of the token's length.
    bool Matches(std::string_view presented) const;

    // A digest of `text` that only the token's holder can make.
    Sha256Digest Sign(std::string_view text) const;

  private:
    explicit AccessToken(std::string digits) : token(std::move(digits)) {}

    std::string token;
};

}  // namespace orva
