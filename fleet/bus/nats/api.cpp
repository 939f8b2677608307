#include "fleet/bus/nats/api.h"

#include <nlohmann/json.hpp>

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

}  // namespace

ApiAnswer askStore(Connection& connection, const std::string& call, const std::string& json,
                   Connection::Milliseconds deadline) {
    return judged(connection.request("$JS.API." + call, json, deadline));
}

ApiAnswer publishToStore(Connection& connection, const std::string& subject, std::string_view bytes,
                         Connection::Milliseconds deadline, const BusHeaders& headers) {
    return judged(connection.request(subject, bytes, deadline, headers));
}

}  // namespace fleet
