/// The centre as an operator asks it.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

namespace fleet {

/// One thread at a time. Operations throw ctl::Failure: kNoHost if there is no centre or none that
/// is trusted, kNoOutcome if it does not answer in time, kHostReportedFailure if it refuses for
/// now, and kWrongUsage if what was asked for makes no sense to it.
class Centre {
public:
    virtual ~Centre() = default;

    /// `target` is the path and what follows it; see percentEncoded() for what it may hold.
    virtual nlohmann::json get(const std::string& target) = 0;
    virtual nlohmann::json post(const std::string& target, const nlohmann::json& body) = 0;
    /// Sends bytes in the place of a document.
    virtual nlohmann::json postBytes(const std::string& target, std::string bytes) = 0;
};

}  // namespace fleet
