/// By what a server is believed to be the one that is meant.
#pragma once

#include <string>
#include <utility>

namespace fleet {

/// The authority that must have vouched for the server's certificate. No other one counts, not even
/// one that the system trusts.
struct ServerTrust {
    std::string authority;    ///< its certificate, PEM; or, if that is not known yet,
    std::string fingerprint;  ///< the SHA-256 of its certificate, 64 hex digits in lower case

    static ServerTrust byAuthority(std::string pem) { return {std::move(pem), {}}; }
    /// For somebody who has no more than an invitation. The server sends the authority's
    /// certificate along with its own.
    static ServerTrust byFingerprint(std::string sha256) { return {{}, std::move(sha256)}; }
};

}  // namespace fleet
