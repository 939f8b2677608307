/// One request to the centre, and who makes it.
#pragma once

#include <optional>
#include <stdexcept>
#include <string>

#include "fleet/server/api/api_services.h"
#include "fleet/server/api/sessions/session_proof.h"
#include "fleet/server/keys/trust/operator_grant.h"
#include "fleet/server/rollouts/rollout_records.h"
#include "routes/bad_request.h"
#include "routes/call.h"
#include "routes/route.h"

namespace fleet {

/// What its role does not let an operator do; what() is for them.
class Forbidden : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// There is no such thing; what() is for the operator.
class NothingThere : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// There is no room for more of them now; what() is for the operator.
class TooMany : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

struct Visit {
    ApiServices& services;
    // Of whoever is logged in; empty where a route needs no session.
    std::string key;
    OperatorGrant grant;
    SessionProof session{};

    RolloutOperator asOperator() const { return {grant.name, key}; }
    bool isAdmin() const { return grant.role == Role::Admin; }
};

/// The rows of the centre's route table. Access::None needs no session; Access::Read needs one, and
/// Access::Act that of an operator or an admin, which is no browser's. Endpoints throw
/// routes::BadRequest, MessageError and SelectorError (400), JoinRefused and Forbidden (403),
/// NothingThere (404), RolloutError (400, 404 or 409), BatchesFull and TooMany (429), Unavailable
/// (503), and DepotError (400, 507 or 500).
using ApiRoute = routes::Route<Visit>;
using ApiEndpoint = ApiRoute::Endpoint;

/// The key that has opened the session that the request names; nothing without one.
std::optional<std::string> sessionKey(ApiServices& services, const routes::Call& call);

using routes::Call;

}  // namespace fleet
