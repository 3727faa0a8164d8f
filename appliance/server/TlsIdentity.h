#pragma once

#include <optional>
#include <string>

namespace orva {

// What a server proves itself with to callers by TLS.
struct TlsIdentity {
    // The server's certificate and those that lead from it to its authority, and its private key,
    // as PEM text.
    std::string certificates;
    std::string key;

    // Reads both files; certificates may be read by anybody, the key by its owner only. Nothing,
    // with the reason, when a file cannot be used or the key is not the certificate's.
    static std::optional<TlsIdentity> Load(const std::string& certificateFile,
                                           const std::string& keyFile, std::string& error);
};

}  // namespace orva
