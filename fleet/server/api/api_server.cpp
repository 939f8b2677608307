#include "fleet/server/api/api_server.h"

#include <utility>

#include "fleet/server/api/routes.h"

namespace fleet {
namespace {

constexpr std::chrono::seconds kGrace{5};
/// Who takes nothing for so long reads no more; it can come again where it was.
constexpr std::chrono::seconds kStreamTime{30};

/// Who a client is, its session tells; the connection comes from the front.
http::Door openDoor() {
    return {[](int) { return http::Peer{0, 0, 0, http::Access::Act, "the front"}; }, ""};
}

http::ServerLimits limits() {
    http::ServerLimits limits;
    limits.connections = FrontLimits{}.connections;
    limits.waitingRequests = 1024;
    limits.streamTime = kStreamTime;
    return limits;
}

FrontSettings frontSettings(const FleetDirectory& directory, const ListenPlace& place) {
    return {place.address, place.port, directory.serverFile()};
}

}  // namespace

ApiServer::ApiServer(CentreService& service, const ListenPlace& place,
                     std::vector<console::PageFile> page)
    : service_(service),
      services_(service, !page.empty()),
      api_(services_, apiRoutes()),
      console_(page.empty() ? nullptr
                            : std::make_unique<CentreConsole>(services_, api_, std::move(page))),
      server_(-1, openDoor(), console_ ? static_cast<http::Handler&>(*console_) : api_, counts_,
              limits()),
      front_(frontSettings(service.directory(), place),
             [this](sys::FileDescriptor connection) { server_.adopt(std::move(connection)); }),
      thread_([this] { server_.run(); }) {}

ApiServer::~ApiServer() {
    server_.end(kGrace);
    front_.end(kGrace);
    thread_.join();
}

}  // namespace fleet
