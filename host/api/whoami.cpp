// GET /v1/whoami

#include <nlohmann/json.hpp>

#include "host/api/route.h"
#include "host/api/schema.h"
#include "host/api/services.h"
#include "host/process/system/user_name.h"

namespace host {

Endpoint getWhoami;
Schema whoamiSchema;

http::Answer getWhoami(Services& services, const Call& call) {
    const http::Peer& peer = call.peer();
    const nlohmann::ordered_json document = {
        {"user", services.codePage.toUtf8(userName(peer.user))},
        {"uid", peer.user},
        {"gid", peer.group},
        {"pid", peer.process},
        {"access", peer.access == http::Access::Act ? "act" : "read"},
        {"reason", services.codePage.toUtf8(peer.reason)}};
    return http::jsonReply(200, document.dump());
}

nlohmann::ordered_json whoamiSchema(Components&) {
    return shape::object(
        "Whoami", "Who a client is to the host, as the kernel knows it.",
        {{"user", shape::text("the user's name, or number if there is no name")},
         {"uid", shape::wholeNumber("the user")},
         {"gid", shape::wholeNumber("the group")},
         {"pid", shape::wholeNumber("the process that opened the connection")},
         {"access", shape::oneOf("what the client may do", {"act", "read"})},
         {"reason", shape::text("what gives it to him: root, the host's own user or a group")}});
}

}  // namespace host
