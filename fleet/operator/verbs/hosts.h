/// hosts: lists the hosts of a fleet; hosts show: all about one.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/show/page.h"
#include "ctl/show/time_text.h"

namespace fleet {

/// What holds a host up, or is odd about it; empty if nothing.
std::string troubleOf(const nlohmann::json& host);

/// A line for each of the hosts' documents.
ctl::Page showHosts(const nlohmann::json& hosts, ctl::WallTime now, ctl::Format format);

/// A host's document and its latest orders, {"orders": [...]}.
ctl::Page showHost(const nlohmann::json& host, const nlohmann::json& orders, ctl::WallTime now,
                   ctl::Format format);

}  // namespace fleet
