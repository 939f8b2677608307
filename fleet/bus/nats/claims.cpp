#include "fleet/bus/nats/claims.h"

#include <nlohmann/json.hpp>

#include "fleet/bus/accounts/token.h"

namespace fleet {

namespace {

constexpr int kUpdated = 200;

}  // namespace

BusStatus updateAccount(Connection& system, const std::string& token, const std::string& root,
                        Connection::Milliseconds deadline) {
    if (!isTokenSignedBy(token, root)) {
        return BusStatus::refused(0, "the operator has not signed that token");
    }
    const auto reply = system.request("$SYS.REQ.CLAIMS.UPDATE", token, deadline);
    if (!reply.status.done()) return reply.status;
    const auto json = nlohmann::json::parse(reply.message.data, nullptr, false);
    const nlohmann::json none = nlohmann::json::object();
    const auto part = [&](const char* name) {
        return json.is_object() && json.contains(name) && json[name].is_object() ? json[name]
                                                                                 : none;
    };
    const auto data = part("data");
    if (data.contains("code") && data["code"] == kUpdated) return {};
    return BusStatus::refused(0, "the account is not updated: " + reply.message.data);
}

}  // namespace fleet
