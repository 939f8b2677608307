/// The fleet's own authority for TLS: it vouches for the servers of the bus and for the centre.
///
/// The programs that use it also have the bus's client library, which brings OpenSSL as a shared
/// library. So this is linked with that, never with a static one: a process with two of them would
/// mix their objects.
#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/messages/values.h"
#include "fleet/server/keys/files/secret_text.h"

struct evp_pkey_st;
struct x509_st;

namespace fleet {

/// What a server proves with who it is. PEM.
struct ServerCertificate {
    std::string chain;  ///< the server's certificate, and behind it the authority's
    SecretText key;
};

/// Const operations may run in any thread. All throw KeysError when OpenSSL fails.
class CertificateAuthority {
public:
    /// A new one, named after the fleet.
    static CertificateAuthority make(const std::string& fleet, Moment now, Moment until);
    /// That of a certificate (PEM) and its key as keyText() told it. Throws KeysError if they do
    /// not belong together.
    static CertificateAuthority of(const std::string& certificate, std::string_view keyText);

    CertificateAuthority(CertificateAuthority&&) noexcept;
    CertificateAuthority& operator=(CertificateAuthority&&) noexcept;
    ~CertificateAuthority();

    std::string certificate() const;  ///< PEM
    SecretText keyText() const;       ///< one line

    /// For servers that are reached by these names, see checkServerNames(). With a new key.
    ServerCertificate issue(const std::vector<std::string>& names, Moment now, Moment until) const;

private:
    struct Free {
        void operator()(evp_pkey_st* key) const;
        void operator()(x509_st* certificate) const;
    };
    using Key = std::unique_ptr<evp_pkey_st, Free>;
    using Certificate = std::unique_ptr<x509_st, Free>;
    CertificateAuthority(Key key, Certificate certificate);

    static Key newKey();
    static Certificate unsignedCertificate(const std::string& name, evp_pkey_st* key, Moment now,
                                           Moment until);

    Key key_;
    Certificate certificate_;
};

/// SHA-256 of a certificate (PEM; the first one counts): 64 hex digits. Throws KeysError.
std::string fingerprintOfCertificate(std::string_view pem);
/// When the first certificate of a PEM text ends. Throws KeysError.
Moment endOfCertificate(std::string_view pem);

}  // namespace fleet
