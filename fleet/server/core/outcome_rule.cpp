#include "fleet/server/core/outcome_rule.h"

namespace fleet {

OutcomeVerdict judgeOutcome(const std::optional<Outcome>& known, const Outcome& told) {
    if (!known) return OutcomeVerdict::Keep;
    if (told.state == kUnknown) return OutcomeVerdict::Ignore;
    if (known->state == kUnknown) return OutcomeVerdict::Keep;
    return saySame(*known, told) ? OutcomeVerdict::Ignore : OutcomeVerdict::Conflict;
}

}  // namespace fleet
