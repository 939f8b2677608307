#include "fleet/server/api/api_server.h"

#include "fleet/server/api/routes.h"

namespace fleet {
namespace {

constexpr std::chrono::seconds kGrace{5};

/// Who a client is, its session tells; the connection comes from the front.
http::Door openDoor() {
    return {[](int) { return http::Peer{0, 0, 0, http::Access::Act, "the front"}; }, ""};
}

http::ServerLimits limits() {
    http::ServerLimits limits;
    limits.connections = FrontLimits{}.connections;
    limits.waitingRequests = 1024;
    return limits;
}

FrontSettings frontSettings(const FleetDirectory& directory, const ListenPlace& place) {
    return {place.address, place.port, directory.serverFile()};
}

}  // namespace

ApiServer::ApiServer(CentreService& service, const ListenPlace& place)
    : services_(service),
      api_(services_, apiRoutes()),
      server_(-1, openDoor(), api_, counts_, limits()),
      front_(frontSettings(service.directory(), place),
             [this](sys::FileDescriptor connection) { server_.adopt(std::move(connection)); }),
      thread_([this] { server_.run(); }) {}

ApiServer::~ApiServer() {
    server_.end(kGrace);
    front_.end(kGrace);
    thread_.join();
}

}  // namespace fleet
