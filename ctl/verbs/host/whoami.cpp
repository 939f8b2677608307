#include "ctl/verbs/host/whoami.h"

#include <nlohmann/json.hpp>
#include <string>

#include "ctl/client/host_client.h"
#include "ctl/show/printable.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

ExitStatus run(const Invocation& invocation) {
    const HostClient client(invocation.host.socket);
    return print(showWhoami(client.get("/v1/whoami", invocation.deadline()), invocation.format));
}

std::string textOf(const json& answer, const char* member) {
    const auto found = answer.is_object() ? answer.find(member) : answer.end();
    if (found == answer.end() || !found->is_string()) {
        throw Failure(kNoHost, "the host's answer does not say who you are");
    }
    return printable(found->get_ref<const std::string&>());
}

}  // namespace

constexpr Verb kWhoamiVerb = {
    "whoami", "Show who you are to the host, and what you may do",
    {},       {"zavctl whoami", "zavctl --json whoami"},
    run,
};

Page showWhoami(const json& answer, Format format) {
    const std::string user = textOf(answer, "user");
    const std::string reason = textOf(answer, "reason");
    const bool acts = textOf(answer, "access") == "act";
    if (format == Format::Json) return jsonPage(answer);
    Page page;
    page.out = "You are " + user + " and may " + (acts ? "do everything" : "only read") +
               ", because you are " + reason + ".\n";
    return page;
}

}  // namespace ctl
