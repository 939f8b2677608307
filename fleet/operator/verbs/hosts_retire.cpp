// hosts retire: takes a host out of the fleet.

#include <nlohmann/json.hpp>

#include "ctl/client/http/percent_encoding.h"
#include "ctl/show/printable.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "fleet/operator/verbs/operator_side.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr ctl::Argument kRetiredHost = ctl::positional("HOST", "Its name or its key").required();
constexpr ctl::Argument kRetireArguments[] = {kRetiredHost};

std::string ordersText(std::uint64_t open) {
    if (open == 0) return {};
    return "How " + std::to_string(open) + (open == 1 ? " order" : " orders") +
           " of it ended, nobody will know.\n";
}

ctl::ExitStatus runHostsRetire(const ctl::Invocation& invocation) {
    OperatorSide side(invocation);
    const std::string& host = invocation.given.text(kRetiredHost);
    const json told =
        side.centre.post("/v1/hosts/" + ctl::percentEncoded(host) + "/retire", json::object());
    if (invocation.format == ctl::Format::Json) return ctl::print(ctl::jsonPage(told));
    return ctl::print({ctl::printable(host) +
                           " is no longer in the fleet; its key never counts again.\n" +
                           ordersText(memberNumber(told, "unknown")),
                       {}});
}

}  // namespace

constexpr ctl::Verb kHostsRetireVerb = {
    "hosts retire",
    "Take a host out of the fleet for ever",
    kRetireArguments,
    {"zavctl --fleet https://centre.example hosts retire web-1",
     "zavctl --fleet https://centre.example --json hosts retire web-1"},
    runHostsRetire,
};

}  // namespace fleet
