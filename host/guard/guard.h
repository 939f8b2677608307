/// One guard: what may hold a request for a command back, or mend it, before the plug-in sees it.
#pragma once

#include "host/guard/command_request.h"
#include "host/guard/machine/machine.h"

namespace host {

/// What a guard looks at.
enum class Asks {
    Request,  ///< the request, and nothing that tasks that wait may change
    Machine,  ///< what is there now; tasks that wait may still change it
};

struct Guard {
    const char* name;  ///< as the guards' page lists it
    Asks asks;
    /// Throws Refusal, or lets the request pass, changed if that makes it what was meant.
    void (*check)(CommandRequest& request, Machine& machine);
};

}  // namespace host
