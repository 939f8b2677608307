/// Requests to the host's HTTP interface that have one answer.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>
#include <utility>
#include <vector>

#include "ctl/client/condition.h"
#include "ctl/client/deadline.h"

namespace ctl {

/// Makes a connection of its own for each request. Every operation throws Failure: kNoHost when
/// nobody listens, the connection breaks or the answer makes no sense; kWrongUsage or
/// kHostReportedFailure when the host refuses the request, see refusal(); kNoOutcome when the
/// deadline passes.
class HostClient {
public:
    explicit HostClient(std::string socketPath) : socketPath_(std::move(socketPath)) {}

    /// The JSON document at a path such as "/v1/health".
    nlohmann::json get(const std::string& target, Deadline deadline) const;

    /// The rows of a table that fulfil all conditions: an array of objects.
    nlohmann::json query(const std::string& table, const std::vector<Condition>& where,
                         Deadline deadline, const Ticker& tick = {}) const;

private:
    std::string socketPath_;
};

}  // namespace ctl
