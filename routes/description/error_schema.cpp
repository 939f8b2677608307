// The one shape of errors, as http/reply.h makes them.

#include "routes/description/schema.h"

namespace routes {

Schema errorSchema;

nlohmann::ordered_json errorSchema(Components&) {
    return shape::object(
        "Error", "Why a request was not done.",
        {{"error", shape::text("a sentence that says what is wrong")},
         {"guard", shape::text("the guard that refused the request; none if it is not there"),
          Need::Optional},
         {"hint", shape::text("the way out, if the guard knows one"), Need::Optional}});
}

}  // namespace routes
