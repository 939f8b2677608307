#include "fleet/server/keys/setup/make_fleet.h"

#include <filesystem>
#include <system_error>
#include <utility>

#include "fleet/bus/messages/certificate.h"
#include "fleet/server/keys/directory/fleet_directory.h"
#include "fleet/server/keys/directory/root_file.h"
#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/files/private_file.h"
#include "fleet/server/keys/setup/certified_centre.h"
#include "fleet/server/keys/setup/server_configuration.h"
#include "fleet/server/keys/tls/certificate_authority.h"
#include "fleet/server/keys/trust/trust_database.h"

namespace fleet {
namespace {

namespace fs = std::filesystem;

void insistOnNothing(const std::string& path) {
    std::error_code error;
    const bool isThere = fs::exists(fs::symlink_status(path, error));
    const bool isEmptyFolder =
        isThere && fs::is_directory(path, error) && fs::is_empty(path, error);
    if (isThere && !isEmptyFolder) {
        throw KeysError(path +
                        " is there already. A fleet's keys are made once; if making them "
                        "was cut off, remove what it left");
    }
}

FleetFacts factsOf(const FleetPlan& plan, const RootKeys& keys, const CentreKey& centre) {
    FleetFacts facts;
    facts.fleet = plan.fleet;
    facts.root = keys.root.publicKey();
    facts.busOperator = keys.bus.root.publicKey();
    facts.accounts = AccountKeys::of(keys.bus);
    facts.url = plan.url;
    facts.busUrls = plan.busUrls;
    facts.names = plan.names;
    facts.busDirectory = plan.busDirectory;
    facts.centres = {centre.certificate};
    return facts;
}

void writeBus(const FleetPlan& plan, const FleetKeys& keys, std::string_view server,
              TokenTime issuedAt) {
    makePrivateDirectory(plan.busDirectory);
    const std::uint64_t bytes =
        plan.storeBytes ? *plan.storeBytes : storeBytesFor(plan.busDirectory);
    writePrivateFile(plan.busDirectory + "/" + kBusServerFile, server);
    writePrivateFile(
        plan.busDirectory + "/nats-server.conf",
        textOf(ServerConfiguration{plan.busDirectory, portOfBus(plan.busUrls.front()), bytes}, keys,
               issuedAt));
}

}  // namespace

void makeFleet(const FleetPlan& chosen) {
    const FleetPlan plan = completed(chosen);
    insistOnNothing(plan.rootFile);
    insistOnNothing(plan.directory);
    insistOnNothing(plan.busDirectory);
    const auto issuedAt = std::chrono::duration_cast<TokenTime>(plan.now);
    const CertificateAuthority authority =
        CertificateAuthority::make(plan.fleet, plan.now, plan.authorityUntil);
    const RootKeys keys{plan.fleet, KeyPair::make(KeyKind::Operator), FleetKeys::make(),
                        authority.keyText()};
    const SecretText server = serverFileFor(authority, plan.names, plan.now, plan.until);
    const CentreKey centre = certifiedCentre(keys, plan.until);
    makePrivateDirectory(plan.directory);
    insistOnRootApart(plan);  // a link may lead there only now
    writeRootFile(plan.rootFile, keys);
    const FleetDirectory directory(plan.directory);
    writeBus(plan, keys.bus, server.view(), issuedAt);
    directory.keepAuthority(authority.certificate());
    directory.keepServer(server.view());
    directory.keepBus({makeBusUser(keys.bus.control, "centre", issuedAt),
                       makeBusUser(keys.bus.system, "centre", issuedAt),
                       keys.bus.hostSigner,
                       keys.bus.accountSigner,
                       {},
                       {}});
    directory.keepCentre(centre.key);
    TrustDatabase::make(directory.trustDatabase());
    directory.keepFacts(factsOf(plan, keys, centre));
}

}  // namespace fleet
