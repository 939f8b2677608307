/// Verbs of one host on many of them: a roll-out.
#pragma once

#include <functional>
#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/show/page.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb.h"
#include "fleet/operator/centre/centre.h"
#include "fleet/operator/orders/order_maker.h"

namespace fleet {

/// The members of a new roll-out that the options give. Throws ctl::Failure(kWrongUsage).
nlohmann::json planOf(const ctl::Values& given);

/// What --dry-run shows. `lasting` is how long the orders would be good for.
ctl::Page showDryRun(const Choice& choice, const Work& work, const nlohmann::json& plan,
                     Moment lasting, ctl::Format format);

/// Signs an order for each host of the choice and makes a roll-out of them. Returns its document.
/// Throws ctl::Failure; a centre that was lost meanwhile is asked whether it has the roll-out.
nlohmann::json beginRollout(Centre& centre, const Choice& choice, const Work& work,
                            const nlohmann::json& plan, const OrderMaker& maker,
                            const std::string& id);

/// Called before any order is made: brings what the work needs to the centre.
using BringFiles = std::function<void(Centre& centre)>;

/// Has the hosts of --on do some work, and waits for the end. `isAwaited`: false returns when the
/// roll-out has begun. For the thread of main() alone.
ctl::ExitStatus runWork(const Work& work, const ctl::Invocation& invocation, bool isAwaited,
                        const BringFiles& bringFiles = {});

/// Does what the verb does, on the hosts of --on, and waits for the end. The verb has a requestOf.
/// For the thread of main() alone.
ctl::ExitStatus runOnMany(const ctl::Verb& verb, const ctl::Invocation& invocation);

}  // namespace fleet
