// GET /v1/whoami

#include <nlohmann/json.hpp>

#include "host/api/call.h"
#include "host/api/services.h"
#include "host/process/system/user_name.h"

namespace host {

Endpoint getWhoami;

Answer getWhoami(Services& services, const Call& call) {
    const Peer& peer = call.peer();
    const nlohmann::ordered_json document = {
        {"user", services.codePage.toUtf8(userName(peer.user))},
        {"uid", peer.user},
        {"gid", peer.group},
        {"pid", peer.process},
        {"access", peer.access == Access::Act ? "act" : "read"},
        {"reason", services.codePage.toUtf8(peer.reason)}};
    return jsonReply(200, document.dump());
}

}  // namespace host
