/// The centre's interface: the application behind its HTTPS server.
#pragma once

#include <vector>

#include "fleet/server/api/events/fleet_watch.h"
#include "fleet/server/api/visit.h"
#include "http/handler.h"
#include "routes/route_table.h"

namespace fleet {

/// Nothing that comes changes anything unless it is signed, belongs to an invitation, or comes with
/// a session that an operator's key has opened. Endpoints run on worker threads, because they may
/// wait for the centre's.
class CentreApi final : public http::Handler {
public:
    /// The services outlive this object.
    CentreApi(ApiServices& services, std::vector<ApiRoute> routes);

    std::variant<http::Answer, http::Job> handle(http::Request request) override;
    /// The same for a browser in the session of this token, which may only read. Whatever else the
    /// request says about who makes it counts nothing. I/O thread.
    std::variant<http::Answer, http::Job> handleForBrowser(http::Request request,
                                                           std::string token);
    void prepareForEnd() override {}
    bool quiet() const override { return true; }

private:
    std::variant<http::Answer, http::Job> dispatch(http::Request request, SessionProof proof);

    ApiServices& services_;
    const routes::RouteTable<Visit> table_;
    FleetWatch watch_;
};

}  // namespace fleet
