#include "ctl/client/host_client.h"

#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http.hpp>
#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"
#include "ctl/client/transport.h"

namespace http = boost::beast::http;
using nlohmann::json;

namespace ctl {
namespace {

constexpr std::uint64_t kAnswerLimit = 256ULL * 1024 * 1024;  // a table of many rows

using Request = http::request<http::string_body>;

Request makeRequest(http::verb method, const std::string& target) {
    Request request(method, target, 11);
    request.set(http::field::host, "localhost");
    request.set(http::field::user_agent, "zavctl");
    request.keep_alive(false);
    return request;
}

json exchange(const std::string& path, const Request& request, Deadline deadline,
              const Ticker& tick) {
    Transport transport(path);
    Transport::Error error;
    transport.runInTime(deadline, {}, error,
                        [&](auto done) { http::async_write(transport.socket(), request, done); });
    // A host that refuses a request early answers and closes before it has read everything. So
    // there may be an answer although the write failed.
    boost::beast::flat_buffer buffer;
    http::response_parser<http::string_body> parser;
    parser.body_limit(kAnswerLimit);
    transport.runInTime(deadline, tick, error, [&](auto done) {
        http::async_read(transport.socket(), buffer, parser, done);
    });
    if (error) throw transport.broken(error);
    const auto& response = parser.get();
    if (response.result_int() != 200) throw refusal(response.result_int(), response.body());
    json answer = json::parse(response.body(), nullptr, false);
    if (answer.is_discarded()) throw Failure(kNoHost, "the host's answer is no JSON");
    return answer;
}

json queryDocument(const std::string& table, const std::vector<Condition>& where) {
    json conditions = json::array();
    for (const Condition& condition : where) {
        conditions.push_back(
            {{"column", condition.column}, {"op", condition.op}, {"value", condition.value}});
    }
    return {{"table", table}, {"where", conditions}};
}

}  // namespace

json HostClient::get(const std::string& target, Deadline deadline) const {
    return exchange(socketPath_, makeRequest(http::verb::get, target), deadline, {});
}

json HostClient::query(const std::string& table, const std::vector<Condition>& where,
                       Deadline deadline, const Ticker& tick) const {
    Request request = makeRequest(http::verb::post, "/v1/query");
    request.set(http::field::content_type, "application/json");
    // Arguments come from a terminal or a file and may be in any encoding.
    request.body() =
        queryDocument(table, where).dump(-1, ' ', false, json::error_handler_t::replace);
    request.prepare_payload();
    json answer = exchange(socketPath_, request, deadline, tick);
    if (!answer.is_object() || !answer.contains("rows") || !answer["rows"].is_array()) {
        throw Failure(kNoHost, "the host's answer has no rows");
    }
    return std::move(answer["rows"]);
}

}  // namespace ctl
