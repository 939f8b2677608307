// POST /v1/enrolments: a host joins, with the token of its invitation.

#include "fleet/server/api/visit.h"
#include "fleet/server/keys/trust/host_enrolment.h"
#include "fleet/server/keys/trust/join_refused.h"
#include "fleet/server/service/store_register.h"

namespace fleet {

ApiEndpoint postEnrolment;

namespace {

/// Has the centre's thread take a host up, durably.
class AskingRegister : public HostRegister {
public:
    explicit AskingRegister(ApiServices& services) : services_(services) {}

    void enrol(const EnrolledHost& host) override {
        services_.ask([host](CentreDesk& desk) {
            StoreRegister(desk.parts.store).enrol(host);
            return true;
        });
    }

private:
    ApiServices& services_;
};

}  // namespace

http::Answer postEnrolment(Visit& visit, const Call& call) {
    ApiServices& services = visit.services;
    // Anybody may ask. Who has no token costs no more than looking for it.
    const EnrolmentRequest request = readEnrolment(call.bytes());
    const bool isInvited = services.withTrust(
        [&](sqlite::Database& database) { return HostEnrolment(database).knows(request.token); });
    if (!isInvited) throw JoinRefused();
    // The token is not taken while the host could not be taken up.
    if (!services.isWorking()) throw Unavailable("the centre does not work now; try again soon");
    AskingRegister hosts(services);
    // A connection of its own: it waits for the centre's thread, and others do not wait for it.
    TrustDatabase trust(services.directory.trustDatabase());
    const EnrolmentAnswer answer =
        HostEnrolment(trust.connection())
            .redeem(call.bytes(), services.directory, hosts, wallClock());
    return http::jsonReply(200, enrolmentAnswerText(answer));
}

}  // namespace fleet
