/// Files with which a server proves who it is.
#pragma once

#include <string>

#include "fleet/https/tls_server.h"
#include "fleet/server/keys/tls/certificate_authority.h"
#include "support/scratch_dir.h"

namespace fleet_test {

/// An authority, and files of servers that it vouches for.
class IdentityFiles {
public:
    /// What such a file holds, with a new key each time.
    std::string content() const {
        const fleet::ServerCertificate made =
            authority_.issue({"localhost", "127.0.0.1"}, now_, now_ + std::chrono::hours(24));
        return made.chain + std::string(made.key.view());
    }
    std::string write(const std::string& content, mode_t mode = 0600) const {
        return scratch_.write("server.pem", content, mode);
    }
    std::string path() const { return scratch_.path("server.pem"); }
    const fleet::CertificateAuthority& authority() const { return authority_; }
    const ScratchDir& scratch() const { return scratch_; }

private:
    const ScratchDir scratch_;
    const fleet::Moment now_ = wallTime();
    const fleet::CertificateAuthority authority_ =
        fleet::CertificateAuthority::make("demo", now_, now_ + std::chrono::hours(48));
};

}  // namespace fleet_test
