#include "ctl/client/host_client.h"

#include <algorithm>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http.hpp>

#include "ctl/client/failure.h"
#include "ctl/client/http/bounded_json.h"
#include "ctl/client/http/transport.h"

namespace http = boost::beast::http;
using nlohmann::json;

namespace ctl {
namespace {

using Request = http::request<http::string_body>;
using Response = http::response<http::string_body>;

Request makeRequest(http::verb method, const std::string& target) {
    Request request(method, target, 11);
    request.set(http::field::host, "localhost");
    request.set(http::field::user_agent, "zavctl");
    request.keep_alive(false);
    return request;
}

Failure senseless(const std::string& what) {
    return {kNoHost, "the host's answer " + what};
}

Response exchange(const std::string& path, const Request& request, Deadline deadline,
                  const Ticker& tick) {
    Transport transport(path);
    Transport::Error error;
    transport.runInTime(deadline, {}, error,
                        [&](auto done) { http::async_write(transport.socket(), request, done); });
    // A host that refuses a request early answers and closes before it has read everything. So
    // there may be an answer although the write failed.
    boost::beast::flat_buffer buffer;
    http::response_parser<http::string_body> parser;
    parser.body_limit(kMostBytes);
    transport.runInTime(deadline, tick, error, [&](auto done) {
        http::async_read(transport.socket(), buffer, parser, done);
    });
    // A length that no text can have is found out another way.
    const bool isTooLarge =
        error == http::error::body_limit || error == http::error::buffer_overflow;
    if (isTooLarge) throw senseless("is larger than 64 MiB");
    if (error) throw transport.broken(error);
    return parser.release();
}

/// The document in an answer that is no refusal.
json documentOf(const Response& response) {
    if (response.result_int() != 200) throw refusal(response.result_int(), response.body());
    ParsedJson answer = parseBounded(response.body());
    if (answer.fault != nullptr) throw senseless(answer.fault);
    return std::move(answer.document);
}

json queryDocument(const TableQuery& query) {
    json conditions = json::array();
    for (const Condition& condition : query.where) {
        conditions.push_back(
            {{"column", condition.column}, {"op", condition.op}, {"value", condition.value}});
    }
    json document = {{"table", query.table}, {"where", conditions}};
    if (query.isForced) document["force"] = true;  // hosts without guards do not know the member
    return document;
}

/// A member that is a list; an empty one if there is none.
json listIn(json& answer, const char* name) {
    const auto found = answer.find(name);
    return found != answer.end() && found->is_array() ? std::move(*found) : json::array();
}

}  // namespace

json HostClient::get(const std::string& target, Deadline deadline) const {
    return documentOf(exchange(socketPath_, makeRequest(http::verb::get, target), deadline, {}));
}

json HostClient::getIfThere(const std::string& target, Deadline deadline) const {
    const Response response =
        exchange(socketPath_, makeRequest(http::verb::get, target), deadline, {});
    return response.result() == http::status::not_found ? json() : documentOf(response);
}

json HostClient::remove(const std::string& target, Deadline deadline) const {
    return documentOf(
        exchange(socketPath_, makeRequest(http::verb::delete_, target), deadline, {}));
}

QueryAnswer HostClient::query(const TableQuery& query, Deadline deadline,
                              const Ticker& tick) const {
    Request request = makeRequest(http::verb::post, "/v1/query");
    request.set(http::field::content_type, "application/json");
    // Arguments come from a terminal or a file and may be in any encoding.
    request.body() = queryDocument(query).dump(-1, ' ', false, json::error_handler_t::replace);
    request.prepare_payload();
    json answer = documentOf(exchange(socketPath_, request, deadline, tick));
    const auto rows = answer.find("rows");
    if (rows == answer.end() || !rows->is_array()) throw senseless("has no rows");
    const bool areRows =
        std::all_of(rows->begin(), rows->end(), [](const json& row) { return row.is_object(); });
    if (!areRows) throw senseless("has rows that are none");
    if (rows->size() > kMostRows) throw senseless("has more than 1,000,000 rows");
    return {std::move(*rows), listIn(answer, "warnings"), listIn(answer, "full")};
}

}  // namespace ctl
