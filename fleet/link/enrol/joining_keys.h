/// The keys of a host that is about to join.
#pragma once

#include <string>

#include "fleet/bus/accounts/nkey.h"

namespace fleet {

/// In "joining.json" of the link's directory, readable for its user only. They are there before the
/// centre hears of them, so that a host whose answer was lost comes again with the same ones.
struct JoiningKeys {
    KeyPair bus;
    KeyPair signing;
};

/// Those with which the host has tried to use this invitation's token; otherwise new ones, which
/// are durable when it returns: the centre takes keys once only, so another invitation needs
/// others. Throws FileError.
JoiningKeys joiningKeys(const std::string& directory, const std::string& token);

/// Whether an enrolment has begun and is not complete. Throws FileError.
bool areJoiningKeysThere(const std::string& directory);

/// The enrolment is complete: the keys are kept elsewhere.
void forgetJoiningKeys(const std::string& directory);

}  // namespace fleet
