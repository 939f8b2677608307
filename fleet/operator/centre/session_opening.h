/// How an operator opens a session at the centre.
#pragma once

#include <string>

#include "fleet/https/client/https_client.h"
#include "fleet/operator/identity/operator_identity.h"

namespace fleet {

/// The request that opens a session, signed now by the operator's key.
HttpsRequest sessionOpening(const OperatorIdentity& identity);

/// The session that the answer gives. Throws ctl::Failure if the centre has refused, or if its
/// answer makes no sense.
std::string sessionIn(const HttpsAnswer& answer);

}  // namespace fleet
