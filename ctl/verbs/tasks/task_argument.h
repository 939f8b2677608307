/// The task that a verb is about.
#pragma once

#include "ctl/verbs/arguments/argument.h"

namespace ctl {

constexpr Argument kTask =
    positional("ID", "Transaction identifier, or the host's own identifier of the task")
        .required()
        .completedBy(Completion::Transaction);

}  // namespace ctl
