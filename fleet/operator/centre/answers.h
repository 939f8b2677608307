/// What the centre's answers hold. The centre may be a bad one: whatever it says is read with care.
#pragma once

#include <cstdint>
#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/client/failure.h"
#include "fleet/https/client/https_client.h"
#include "fleet/https/client/https_error.h"

namespace fleet {

// Members of an object; what is missing or of another kind is empty, 0 or false.
std::string memberText(const nlohmann::json& object, const char* member);
std::uint64_t memberNumber(const nlohmann::json& object, const char* member);
bool memberFlag(const nlohmann::json& object, const char* member);

/// The list that the member of an answer is. Throws ctl::Failure(kNoHost) if it is not one.
const nlohmann::json& memberList(const nlohmann::json& answer, const char* member);

/// The JSON object that the centre has answered with. Throws ctl::Failure if it has refused, or if
/// its answer is none.
nlohmann::json documentIn(const HttpsAnswer& answer);

/// What to throw when the centre's answer makes no sense.
ctl::Failure senseless(const std::string& what);

/// What to throw when the centre answers with a status that is no success. `body` may hold the
/// reason as {"error": "..."}.
ctl::Failure centreRefusal(unsigned status, const std::string& body);

/// What to throw when the centre was not reached, or has not answered.
ctl::Failure centreFailure(const HttpsError& error);

}  // namespace fleet
