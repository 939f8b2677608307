/// Looks on while a roll-out goes on.
#pragma once

#include <chrono>
#include <functional>
#include <nlohmann/json.hpp>
#include <set>
#include <string>

#include "ctl/client/deadline.h"
#include "fleet/operator/centre/centre.h"

namespace fleet {

/// What is told of a roll-out while it goes on. Any may be empty.
struct RolloutEvents {
    std::function<void(const nlohmann::json& rollout)> onLook;       ///< after each look
    std::function<void(const nlohmann::json& part)> onFailure;       ///< once for each order
    std::function<void(const std::string& text)> onNote;             ///< what holds the looks up
    std::function<void(std::chrono::milliseconds)> pause = nullptr;  ///< between looks
};

/// What a roll-out has come to.
struct RolloutEnd {
    nlohmann::json rollout;
    nlohmann::json failures = nlohmann::json::array();  ///< the parts that were told
};

/// The newest failures of a roll-out, at most that many.
nlohmann::json failuresOf(Centre& centre, const std::string& id, std::size_t most);

/// Follows a roll-out until nothing of it goes on by itself. A centre that goes away is waited for,
/// once it has answered. Throws ctl::Failure: kNoOutcome at the deadline, or as the centre does.
RolloutEnd followRollout(Centre& centre, const std::string& id, ctl::Deadline deadline,
                         const RolloutEvents& events);

}  // namespace fleet
