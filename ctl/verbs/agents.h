/// agents: the products that are installed on the host.
#pragma once

#include "ctl/client/host_client.h"
#include "ctl/show/page.h"

namespace ctl {

struct Invocation;

/// Rows of the table KINAGT, with what went wrong while they were collected.
QueryAnswer askAgents(const Invocation& invocation);
/// An inventory that could not be taken is a failure, whatever rows there are.
Page showAgents(const QueryAnswer& answer, Format format);

}  // namespace ctl
