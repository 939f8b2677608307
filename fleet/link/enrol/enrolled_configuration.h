/// What a host that has joined the fleet goes on with.
#pragma once

#include <string>

#include "fleet/bus/messages/enrolment.h"
#include "fleet/bus/messages/invitation.h"
#include "fleet/bus/messages/values.h"
#include "fleet/link/program/link_configuration.h"

namespace fleet {

/// Fills in what the invitation and the centre's answer tell, and leaves the rest as it is. All
/// keys of the centre count that the root has certified and that have not ended. Throws EnrolError
/// if the answer cannot be meant: nothing in it proves that the invitation's root has certified the
/// centre, or a link could not work with it.
void adoptAnswer(LinkConfiguration& configuration, const Invitation& invitation,
                 const EnrolmentAnswer& answer, Moment now);

}  // namespace fleet
