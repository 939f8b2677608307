/// The host's interface: the application behind its HTTP server.
#pragma once

#include <vector>

#include "host/api/route.h"
#include "http/handler.h"
#include "routes/router.h"

namespace host {

class Api final : public http::Handler {
public:
    /// The services outlive this object.
    Api(Services& services, std::vector<Route> routes);

    std::variant<http::Answer, http::Job> handle(http::Request request) override;
    void prepareForEnd() override;
    bool quiet() const override;

    const routes::Router& router() const { return router_; }

private:
    Services& services_;
    const std::vector<Route> rows_;
    const routes::Router router_;
};

}  // namespace host
