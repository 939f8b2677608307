/// The centre's interface: the application behind its HTTPS server.
#pragma once

#include <vector>

#include "fleet/server/api/visit.h"
#include "http/handler.h"
#include "routes/router.h"

namespace fleet {

/// Nothing that comes changes anything unless it is signed, belongs to an invitation, or comes with
/// a session. Every endpoint runs on a worker thread, because it may wait for the centre's.
class CentreApi final : public http::Handler {
public:
    /// The services outlive this object.
    CentreApi(ApiServices& services, std::vector<ApiRoute> routes);

    std::variant<http::Answer, http::Job> handle(http::Request request) override;
    void prepareForEnd() override {}
    bool quiet() const override { return true; }

    const routes::Router& router() const { return router_; }

private:
    ApiServices& services_;
    const std::vector<ApiRoute> rows_;
    const routes::Router router_;
};

}  // namespace fleet
