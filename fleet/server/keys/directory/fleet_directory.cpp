#include "fleet/server/keys/directory/fleet_directory.h"

#include <utility>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/document.h"
#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/files/private_file.h"

namespace fleet {
namespace {

constexpr const char* kCentreKeyLine = "centre";

bool isCertifiedBy(const std::string& certificate, const FleetFacts& facts,
                   const std::string& key) {
    try {
        const Certificate read = readCertificate(certificate, facts.root, facts.fleet);
        return read.holder == Certificate::Holder::Centre && read.key == key;
    } catch (const MessageError&) {
        return false;
    }
}

}  // namespace

FleetDirectory::FleetDirectory(std::string path) : path_(std::move(path)) {
    requirePrivateDirectory(path_);
}

FleetFacts FleetDirectory::facts() const {
    return readFacts(readPrivateFile(factsFile()).view());
}

CentreKey FleetDirectory::centre() const {
    const KeyPair key = ReadKeyLines(centreFile()).key(kCentreKeyLine, KeyKind::User);
    const FleetFacts known = facts();
    for (const std::string& certificate : known.centres) {
        if (isCertifiedBy(certificate, known, key.publicKey())) return {key, certificate};
    }
    throw KeysError("the root has not certified the key in " + centreFile() +
                    "; make a new one with \"keys rotate\"");
}

BusKeys FleetDirectory::bus() const {
    return readBusKeys(ReadKeyLines(busFile()));
}

std::string FleetDirectory::authority() const {
    return std::string(readPrivateFile(authorityFile()).view());
}

void FleetDirectory::keepFacts(const FleetFacts& facts) const {
    writePrivateFile(factsFile(), textOfFacts(facts));
}

void FleetDirectory::keepCentre(const KeyPair& key) const {
    writePrivateFile(centreFile(), KeyLines().add(kCentreKeyLine, key).text());
}

void FleetDirectory::keepBus(const BusKeys& keys) const {
    writePrivateFile(busFile(), linesOfBusKeys(keys).text());
}

void FleetDirectory::keepAuthority(std::string_view certificate) const {
    writePrivateFile(authorityFile(), certificate);
}

void FleetDirectory::keepServer(std::string_view chainAndKey) const {
    writePrivateFile(serverFile(), chainAndKey);
}

}  // namespace fleet
