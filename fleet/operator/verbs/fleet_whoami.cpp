#include "fleet/operator/verbs/fleet_whoami.h"

#include <nlohmann/json.hpp>
#include <string>

#include "ctl/show/printable.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "fleet/operator/verbs/operator_side.h"

using nlohmann::json;

namespace fleet {
namespace {

ctl::ExitStatus runWhoami(const ctl::Invocation& invocation) {
    OperatorSide side(invocation);
    return ctl::print(showOperator(side.centre.get("/v1/whoami"), invocation.format));
}

std::string joinedTexts(const json& list) {
    std::string text;
    for (const json& word : list) {
        if (word.is_string()) text += (text.empty() ? "" : ", ") + word.get<std::string>();
    }
    return ctl::printable(text);
}

}  // namespace

constexpr ctl::Verb kFleetWhoamiVerb = {
    "whoami",
    "Show who you are to the centre, and what you may do",
    {},
    {"zavctl --fleet https://centre.example whoami",
     "zavctl --fleet https://centre.example --json whoami"},
    runWhoami,
};

ctl::Page showOperator(const json& answer, ctl::Format format) {
    const std::string name = memberText(answer, "operator");
    if (name.empty()) throw senseless("it does not say who you are");
    const std::string commands = joinedTexts(memberList(answer, "commands"));
    const std::string products = joinedTexts(memberList(answer, "products"));
    if (format == ctl::Format::Json) return ctl::jsonPage(answer);
    ctl::Page page;
    page.out = "You are " + ctl::printable(name) + ", " +
               ctl::printable(memberText(answer, "role")) + " in the fleet " +
               ctl::printable(memberText(answer, "fleet")) + ".\n";
    const std::string selector = ctl::printable(memberText(answer, "selector"));
    page.out += commands.empty() ? "You may look at the hosts " + selector + ".\n"
                                 : "You may " + commands + " for " + products + " on the hosts " +
                                       selector + ".\n";
    return page;
}

}  // namespace fleet
