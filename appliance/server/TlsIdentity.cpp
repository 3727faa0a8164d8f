#include "appliance/server/TlsIdentity.h"

#include <fcntl.h>
#include <gnutls/gnutls.h>

#include <cerrno>
#include <cstring>
#include <memory>

#include "appliance/server/Secret.h"
#include "appliance/util/FileDescriptor.h"
#include "appliance/util/FileRead.h"

namespace orva {
namespace {

constexpr std::size_t kLargestFile = std::size_t{1} << 20U;

struct CredentialsDeleter {
    void operator()(gnutls_certificate_credentials_t credentials) const {
        ::gnutls_certificate_free_credentials(credentials);
    }
};
using CredentialsPtr =
    std::unique_ptr<std::remove_pointer_t<gnutls_certificate_credentials_t>, CredentialsDeleter>;

gnutls_datum_t Datum(std::string& text) {
    return {reinterpret_cast<unsigned char*>(text.data()), static_cast<unsigned>(text.size())};
}

bool Read(const std::string& file, const char* what, std::string& content, std::string& error) {
    FileIdentity identity;
    if (const int code = ReadFile(file, kLargestFile, content, identity)) {
        error = "cannot read the " + std::string(what) + " " + file + ": " + std::strerror(code);
        return false;
    }
    return true;
}

bool IsSecret(const std::string& file, std::string& error) {
    const FileDescriptor fd(::open(file.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC));
    const std::string fault = fd.IsOpen() ? ExamineSecretFile(fd.Get()) : std::strerror(errno);
    if (!fault.empty()) {
        error = "cannot use the key " + file + ": " + fault;
    }
    return fault.empty();
}

}  // namespace

std::optional<TlsIdentity> TlsIdentity::Load(const std::string& certificateFile,
                                             const std::string& keyFile, std::string& error) {
    TlsIdentity identity;
    if (!Read(certificateFile, "certificate", identity.certificates, error) ||
        !IsSecret(keyFile, error) || !Read(keyFile, "key", identity.key, error)) {
        return std::nullopt;
    }
    gnutls_certificate_credentials_t made = nullptr;
    int code = ::gnutls_certificate_allocate_credentials(&made);
    const CredentialsPtr credentials(made);
    if (code == 0) {
        const gnutls_datum_t certificates = Datum(identity.certificates);
        const gnutls_datum_t key = Datum(identity.key);
        code = ::gnutls_certificate_set_x509_key_mem(credentials.get(), &certificates, &key,
                                                     GNUTLS_X509_FMT_PEM);
    }
    if (code < 0) {
        error = "cannot use the certificate " + certificateFile + " with the key " + keyFile +
                ": " + ::gnutls_strerror(code);
        return std::nullopt;
    }
    return identity;
}

}  // namespace orva
