// GET /v1/health

#include <nlohmann/json.hpp>

#include "host/api/route.h"
#include "host/api/services.h"
#include "host/process/version.h"

namespace host {

Endpoint getHealth;

Answer getHealth(Services& services, const Call&) {
    using std::chrono::duration_cast;
    const auto uptime = std::chrono::steady_clock::now() - services.started;
    const nlohmann::ordered_json document = {
        {"version", kVersion},
        {"width", static_cast<int>(sizeof(void*) * 8)},
        {"home", services.codePage.toUtf8(services.home)},
        {"origin_node", services.codePage.toUtf8(oxa::originNode())},
        {"uptime_seconds", duration_cast<std::chrono::seconds>(uptime).count()},
        {"subscriptions", services.counts.streams.load()},
        {"guarded", services.guarded},
        {"journal", services.journal.identity()}};
    return jsonReply(200, document.dump());
}

}  // namespace host
