/// top: the host at a glance, again and again.
#pragma once

#include <nlohmann/json.hpp>

#include "ctl/show/page.h"
#include "ctl/show/time_text.h"

namespace ctl {

/// What the host says of itself. What it does not say is null.
// NOLINTNEXTLINE(bugprone-exception-escape): JSON does not throw when it is moved
struct TopFacts {
    nlohmann::json health;
    nlohmann::json ready;      ///< the document of GET /v1/ready
    nlohmann::json work;       ///< tasks at work and waiting, as ps shows them
    nlohmann::json instances;  ///< see listInstances()
    nlohmann::json recent;     ///< summaries of the newest tasks
};

/// The page in at most so many lines; 0: as many as there are. Any member may be missing.
Page showTop(const TopFacts& facts, WallTime now, std::size_t lines);

}  // namespace ctl
