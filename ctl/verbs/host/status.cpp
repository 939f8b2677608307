#include "ctl/verbs/host/status.h"

#include <chrono>
#include <cstdint>
#include <nlohmann/json.hpp>
#include <string>

#include "ctl/client/host_client.h"
#include "ctl/show/table.h"
#include "ctl/show/time_text.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

/// Empty if there are none.
std::string textsOf(const json& reasons) {
    std::string texts;
    for (const json& reason : reasons) {
        const auto text = reason.is_object() ? reason.find("text") : reason.end();
        if (text == reason.end() || !text->is_string()) continue;
        texts += (texts.empty() ? "" : "; ") + text->get<std::string>();
    }
    return texts;
}

/// The document for people: how long the host has been there, in place of its seconds, and why it
/// is not alive, as one text.
json readable(json health) {
    const std::string reasons = textsOf(health.value("reasons", json::array()));
    health.erase("reasons");
    if (!reasons.empty()) health["reasons"] = reasons;
    const auto uptime = health.find("uptime_seconds");
    if (uptime == health.end() || !uptime->is_number_integer()) return health;
    const std::chrono::seconds span(uptime->get<std::int64_t>());
    health.erase(uptime);
    health["uptime"] = spanText(span);
    return health;
}

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
    if (!health.is_object()) throw Failure(kNoHost, "the host's answer does not say how it is");
    if (format == Format::Json) return jsonPage(health);
    return {recordsText(json::array({readable(health)})), {}};
}

}  // namespace ctl
