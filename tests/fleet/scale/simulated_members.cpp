#include "tests/fleet/scale/simulated_members.h"

#include "fleet/bus/messages/enrolment.h"
#include "fleet/bus/messages/invitation.h"
#include "fleet/files/files.h"
#include "fleet/link/enrol/enrolled_configuration.h"
#include "fleet/link/program/machine.h"
#include "fleet/server/commands/invitation_line.h"
#include "fleet/server/keys/trust/host_enrolment.h"
#include "fleet/server/keys/trust/trust_database.h"
#include "sqlite/transaction.h"

namespace fleet_scale {
namespace {

using fleet::KeyKind;
using fleet::KeyPair;

/// The centre tells its own database at its start.
class NoRegister : public fleet::HostRegister {
public:
    void enrol(const fleet::EnrolledHost&) override {}
};

}  // namespace

std::vector<SimulatedMember> enrolSimulated(const fleet::FleetDirectory& directory,
                                            std::size_t count, const std::string& state) {
    fleet::TrustDatabase trust(directory.trustDatabase());
    fleet::HostEnrolment enrolment(trust.connection());
    const std::string fleet = directory.facts().fleet;
    const fleet::Moment now = fleet::wallClock();
    NoRegister nobody;
    std::vector<SimulatedMember> members;
    members.reserve(count);
    sqlite::Transaction all(trust.connection());
    for (std::size_t i = 0; i < count; ++i) {
        fleet::HostInvitation invited;
        invited.name = "sim-" + std::to_string(i + 1);
        const std::string token = enrolment.invite(invited, now);
        SimulatedMember member{KeyPair::make(KeyKind::User), KeyPair::make(KeyKind::User), "", {}};
        const std::string key = member.bus.publicKey();
        const std::string request = signEnrolment(
            {fleet, token, key, member.signing.publicKey(), fleet::machineIdentity(key)},
            member.bus, member.signing);
        const fleet::EnrolmentAnswer answer = enrolment.redeem(request, directory, nobody, now);
        member.token = answer.userToken;
        member.configuration.state = state;
        member.configuration.ca = directory.authorityFile();
        member.configuration.labels = {{"env", "test"}};
        fleet::adoptAnswer(member.configuration,
                           fleet::readInvitation(fleet::invitationLine(directory, token)), answer,
                           now);
        // No order of theirs has files.
        member.configuration.url.clear();
        members.push_back(std::move(member));
    }
    all.commit();
    return members;
}

}  // namespace fleet_scale
