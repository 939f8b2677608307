/// What a verb receives when it runs.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "ctl/client/deadline.h"
#include "ctl/client/host_address.h"
#include "ctl/show/page.h"
#include "ctl/verbs/values.h"

namespace ctl {

struct Invocation {
    Values given;  ///< of the verb's own arguments and the global ones
    HostAddress host;
    Format format = Format::Text;
    /// The help for a verb, named by its words; for the whole program if there are none. Throws
    /// Failure(kWrongUsage) when there is no such verb.
    std::function<std::string(const std::vector<std::string>& verb)> helpOf;

    /// When the command is to be over, counted from now.
    Deadline deadline() const { return deadlineIn(host.timeout); }
};

}  // namespace ctl
