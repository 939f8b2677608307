/// login: makes an operator's key and has it certified.
#pragma once

#include <chrono>
#include <functional>
#include <string>

#include "ctl/client/deadline.h"
#include "fleet/bus/messages/invitation.h"
#include "fleet/operator/identity/operator_files.h"

namespace fleet {

/// What a login tells while it waits, and how it waits.
struct LoginEvents {
    /// The key is at the centre, and waits for an administrator to certify it. Called once.
    std::function<void(const std::string& key)> onWaiting;
    std::function<void(std::chrono::milliseconds)> pause;
};

/// Logs in with an invitation and keeps the identity. The key is kept before it is sent, so a login
/// that was broken off goes on with the same key. Throws ctl::Failure: kNoOutcome if there is no
/// certificate at the deadline; and UrlError, HttpsError, FileError and MessageError.
OperatorIdentity logIn(const OperatorFiles& files, const Invitation& invitation,
                       ctl::Deadline deadline, const LoginEvents& events);

}  // namespace fleet
