/// HTTP requests and answers as texts.
#pragma once

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "soak/ledger.h"

namespace soak {

struct Answer {
    int status = 0;
    bool closes = false;  ///< the host says that it closes the connection
    std::string body;
};

std::string getRequest(const std::string& target);
std::string postRequest(const std::string& target, const std::string& body);

/// A query with the conditions "column = value".
std::string queryBody(const std::string& table,
                      const std::vector<std::pair<std::string, std::string>>& where);

/// Takes one complete answer out of `in`; nothing while it is incomplete. A malformed answer has
/// the status -1.
std::optional<Answer> takeAnswer(std::string& in);

/// One message of an event stream: a row, the end of a task, or how many events are not kept any
/// more.
struct EventMessage {
    std::string id;  ///< empty: it has none
    bool gap = false;
    std::size_t lost = 0;
    std::optional<TaskEnd> end;
    OutcomeRow row;
};

/// Takes one complete message out of `in`. Throws std::runtime_error when it is malformed.
std::optional<EventMessage> takeEvent(std::string& in);

}  // namespace soak
