#include "fleet/server/keys/setup/rotate_keys.h"

#include <algorithm>
#include <filesystem>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/document.h"
#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/files/private_file.h"
#include "fleet/server/keys/setup/certified_centre.h"
#include "fleet/server/keys/setup/server_configuration.h"

namespace fleet {
namespace {

/// Those who replace keys more often than orders end must keep the overlap short.
constexpr std::size_t kMostCertifiedCentres = 8;

bool isOver(const std::string& certificate, const FleetFacts& facts, Moment now) {
    try {
        return readCertificate(certificate, facts.root, facts.fleet).until <= now;
    } catch (const MessageError&) {
        return true;
    }
}

std::vector<std::string> centresWith(const std::string& newest, const FleetFacts& facts,
                                     Moment now) {
    std::vector<std::string> centres{newest};
    for (const std::string& earlier : facts.centres) {
        if (centres.size() < kMostCertifiedCentres && !isOver(earlier, facts, now)) {
            centres.push_back(earlier);
        }
    }
    return centres;
}

/// A clock that was put back must not let the earlier users in: no time is said for them.
BusKeys withNewUsers(BusKeys bus, const RootKeys& keys, TokenTime now) {
    bus.earlierCentre[bus.centre.key.publicKey()] = kForEver;
    bus.earlierSystem[bus.system.key.publicKey()] = kForEver;
    bus.centre = makeBusUser(keys.bus.control, "centre", now);
    bus.system = makeBusUser(keys.bus.system, "centre", now);
    return bus;
}

}  // namespace

void insistOnRootOf(const FleetFacts& facts, const RootKeys& keys) {
    if (facts.fleet != keys.fleet || facts.root != keys.root.publicKey()) {
        throw KeysError("that root is not the one of the fleet " + facts.fleet);
    }
}

bool rotateKeys(const FleetDirectory& directory, const RootKeys& keys, Moment now, Moment until) {
    FleetFacts facts = directory.facts();
    insistOnRootOf(facts, keys);
    const BusKeys bus =
        withNewUsers(directory.bus(), keys, std::chrono::duration_cast<TokenTime>(now));
    const auto authority =
        CertificateAuthority::of(directory.authority(), keys.authorityKey.view());
    const SecretText server = serverFileFor(authority, facts.names, now, until);
    const CentreKey centre = certifiedCentre(keys, until);
    facts.centres = centresWith(centre.certificate, facts, now);
    // The certificate first: a key without one would be of no use.
    directory.keepFacts(facts);
    directory.keepCentre(centre.key);
    directory.keepBus(bus);
    directory.keepServer(server.view());
    const bool isBusHere = std::filesystem::is_directory(facts.busDirectory);
    if (isBusHere) writePrivateFile(facts.busDirectory + "/" + kBusServerFile, server.view());
    return isBusHere;
}

}  // namespace fleet
