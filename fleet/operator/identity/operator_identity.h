/// Who an operator is in a fleet.
#pragma once

#include <string>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/certificate.h"

namespace fleet {

struct OperatorIdentity {
    std::string url;          ///< the centre's
    std::string fleet;        ///< the fleet's name
    std::string root;         ///< the public key that certifies operators
    std::string authority;    ///< the certificate that vouches for the centre's, PEM
    KeyPair key;              ///< the operator's; its secret never leaves this machine
    std::string certificate;  ///< what the root has certified, in the bytes that it signed

    /// What the certificate says. Throws MessageError if the root has not signed it, or not for
    /// this key.
    Certificate grant() const;
};

}  // namespace fleet
