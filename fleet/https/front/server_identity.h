/// With what a server proves who it is to its clients.
#pragma once

#include <sys/types.h>

#include <ctime>
#include <memory>
#include <optional>
#include <string>

struct ssl_st;
struct ssl_ctx_st;

namespace fleet {

struct FreeTls {
    void operator()(ssl_st* session) const;
    void operator()(ssl_ctx_st* context) const;
};
/// One client's TLS.
using TlsSession = std::unique_ptr<ssl_st, FreeTls>;

/// A file with the server's certificate, those behind it, and the key, all in PEM, which only its
/// owner may read. When another file is put in its place, new clients see that one.
///
/// One thread at a time. OpenSSL must be the shared library: see CertificateAuthority.
class ServerIdentity {
public:
    /// Throws FrontError if the file is not usable.
    explicit ServerIdentity(std::string file);

    /// TLS for one more client, on this connection, which stays the caller's: version 1.2 or 1.3,
    /// without renegotiation and without resumption. If the file has changed and is not usable, the
    /// operator is told once and the one before goes on. Null when memory is short.
    TlsSession sessionOn(int connection);

private:
    using Context = std::unique_ptr<ssl_ctx_st, FreeTls>;
    /// Tells one file from another that was put in its place.
    struct Version {
        dev_t device;
        ino_t inode;
        off_t size;
        timespec changed;
        bool operator==(const Version& other) const;
    };

    static std::optional<Version> versionOf(const std::string& file);
    static Context read(const std::string& file);
    void readAgainIfChanged();

    const std::string file_;
    std::optional<Version> version_;  ///< that was looked at last, usable or not
    Context context_;
};

}  // namespace fleet
