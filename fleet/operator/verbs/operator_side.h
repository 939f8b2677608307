/// What a verb of a fleet needs: who asks, and whom.
#pragma once

#include "ctl/client/deadline.h"
#include "ctl/verbs/invocation.h"
#include "fleet/operator/centre/https_centre.h"
#include "fleet/operator/identity/operator_identity.h"

namespace fleet {

/// When the command is to be over, by --timeout.
ctl::Deadline deadlineOf(const ctl::Values& given);

struct OperatorSide {
    OperatorIdentity identity;
    ctl::Deadline deadline;
    HttpsCentre centre;

    /// The fleet that --fleet or $ZAV_FLEET names, at which there was a login. A certificate that
    /// ends soon is a note on standard error. Throws ctl::Failure, FileError, UrlError, HttpsError
    /// and MessageError.
    explicit OperatorSide(const ctl::Invocation& invocation);
};

}  // namespace fleet
