/// The interface of the bus's store: requests and answers in JSON.
///
/// It is spoken here and not by the client library, so that a missing permission, a missing answer
/// and a refusal are told apart in one place, and each header is sent as it is meant: the library
/// leaves out an expected sequence of 0.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/nats/connection.h"
#include "fleet/bus/nats/status.h"

namespace fleet {

struct ApiAnswer {
    BusStatus status;  ///< Refused has the code of the store
    std::string json;  ///< an object, if it is done
};

/// Asks the store, for example "STREAM.INFO.TASKS". Waits for the answer.
ApiAnswer askStore(Connection& connection, const std::string& call, const std::string& json,
                   Connection::Milliseconds deadline);

/// The same for several questions at once. Answers in the order of the questions.
std::vector<ApiAnswer> askStore(Connection& connection, const std::string& call,
                                const std::vector<std::string>& jsons,
                                Connection::Milliseconds deadline);

/// Publishes where streams listen and waits until they have stored the messages, all of them at
/// once. Answers in the order of the messages.
std::vector<ApiAnswer> publishToStore(Connection& connection,
                                      const std::vector<Connection::Request>& messages,
                                      Connection::Milliseconds deadline);

/// Publishes where a stream listens and waits until it has stored the message.
ApiAnswer publishToStore(Connection& connection, const std::string& subject, std::string_view bytes,
                         Connection::Milliseconds deadline, const BusHeaders& headers);

}  // namespace fleet
