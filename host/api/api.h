/// The host's interface: the application behind its HTTP server.
#pragma once

#include <vector>

#include "host/api/route.h"
#include "http/handler.h"
#include "routes/route_table.h"

namespace host {

class Api final : public http::Handler {
public:
    /// The services outlive this object.
    Api(Services& services, std::vector<Route> routes);

    std::variant<http::Answer, http::Job> handle(http::Request request) override;
    void prepareForEnd() override;
    bool quiet() const override;

    const routes::Router& router() const { return table_.router(); }

private:
    Services& services_;
    const routes::RouteTable<Services> table_;
};

}  // namespace host
