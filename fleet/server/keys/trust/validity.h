/// How long invitations are good.
#pragma once

#include <chrono>

#include "fleet/server/keys/files/keys_error.h"

namespace fleet {

/// Throws KeysError unless it is between a minute and 30 days: an invitation is a secret that is
/// sent around, and shall not wait for whoever finds it next year.
inline void checkInvitationValidity(std::chrono::milliseconds valid) {
    if (valid < std::chrono::minutes(1) || valid > std::chrono::hours(24 * 30)) {
        throw KeysError("an invitation is good for a minute up to 30 days");
    }
}

}  // namespace fleet
