/// What a verb receives when it runs.
#pragma once

#include "ctl/client/address/host_address.h"
#include "ctl/client/deadline.h"
#include "ctl/show/page.h"
#include "ctl/verbs/arguments/values.h"

namespace ctl {

struct Invocation {
    Values given;  ///< of the verb's own arguments and the global ones
    HostAddress host;
    Format format = Format::Text;

    /// When the command is to be over, counted from now.
    Deadline deadline() const { return deadlineIn(host.timeout); }
};

}  // namespace ctl
