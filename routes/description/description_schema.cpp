// What a description looks like itself.

#include "routes/description/description.h"
#include "routes/description/schema.h"

namespace routes {

nlohmann::ordered_json descriptionSchema(Components&) {
    const nlohmann::ordered_json object = {{"type", "object"}};
    return shape::object(
        "Description", "An OpenAPI document.",
        {{"openapi", shape::text("the version of OpenAPI, 3.1.0")},
         {"info", shape::about("what is described, and its version", object)},
         {"servers", shape::listOf("where it is", object)},
         {"paths", shape::about("the requests by their paths", object)},
         {"components", shape::about("what several requests have in common", object)}});
}

}  // namespace routes
