/// The roll-out that a verb is about.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/show/page.h"
#include "ctl/verbs/arguments/argument.h"
#include "ctl/verbs/arguments/values.h"

namespace fleet {

inline constexpr ctl::Argument kRollout =
    ctl::positional("ID", "The roll-out's identifier").required();

/// Throws ctl::Failure(kWrongUsage) if it can be none.
std::string rolloutIn(const ctl::Values& given);

std::string rolloutTarget(const std::string& id);

/// What a roll-out is after somebody has changed it.
ctl::Page showChanged(const nlohmann::json& rollout, ctl::Format format);

}  // namespace fleet
