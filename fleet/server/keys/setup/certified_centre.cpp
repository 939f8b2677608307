#include "fleet/server/keys/setup/certified_centre.h"

#include "fleet/bus/messages/certificate.h"

namespace fleet {

CentreKey certifiedCentre(const RootKeys& keys, Moment until) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    Certificate certificate;
    certificate.fleet = keys.fleet;
    certificate.holder = Certificate::Holder::Centre;
    certificate.name = "centre";
    certificate.key = key.publicKey();
    certificate.until = until;
    return {key, signCertificate(certificate, keys.root)};
}

SecretText serverFileFor(const CertificateAuthority& authority,
                         const std::vector<std::string>& names, Moment now, Moment until) {
    const ServerCertificate server = authority.issue(names, now, until);
    SecretText file;
    file.append(server.chain).append(server.key.view());
    return file;
}

}  // namespace fleet
