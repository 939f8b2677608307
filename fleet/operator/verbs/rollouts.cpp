// rollout ls, show, watch, pause: looks at roll-outs, and stops one.

#include <nlohmann/json.hpp>
#include <string>

#include "ctl/client/failure.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/verbs/invocation.h"
#include "fleet/operator/rollouts/rollout_follower.h"
#include "fleet/operator/rollouts/rollout_page.h"
#include "fleet/operator/rollouts/rollout_screen.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "fleet/operator/verbs/operator_side.h"
#include "fleet/operator/verbs/rollout_argument.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr ctl::Argument kLimit =
    ctl::numberOption("--limit", "At most so many").between(1, 100).otherwise("20");
constexpr ctl::Argument kLsArguments[] = {kLimit};
constexpr ctl::Argument kOneRollout[] = {kRollout};

constexpr std::size_t kFailuresShown = 20;

ctl::ExitStatus runLs(const ctl::Invocation& invocation) {
    OperatorSide side(invocation);
    const json answer =
        side.centre.get("/v1/rollouts?limit=" + std::to_string(invocation.given.number(kLimit)));
    return ctl::print(showRollouts(answer, std::chrono::system_clock::now(), invocation.format));
}

ctl::ExitStatus runShow(const ctl::Invocation& invocation) {
    OperatorSide side(invocation);
    const std::string id = rolloutIn(invocation.given);
    const json rollout = side.centre.get(rolloutTarget(id));
    const json failures = failuresOf(side.centre, id, kFailuresShown);
    return ctl::print(
        showRollout(rollout, failures, std::chrono::system_clock::now(), invocation.format));
}

ctl::ExitStatus runWatch(const ctl::Invocation& invocation) {
    OperatorSide side(invocation);
    return watchRollout(side.centre, rolloutIn(invocation.given), side.deadline, invocation.format);
}

ctl::ExitStatus runPause(const ctl::Invocation& invocation) {
    OperatorSide side(invocation);
    const json rollout =
        side.centre.post(rolloutTarget(rolloutIn(invocation.given)) + "/pause", json::object());
    return ctl::print(showChanged(rollout, invocation.format));
}

}  // namespace

constexpr ctl::Verb kRolloutLsVerb = {
    "rollout ls",
    "List the latest roll-outs",
    kLsArguments,
    {"zavctl --fleet https://centre.example rollout ls",
     "zavctl --fleet https://centre.example rollout ls --limit 5"},
    runLs,
};

constexpr ctl::Verb kRolloutShowVerb = {
    "rollout show",
    "Show a roll-out, its waves and where it failed",
    kOneRollout,
    {"zavctl --fleet https://centre.example rollout show ID",
     "zavctl --fleet https://centre.example --json rollout show ID"},
    runShow,
};

constexpr ctl::Verb kRolloutWatchVerb = {
    "rollout watch",
    "Follow a roll-out to its end",
    kOneRollout,
    {"zavctl --fleet https://centre.example rollout watch ID",
     "zavctl --fleet https://centre.example --timeout 600 rollout watch ID"},
    runWatch,
};

constexpr ctl::Verb kRolloutPauseVerb = {
    "rollout pause",
    "Let no more hosts get their orders for now",
    kOneRollout,
    {"zavctl --fleet https://centre.example rollout pause ID",
     "zavctl --fleet https://centre.example --json rollout pause ID"},
    runPause,
};

}  // namespace fleet
