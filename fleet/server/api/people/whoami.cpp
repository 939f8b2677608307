// GET /v1/whoami: who one is to the centre.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/visit.h"

namespace fleet {

ApiEndpoint getOperator;

http::Answer getOperator(Visit& visit, const Call&) {
    const OperatorGrant& grant = visit.grant;
    return http::jsonReply(200, textOf({{"operator", grant.name},
                                        {"key", visit.key},
                                        {"role", textOf(grant.role)},
                                        {"commands", grant.commands},
                                        {"products", grant.products},
                                        {"selector", grant.selector},
                                        {"fleet", visit.services.facts.fleet}}));
}

}  // namespace fleet
