#include "fleet/server/core/outcome_rule.h"

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"

namespace fleet {
namespace {

/// The host's identifier of the task; "" if there is none.
std::string taskOf(const Outcome& outcome) {
    try {
        return outcome.task.empty() ? "" : textIn(readDocument(outcome.task), "id");
    } catch (const MessageError&) {
        return "";
    }
}

/// Whether both tell of the same end. The rest of a task's document changes: a host keeps outputs
/// for a while only, masks passwords in what it repeats, and learns later how far a task came that
/// was interrupted.
bool tellTheSame(const Outcome& a, const Outcome& b) {
    return a.journal == b.journal && a.state == b.state && taskOf(a) == taskOf(b);
}

}  // namespace

OutcomeVerdict judgeOutcome(const std::optional<Outcome>& known, const Outcome& told) {
    if (!known) return OutcomeVerdict::Keep;
    if (told.state == kUnknown) return OutcomeVerdict::Ignore;
    if (known->state == kUnknown) return OutcomeVerdict::Keep;
    return tellTheSame(*known, told) ? OutcomeVerdict::Ignore : OutcomeVerdict::Conflict;
}

}  // namespace fleet
