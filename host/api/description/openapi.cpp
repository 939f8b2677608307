// GET /v1/openapi.json

#include "host/api/call.h"
#include "host/api/description/description.h"
#include "host/api/description/schema.h"
#include "host/api/routes.h"

namespace host {

Endpoint getOpenapi;
Schema descriptionSchema;

http::Answer getOpenapi(Services&, const Call&) {
    static const std::string document = describe(routes());
    return http::Reply{200, document};
}

nlohmann::ordered_json descriptionSchema(Components&) {
    const nlohmann::ordered_json object = {{"type", "object"}};
    return shape::object(
        "Description", "An OpenAPI document.",
        {{"openapi", shape::text("the version of OpenAPI, 3.1.0")},
         {"info", shape::about("what is described, and its version", object)},
         {"servers", shape::listOf("where the host is", object)},
         {"paths", shape::about("the requests by their paths", object)},
         {"components", shape::about("what several requests have in common", object)}});
}

}  // namespace host
