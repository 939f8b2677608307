/// The host's HTTP interface in the words of a link's decisions.
#pragma once

#include <optional>
#include <string>

#include "fleet/link/core/actions.h"
#include "fleet/link/core/answers.h"

namespace fleet {

/// What the host answered to a request.
struct HostAnswer {
    unsigned status = 0;  ///< of HTTP
    std::string body;
};

/// The body of the POST /v1/tasks that hands an order over. The same order gives the same bytes
/// each time, so that the host knows a repetition.
std::string bodyOf(const HandOver& action);
/// The one that records an order that never runs. Of what it asked for it tells command and product
/// only, or nothing: what a host refuses to read it refuses to record, too.
std::string bodyOf(const EnterEnd& action);
std::string bareBodyOf(const EnterEnd& action);

/// What became of such a request; nothing if another task of this name may have been meant: then
/// recordOf() tells, from the answer to GET /v1/tasks/{order}.
std::optional<HandOverAnswer> recordedBy(const HostAnswer& answer);
HandOverAnswer recordOf(const HostAnswer& task, const HostAnswer& refusal);

/// What became of POST /v1/tasks/{order}/cancel; nothing if the task was over: then cancelledOf()
/// tells whether an earlier cancel has ended it.
std::optional<CancelAnswer> cancelledBy(const HostAnswer& answer);
CancelAnswer cancelledOf(const HostAnswer& task, const HostAnswer& refusal);

/// What GET /v1/tasks/{order} says, of this journal.
LookUpAnswer lookUpOf(const HostAnswer& task, const std::string& order, const std::string& journal);

/// The outcome that the host's document of a task tells; nothing while the task is not over, or if
/// it is none of the fleet's orders.
std::optional<Outcome> outcomeOf(const std::string& task, const std::string& journal);

}  // namespace fleet
