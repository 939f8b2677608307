/// What the operator of a host tells its link.
#pragma once

#include <string>
#include <vector>

#include "fleet/bus/messages/selector.h"

namespace fleet {

/// /etc/zavlink.toml, for example:
///
///   fleet       = "example"
///   name        = "web-1"
///   bus         = ["tls://bus.example:4222"]
///   ca          = "/etc/zavlink/ca.pem"
///   server-name = "bus.example"
///   url         = "https://centre.example:8443"
///   root        = "O..."
///   centre      = ["U..."]
///   host-socket = "/run/zavhost/zavhost.sock"
///   state       = "/var/lib/zavlink"
///   metrics     = "/run/zavlink/zavlink.prom"
///   [labels]
///   env = "test"
struct LinkConfiguration {
    std::string fleet;                             ///< the fleet's name
    std::string name;                              ///< the host's, for people
    std::vector<std::string> bus;                  ///< addresses of the bus's servers
    std::string ca;                                ///< a file with whom to trust as a server; ""
    std::string serverName;                        ///< that the server's certificate must have
    std::string url;                               ///< of the centre, by HTTPS; "": no files come
    std::string root;                              ///< the public key that certifies operators
    std::vector<std::string> centres;              ///< the centre's signing keys
    std::string hostSocket = "/run/zavhost.sock";  ///< where the host is asked
    std::string state;    ///< the directory of what the link must not forget
    std::string metrics;  ///< a file for the node exporter, see MetricsFile; "": none is written
    Labels labels;
};

/// Reads the text of such a file, whose path is named in errors. Throws FileError, which names the
/// line, for anything that cannot be meant: an unknown name, a value of another kind, a missing
/// one, keys that are none, an address without encryption that leaves this machine.
LinkConfiguration parseLinkConfiguration(const std::string& text, const std::string& path);

/// The text of such a file.
std::string linkConfigurationText(const LinkConfiguration& configuration);

}  // namespace fleet
