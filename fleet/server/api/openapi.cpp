// GET /v1/openapi.json

#include "fleet/server/api/openapi.h"

#include "fleet/server/api/routes.h"
#include "fleet/server/api/statuses.h"
#include "routes/description/description.h"

namespace fleet {
namespace {

constexpr const char* kOverview =
    "What the centre of a fleet answers by HTTPS, with a certificate of the fleet's own authority. "
    "`x-access` of an operation is `none` if anybody may ask; else it needs a session, whose token "
    "goes into the field `Authorization`, after `Bearer `: any operator's if it is `read`, and one "
    "of an operator who is no viewer if it is `act`. Enrolments, logins and requests for sessions "
    "are bytes that the asking key has signed, and pieces of files are their bytes; other bodies "
    "are JSON. HEAD goes with every GET. Documents may get further members; clients pass over "
    "those "
    "that they do not know.";

}  // namespace

ApiEndpoint getCentreOpenapi;

std::string describe(const std::vector<ApiRoute>& routes) {
    routes::Interface centre{"zavfleetd",
                             ZAV_VERSION,
                             "The HTTPS interface of the centre of a fleet",
                             kOverview,
                             "https://localhost:8443",
                             "where the centre listens, which every operator's identity names",
                             centreStatusMeanings()};
    centre.statusOfStrangers = 401;
    return routes::describe(centre, routes::factsOf(routes));
}

http::Answer getCentreOpenapi(Visit&, const Call&) {
    static const std::string document = describe(apiRoutes());
    return http::Reply{200, document};
}

}  // namespace fleet
