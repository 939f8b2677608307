#include "ctl/verbs/host/version.h"

#include <algorithm>
#include <chrono>
#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"
#include "ctl/client/host_client.h"
#include "ctl/client/row.h"
#include "ctl/show/printable.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

/// The program's own version is what was asked for, so a host that hangs is not waited for long.
constexpr std::chrono::seconds kPatience{2};

json healthIfAnyAnswers(const Invocation& invocation) {
    const Deadline deadline = std::min(invocation.deadline(), deadlineIn(kPatience));
    try {
        return HostClient(invocation.host.socket).get("/v1/health", deadline);
    } catch (const Failure&) {
        return nullptr;
    }
}

ExitStatus run(const Invocation& invocation) {
    return print(
        showVersion(healthIfAnyAnswers(invocation), invocation.host.socket, invocation.format));
}

}  // namespace

constexpr Verb kVersionVerb = {
    "version", "Print the versions of this program and of the host",
    {},        {"zavctl version", "zavctl --socket /run/zavhost.sock --version"},
    run,
};

Page showVersion(const json& health, const std::string& socket, Format format) {
    const std::string host = textOf(health, "version");
    if (format == Format::Json) {
        return jsonPage({{"zavctl", ZAV_VERSION}, {"zavhost", host.empty() ? json() : json(host)}});
    }
    Page page{"zavctl " ZAV_VERSION "\n", {}};
    if (!host.empty()) page.out += "zavhost " + printable(host) + " at " + socket + "\n";
    return page;
}

}  // namespace ctl
