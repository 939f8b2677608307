// POST /v1/logins: an operator's key waits for the root, or gets what that has signed.

#include "fleet/server/api/schema.h"
#include "fleet/server/api/visit.h"

namespace fleet {

ApiEndpoint postLogin;
Schema loginSchema;

http::Answer postLogin(Visit& visit, const Call& call) {
    const FleetFacts facts = visit.services.directory.facts();  // keys may have been rotated
    const LoginAnswer answer = visit.services.withTrust([&](sqlite::Database& database) {
        return Operators(database).login(call.bytes(), facts, wallClock());
    });
    return http::jsonReply(200, loginAnswerText(answer));
}

nlohmann::ordered_json loginSchema(Components&) {
    return shape::object(
        "Login", "What an operator's key needs to take part.",
        {{"certificate", shape::text("in base64; not there before the fleet's root has signed it"),
          Need::Optional},
         {"centres", shape::listOf("certificates of the centre's signing keys, the newest first",
                                   shape::text("signed by the fleet's root, in base64"))}});
}

}  // namespace fleet
