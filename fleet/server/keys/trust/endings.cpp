#include "fleet/server/keys/trust/endings.h"

#include <algorithm>
#include <map>

#include "fleet/bus/messages/certificate.h"
#include "fleet/server/keys/files/private_file.h"
#include "fleet/server/keys/tls/certificate_authority.h"
#include "fleet/server/keys/trust/operators.h"

namespace fleet {
namespace {

constexpr const char* kRotate = "zavfleetd keys rotate";

/// The latest end of each operator's keys that count.
std::map<std::string, Moment> endsOfOperators(sqlite::Database& trust) {
    std::map<std::string, Moment> ends;
    for (const OperatorKey& key : Operators(trust).all()) {
        if (key.state != OperatorKey::State::Certified) continue;
        Moment& end = ends[key.grant.name];
        end = std::max(end, key.until);
    }
    return ends;
}

}  // namespace

std::vector<Ending> allEndingsOf(const FleetDirectory& directory, sqlite::Database& trust,
                                 Moment now) {
    const FleetFacts facts = directory.facts();
    const Certificate centre =
        readCertificate(directory.centre().certificate, facts.root, facts.fleet);
    std::vector<Ending> endings = {
        {"the certificate of the centre's key", kRotate, centre.until, Ending::Of::Centre},
        {"the certificate for TLS of the centre and the bus", kRotate,
         endOfCertificate(readPrivateFile(directory.serverFile()).view()), Ending::Of::Server},
        {"the certificate of the TLS authority", "enrol all hosts anew under another one",
         endOfCertificate(directory.authority()), Ending::Of::Authority}};
    for (const auto& [name, until] : endsOfOperators(trust)) {
        if (until + kWarnedBefore <= now) continue;
        endings.push_back({"the certificate of the operator " + name,
                           "zavfleetd operator add " + name, until, Ending::Of::Operator});
    }
    std::stable_sort(endings.begin(), endings.end(),
                     [](const Ending& a, const Ending& b) { return a.until < b.until; });
    return endings;
}

std::vector<Ending> endingsOf(const FleetDirectory& directory, sqlite::Database& trust,
                              Moment now) {
    std::vector<Ending> endings = allEndingsOf(directory, trust, now);
    const auto isFar = [now](const Ending& ending) { return ending.until > now + kWarnedBefore; };
    endings.erase(std::remove_if(endings.begin(), endings.end(), isFar), endings.end());
    return endings;
}

}  // namespace fleet
