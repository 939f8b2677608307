/// Verbs that show something again and again.
#pragma once

#include <functional>
#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"
#include "ctl/show/page.h"
#include "ctl/verbs/arguments/argument.h"

namespace ctl {

struct Invocation;

/// What there is to see now.
struct Look {
    nlohmann::json seen;  ///< a page is shown again where it is no terminal if this has changed
    Page page;
};

constexpr Argument kWatch = flag("--watch", "Show it anew each second until Ctrl-C");

/// Looks each second and shows it: on a terminal in place of what was there, elsewhere below. It
/// ends with Ctrl-C, or when the time-out is over that was given. A host that is away is waited for
/// once something has been shown. Throws Failure.
ExitStatus watch(const Invocation& invocation, const std::function<Look()>& look);

}  // namespace ctl
