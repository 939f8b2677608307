/// Requests to the host's HTTP interface that have one answer.
#pragma once

#include <chrono>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "ctl/client/condition.h"
#include "ctl/client/deadline.h"

namespace ctl {

/// What a query asks for.
struct TableQuery {
    std::string table;
    std::vector<Condition> where;  ///< all of which a row fulfils
    bool isForced = false;         ///< pass the host's guard that knows the inventory
};

/// What the host answers. Members that it does not send are empty lists.
struct QueryAnswer {
    nlohmann::json rows = nlohmann::json::array();  ///< objects with a member per column
    /// What went wrong while the rows were made: {"text", "command", ...}, a command with the
    /// members that one has in a task's details.
    nlohmann::json warnings = nlohmann::json::array();
    /// Texts that the rows may hold cut: {"row", "column", "text", "complete"}.
    nlohmann::json full = nlohmann::json::array();
};

/// What the host answers, whatever it is.
struct Answer {
    unsigned status = 0;  ///< of HTTP
    std::string body;
    /// When the host wants to be asked again; nothing if it does not say.
    std::optional<std::chrono::seconds> retryAfter = {};

    bool isSuccess() const { return status >= 200 && status < 300; }
    /// The document of a success. Throws Failure for everything else, see refusal().
    nlohmann::json document() const;
};

/// Makes a connection of its own for each request. Every operation throws Failure: kNoHost when
/// nobody listens, the connection breaks or the answer makes no sense; kWrongUsage or
/// kHostReportedFailure when the host refuses the request, see refusal(); kNoOutcome when the
/// deadline passes.
class HostClient {
public:
    explicit HostClient(std::string socketPath) : socketPath_(std::move(socketPath)) {}

    /// The JSON document at a path such as "/v1/health".
    nlohmann::json get(const std::string& target, Deadline deadline) const;

    /// The same; null when the host has nothing there (404), as one that does not know the path.
    nlohmann::json getIfThere(const std::string& target, Deadline deadline) const;

    /// The answer to a GET, also when it is not one that get() would return.
    Answer ask(const std::string& target, Deadline deadline, const Ticker& tick = {}) const;

    /// The answer to a POST of a document; of nothing if it is null. Throws BrokenConnection when
    /// the host may have got the request although there is no answer.
    Answer post(const std::string& target, const nlohmann::json& document, Deadline deadline,
                const Ticker& tick = {}) const;

    /// Removes what is at a path; the host's answer.
    nlohmann::json remove(const std::string& target, Deadline deadline) const;

    QueryAnswer query(const TableQuery& query, Deadline deadline, const Ticker& tick = {}) const;

private:
    std::string socketPath_;
};

}  // namespace ctl
