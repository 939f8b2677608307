#include "fleet/server/rollouts/end_states.h"

namespace fleet {

bool isFailure(const EndState& end) {
    return end != kDone && end != kCancelled && end != kExpired;
}

bool mayTryAgain(const EndState& end, bool isForced) {
    if (end == kDone || end == kCancelled) return false;
    return end != kUnknown || isForced;
}

}  // namespace fleet
