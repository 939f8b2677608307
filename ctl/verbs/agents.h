/// agents: the products that are installed on the host.
#pragma once

#include <nlohmann/json.hpp>
#include <string>

#include "ctl/client/host_client.h"
#include "ctl/show/page.h"

namespace ctl {

struct Invocation;

/// What is installed, and what of it runs.
struct Agents {
    QueryAnswer inventory;  ///< rows of the table KINAGT, and what went wrong while they were made
    nlohmann::json instances = nullptr;  ///< see listInstances()
    std::string doubt{};                 ///< why it is not known what runs; "" if it is
};

Agents askAgents(const Invocation& invocation);
/// An inventory that could not be taken is a failure, whatever rows there are. Instances that are
/// not known are a note.
Page showAgents(const Agents& agents, Format format);

}  // namespace ctl
