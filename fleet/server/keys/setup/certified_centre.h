/// What the root makes for the centre, at the beginning and again at each rotation.
#pragma once

#include <string>
#include <vector>

#include "fleet/server/keys/directory/fleet_directory.h"
#include "fleet/server/keys/directory/root_file.h"
#include "fleet/server/keys/tls/certificate_authority.h"

namespace fleet {

/// A new signing key for the centre, which the root certifies until then.
CentreKey certifiedCentre(const RootKeys& keys, Moment until);

/// A new certificate for the servers, with its key behind it. PEM.
SecretText serverFileFor(const CertificateAuthority& authority,
                         const std::vector<std::string>& names, Moment now, Moment until);

}  // namespace fleet
