/// The centre's interface: the application behind its HTTPS server.
#pragma once

#include <vector>

#include "fleet/server/api/visit.h"
#include "http/handler.h"
#include "routes/route_table.h"

namespace fleet {

/// Nothing that comes changes anything unless it is signed, belongs to an invitation, or comes with
/// a session. Endpoints run on worker threads, because they may wait for the centre's.
class CentreApi final : public http::Handler {
public:
    /// The services outlive this object.
    CentreApi(ApiServices& services, std::vector<ApiRoute> routes);

    std::variant<http::Answer, http::Job> handle(http::Request request) override;
    void prepareForEnd() override {}
    bool quiet() const override { return true; }

private:
    ApiServices& services_;
    const routes::RouteTable<Visit> table_;
};

}  // namespace fleet
