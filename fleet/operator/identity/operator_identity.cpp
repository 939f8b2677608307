#include "fleet/operator/identity/operator_identity.h"

#include "fleet/bus/messages/document.h"

namespace fleet {

Certificate OperatorIdentity::grant() const {
    Certificate read = readCertificate(certificate, root, fleet);
    if (read.holder != Certificate::Holder::Operator || read.key != key.publicKey()) {
        throw MessageError("the certificate is for another key");
    }
    return read;
}

}  // namespace fleet
