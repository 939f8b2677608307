/// The offline root: whoever has it can make operators, centres and accounts of the bus.
///
/// It is a file that the administrator keeps apart from the centre's machine, and brings when an
/// operator or the centre is to be certified. The centre never needs it while it runs.
#pragma once

#include <string>

#include "fleet/bus/accounts/fleet_accounts.h"
#include "fleet/server/keys/files/secret_text.h"

namespace fleet {

struct RootKeys {
    std::string fleet;  ///< whose root it is
    KeyPair root;       ///< certifies the centre's key and the operators'
    /// The bus's operator and accounts. Those keys that the centre has too are here so that its
    /// directory can be made again when it is lost.
    FleetKeys bus;
    SecretText authorityKey;  ///< signs certificates for TLS, see CertificateAuthority::keyText()
};

/// Makes the file, with mode 0600. Throws KeysError if there is anything of that name already.
void writeRootFile(const std::string& file, const RootKeys& keys);
/// Throws KeysError if it is not one, or others may read it.
RootKeys readRootFile(const std::string& file);

}  // namespace fleet
