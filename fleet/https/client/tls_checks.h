/// What a TLS client insists on. Only sources of the client include this header: it brings in
/// OpenSSL.
#pragma once

#include <openssl/ssl.h>

#include <string>

#include "fleet/https/client/server_trust.h"

namespace fleet {

/// Makes a context's connections insist on TLS 1.2 or newer and on servers for which the trusted
/// authority vouches. Borrows the trust as long as the context lasts. Throws HttpsError(NotTrusted)
/// if the trust makes no sense.
void insistOnTrust(SSL_CTX* context, const ServerTrust& trust);

/// Makes a connection insist on a certificate for that host, a DNS name or an IP address. Throws
/// HttpsError(NotTrusted).
void insistOnHost(SSL* connection, const std::string& host);

/// Why a server was not believed; "" if that is not what went wrong.
std::string reasonOfDistrust(const SSL* connection);

/// The certificate of the authority that vouches for the server of an open connection, PEM.
std::string authorityOf(const SSL* connection);

}  // namespace fleet
