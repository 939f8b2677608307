#include "ctl/client/guarded.h"

#include "ctl/client/host_client.h"

namespace ctl {

bool isGuarded(const HostAddress& host, Deadline deadline) {
    const nlohmann::json health = HostClient(host.socket).getIfThere("/v1/health", deadline);
    const auto guarded = health.find("guarded");
    return guarded == health.end() || *guarded != false;
}

}  // namespace ctl
