/// Which machine this is.
#pragma once

#include <string>

namespace fleet {

/// Tells machines apart without telling which they are: derived from the machine's identity, which
/// is to be kept confidential, and the host's public key. `file` holds that identity, and is
/// /etc/machine-id. "" where there is none: then only the sessions tell two machines apart.
std::string machineIdentity(const std::string& host, const std::string& file = "/etc/machine-id");

}  // namespace fleet
