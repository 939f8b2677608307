#include "fleet/server/commands/invitation_line.h"

#include "fleet/bus/messages/invitation.h"
#include "fleet/server/keys/tls/certificate_authority.h"

namespace fleet {

std::string invitationLine(const FleetDirectory& directory, const std::string& token) {
    const FleetFacts facts = directory.facts();
    return invitationText({facts.url, fingerprintOfCertificate(directory.authority()), facts.fleet,
                           facts.root, token});
}

}  // namespace fleet
