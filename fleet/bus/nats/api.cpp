#include "fleet/bus/nats/api.h"

#include <nlohmann/json.hpp>
#include <utility>

namespace fleet {

namespace {

ApiAnswer judged(Connection::Reply reply) {
    if (!reply.status.done()) return {std::move(reply.status), ""};
    const auto json = nlohmann::json::parse(reply.message.data, nullptr, false);
    if (!json.is_object()) return {BusStatus::refused(0, "the answer is not the store's"), ""};
    const auto error = json.find("error");
    if (error == json.end()) return {{}, std::move(reply.message.data)};
    if (!error->is_object()) return {BusStatus::refused(0, "the answer is not the store's"), ""};
    const auto code = error->find("err_code");
    const auto text = error->find("description");
    return {BusStatus::refused(
                code != error->end() && code->is_number_integer() ? code->get<int>() : 0,
                text != error->end() && text->is_string() ? text->get<std::string>() : ""),
            ""};
}

std::vector<ApiAnswer> allJudged(std::vector<Connection::Reply> replies) {
    std::vector<ApiAnswer> answers;
    for (Connection::Reply& reply : replies)
        answers.push_back(judged(std::move(reply)));
    return answers;
}

}  // namespace

ApiAnswer askStore(Connection& connection, const std::string& call, const std::string& json,
                   Connection::Milliseconds deadline) {
    return judged(connection.request("$JS.API." + call, json, deadline));
}

std::vector<ApiAnswer> askStore(Connection& connection, const std::string& call,
                                const std::vector<std::string>& jsons,
                                Connection::Milliseconds deadline) {
    std::vector<Connection::Request> requests;
    for (const std::string& json : jsons)
        requests.push_back({"$JS.API." + call, json, {}});
    return allJudged(connection.requestAll(requests, deadline));
}

std::vector<ApiAnswer> publishToStore(Connection& connection,
                                      const std::vector<Connection::Request>& messages,
                                      Connection::Milliseconds deadline) {
    return allJudged(connection.requestAll(messages, deadline));
}

ApiAnswer publishToStore(Connection& connection, const std::string& subject, std::string_view bytes,
                         Connection::Milliseconds deadline, const BusHeaders& headers) {
    return judged(connection.request(subject, bytes, deadline, headers));
}

}  // namespace fleet
