#include "fleet/operator/verbs/rollout_argument.h"

#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"
#include "ctl/show/printable.h"
#include "fleet/bus/messages/order.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/rollouts/rollout_page.h"

namespace fleet {

std::string rolloutIn(const ctl::Values& given) {
    const std::string& id = given.text(kRollout);
    if (isOrderId(id)) return id;
    throw ctl::Failure(ctl::kWrongUsage,
                       "\"" + ctl::printable(id) + "\" is no roll-out's identifier",
                       "zavctl rollout ls lists those of the latest.");
}

std::string rolloutTarget(const std::string& id) {
    return "/v1/rollouts/" + id;
}

ctl::Page showChanged(const nlohmann::json& rollout, ctl::Format format) {
    if (format == ctl::Format::Json) return ctl::jsonPage(rollout);
    ctl::Page page;
    page.out = "The roll-out is " + ctl::printable(memberText(rollout, "state")) + ".\n" +
               progressText(rollout) + "\n";
    return page;
}

}  // namespace fleet
