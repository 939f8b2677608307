// GET /v1/whoami: who one is to the centre.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/schema.h"
#include "fleet/server/api/visit.h"

namespace fleet {

ApiEndpoint getOperator;
Schema operatorSchema;

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

nlohmann::ordered_json roleSchema(Components&) {
    nlohmann::ordered_json role =
        shape::oneOf("What an operator may do.",
                     {textOf(Role::Viewer), textOf(Role::Operator), textOf(Role::Admin)});
    role["title"] = "Role";
    return role;
}

nlohmann::ordered_json operatorSchema(Components& components) {
    return shape::object(
        "Operator", "Who one is to the centre, as the fleet's root has certified it.",
        {{"operator", shape::text("the name")},
         {"key", shape::text("the public key that signs the operator's orders")},
         {"role", components.ref(roleSchema)},
         {"commands", shape::listOf("what the operator may ask hosts for; empty: everything",
                                    shape::text("a command"))},
         {"products",
          shape::listOf("and for which products; empty: all", shape::text("a product's code"))},
         {"selector", shape::text("the hosts that the operator sees and may ask")},
         {"fleet", shape::text("the fleet's name")}});
}

}  // namespace fleet
