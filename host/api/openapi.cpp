// GET /v1/openapi.json

#include "host/api/openapi.h"

#include "host/api/routes.h"
#include "host/api/statuses.h"
#include "host/process/version.h"
#include "routes/description/description.h"

namespace host {
namespace {

constexpr const char* kOverview =
    "What a host answers on its Unix socket. Who may ask for what depends on the user and the "
    "groups of the client's process, which the kernel tells the host; `x-access` of an operation "
    "is `read` or `act`. HEAD goes with every GET. Documents may get further members; clients pass "
    "over those that they do not know.";

}  // namespace

Endpoint getOpenapi;

std::string describe(const std::vector<Route>& routes) {
    const routes::Interface host{"zavhost",
                                 kVersion,
                                 "The HTTP interface of a host that manages monitoring agents",
                                 kOverview,
                                 "http://localhost",
                                 "on the Unix socket that zavhost --socket names",
                                 statusMeanings(),
                                 "journal",
                                 412};
    return routes::describe(host, routes::factsOf(routes));
}

http::Answer getOpenapi(Services&, const Call&) {
    static const std::string document = describe(routes());
    return http::Reply{200, document};
}

}  // namespace host
