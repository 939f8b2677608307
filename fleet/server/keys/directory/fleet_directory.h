/// The centre's configuration directory: the fleet's facts, and the keys of the running centre.
#pragma once

#include <string>
#include <string_view>

#include "fleet/server/keys/directory/bus_keys.h"
#include "fleet/server/keys/directory/fleet_facts.h"
#include "fleet/server/keys/files/secret_text.h"

namespace fleet {

/// The centre's signing key, and what the root says of it.
struct CentreKey {
    KeyPair key;
    std::string certificate;
};

/// A directory with mode 0700 and files with mode 0600, each of which is replaced as a whole.
/// Nothing is kept in memory, so another process may rotate keys meanwhile. Everything throws
/// KeysError.
class FleetDirectory {
public:
    /// One that is there.
    explicit FleetDirectory(std::string path);

    const std::string& path() const { return path_; }
    /// The database of who may take part, see TrustDatabase.
    std::string trustDatabase() const { return path_ + "/trust.db"; }
    /// The directory of the database of orders, see CentreDatabase; and that of operators' files.
    std::string orders() const { return path_ + "/orders"; }
    std::string files() const { return path_ + "/files"; }
    /// The certificate of the TLS authority, and the centre's own with its key in one file: so
    /// they change together. Both PEM.
    std::string authorityFile() const { return path_ + "/ca.pem"; }
    std::string serverFile() const { return path_ + "/server.pem"; }

    FleetFacts facts() const;
    /// The key with the one of its certificates among the facts.
    CentreKey centre() const;
    BusKeys bus() const;
    std::string authority() const;  ///< PEM

    void keepFacts(const FleetFacts& facts) const;
    void keepCentre(const KeyPair& key) const;
    void keepBus(const BusKeys& keys) const;
    void keepAuthority(std::string_view certificate) const;
    void keepServer(std::string_view chainAndKey) const;

private:
    std::string factsFile() const { return path_ + "/fleet.json"; }
    std::string centreFile() const { return path_ + "/centre.key"; }
    std::string busFile() const { return path_ + "/bus.keys"; }

    const std::string path_;
};

}  // namespace fleet
