// POST /v1/sessions: an operator's key opens a session.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/visit.h"

namespace fleet {

ApiEndpoint postSession;

http::Answer postSession(Visit& visit, const Call& call) {
    ApiServices& services = visit.services;
    const SessionRequest request = readSessionRequest(call.bytes());
    const Moment now = ApiServices::now();
    if (request.fleet != services.facts.fleet || request.url != services.facts.url) {
        throw Forbidden("the request is for another centre: this is " + services.facts.url +
                        " of the fleet " + services.facts.fleet);
    }
    const auto grant = services.withTrust(
        [&](sqlite::Database& database) { return Operators(database).grantOf(request.key, now); });
    if (!grant) throw Forbidden("this key is not certified, was revoked, or is over");
    const auto opened = services.sessions.open(request, now);
    if (!opened) {
        throw Forbidden(
            "the request came before, is one of too many, or one of the two clocks is "
            "wrong; here it is " +
            timeOfDocument(now));
    }
    return http::jsonReply(200, textOf({{"session", opened->token},
                                        {"expires", timeOfDocument(opened->expires)},
                                        {"operator", grant->name},
                                        {"role", textOf(grant->role)}}));
}

}  // namespace fleet
