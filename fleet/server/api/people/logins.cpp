// POST /v1/logins: an operator's key waits for the root, or gets what that has signed.

#include "fleet/server/api/visit.h"

namespace fleet {

ApiEndpoint postLogin;

http::Answer postLogin(Visit& visit, const Call& call) {
    const FleetFacts facts = visit.services.directory.facts();  // keys may have been rotated
    const LoginAnswer answer = visit.services.withTrust([&](sqlite::Database& database) {
        return Operators(database).login(call.bytes(), facts, wallClock());
    });
    return http::jsonReply(200, loginAnswerText(answer));
}

}  // namespace fleet
