// POST /v1/sessions: the key of an operator, or that with which a host signs, opens a session.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/schema.h"
#include "fleet/server/api/visit.h"

using nlohmann::json;

namespace fleet {

ApiEndpoint postSession;
Schema sessionSchema;

namespace {

/// Whose session it is.
json holderOf(const ApiServices& services, const std::optional<OperatorGrant>& grant,
              const std::string& host) {
    if (grant) return {{"operator", grant->name}, {"role", textOf(grant->role)}};
    return {{"fleet", services.facts.fleet}, {"host", host}};
}

}  // namespace

http::Answer postSession(Visit& visit, const Call& call) {
    ApiServices& services = visit.services;
    const SessionRequest request = readSessionRequest(call.bytes());
    const Moment now = wallClock();
    if (request.fleet != services.facts.fleet || request.url != services.facts.url) {
        throw Forbidden("the request is for another centre: this is " + services.facts.url +
                        " of the fleet " + services.facts.fleet);
    }
    const auto grant = services.withTrust(
        [&](sqlite::Database& database) { return Operators(database).grantOf(request.key, now); });
    const std::string host = grant ? "" : services.hostSigningWith(request.key);
    if (!grant && host.empty()) {
        throw Forbidden("this key is not certified, was revoked, or is over");
    }
    const auto opened = services.sessions.open(request, now);
    if (!opened) {
        throw Forbidden(
            "the request came before, is one of too many, or one of the two clocks is "
            "wrong; here it is " +
            timeOfDocument(now));
    }
    services.counts.openedSessions.add();
    json document = holderOf(services, grant, host);
    document["session"] = opened->token;
    document["expires"] = timeOfDocument(opened->expires);
    return http::jsonReply(200, textOf(document));
}

nlohmann::ordered_json sessionSchema(Components& components) {
    return shape::object(
        "Session", "A session of an operator, or of a host.",
        {{"session", shape::text("the token for the field Authorization, after \"Bearer \"")},
         {"expires", shape::about("when the session ends", components.ref(timeSchema))},
         {"operator", shape::text("of an operator: the name"), Need::Optional},
         {"role", shape::about("of an operator", components.ref(roleSchema)), Need::Optional},
         {"fleet", shape::text("of a host: the fleet's name"), Need::Optional},
         {"host", shape::text("of a host: its bus key"), Need::Optional}});
}

}  // namespace fleet
