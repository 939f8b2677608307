// POST /v1/enrolments: a host joins, with the token of its invitation.

#include "fleet/server/api/schema.h"
#include "fleet/server/api/visit.h"
#include "fleet/server/keys/trust/host_enrolment.h"
#include "fleet/server/keys/trust/join_refused.h"
#include "fleet/server/service/store_register.h"

namespace fleet {

ApiEndpoint postEnrolment;
Schema enrolmentSchema;

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

nlohmann::ordered_json enrolmentSchema(Components&) {
    return shape::object(
        "Enrolment", "What a host needs to take part.",
        {{"name", shape::text("the host's, for people")},
         {"token", shape::text("lets the host's bus key into the bus")},
         {"bus", shape::listOf("where that is", shape::text("a URL"))},
         {"server", shape::text("the DNS name in the certificates of the bus's servers")},
         {"authority", shape::text("the certificate that vouches for those, as PEM")},
         {"centres", shape::listOf("certificates of the centre's signing keys, the newest first",
                                   shape::text("signed by the fleet's root, in base64"))}});
}

}  // namespace fleet
