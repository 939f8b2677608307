#include "ctl/verbs/status.h"

#include <nlohmann/json.hpp>

#include "ctl/client/host_client.h"
#include "ctl/show/table.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

ExitStatus run(const Invocation& invocation) {
    return print(showStatus(askStatus(invocation), invocation.format));
}

}  // namespace

constexpr Verb kStatusVerb = {
    "status", "Show how the host is", {}, {"zavctl status", "zavctl --json --timeout 5 status"},
    run,
};

json askStatus(const Invocation& invocation) {
    return HostClient(invocation.host.socket).get("/v1/health", invocation.deadline());
}

Page showStatus(const json& health, Format format) {
    if (format == Format::Json) return jsonPage(health);
    return {recordsText(json::array({health})), {}};
}

}  // namespace ctl
