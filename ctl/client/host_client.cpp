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
    boost::beast::flat_buffer buffer(kBufferBytes);
    http::response_parser<http::string_body> parser;
    parser.body_limit(kMostBytes);
    // The head by itself: a parser that goes on to the body within one piece of bytes forgets that
    // the body is too long, and makes room for it.
    transport.runInTime(deadline, tick, error, [&](auto done) {
        http::async_read_header(transport.socket(), buffer, parser, done);
    });
    if (!error && !parser.is_done()) {
        transport.runInTime(deadline, tick, error, [&](auto done) {
            http::async_read(transport.socket(), buffer, parser, done);
        });
    }
    // A length that no text can have is found out another way. Chunks have no such length: with
    // them it is the buffer that is full.
    const bool isTooLarge = error == http::error::body_limit ||
                            (error == http::error::buffer_overflow && !parser.chunked());
    if (isTooLarge) throw senseless("is larger than 64 MiB");
    if (error) throw transport.broken(error);
    return parser.release();
}

/// A number of seconds from now; a date is as good as nothing.
std::optional<std::chrono::seconds> retryAfterOf(const Response& response) {
    constexpr std::size_t kMostDigits = 6;
    const std::string text(response[http::field::retry_after]);
    const bool isNumber = !text.empty() && text.size() <= kMostDigits &&
                          text.find_first_not_of("0123456789") == std::string::npos;
    if (!isNumber) return std::nullopt;
    return std::chrono::seconds(std::stol(text));
}

Answer answerOf(Response response) {
    return {response.result_int(), std::move(response.body()), retryAfterOf(response)};
}

/// A request with a document. Arguments come from a terminal or a file and may be in any encoding.
Request makePost(const std::string& target, const json& document) {
    Request request = makeRequest(http::verb::post, target);
    if (!document.is_null()) {
        request.set(http::field::content_type, "application/json");
        request.body() = document.dump(-1, ' ', false, json::error_handler_t::replace);
    }
    request.prepare_payload();
    return request;
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

json Answer::document() const {
    if (!isSuccess()) throw refusal(status, body);
    ParsedJson answer = parseBounded(body);
    if (answer.fault != nullptr) throw senseless(answer.fault);
    return std::move(answer.document);
}

Answer HostClient::ask(const std::string& target, Deadline deadline, const Ticker& tick) const {
    return answerOf(exchange(socketPath_, makeRequest(http::verb::get, target), deadline, tick));
}

Answer HostClient::post(const std::string& target, const json& document, Deadline deadline,
                        const Ticker& tick) const {
    return answerOf(exchange(socketPath_, makePost(target, document), deadline, tick));
}

json HostClient::get(const std::string& target, Deadline deadline) const {
    return ask(target, deadline).document();
}

json HostClient::getIfThere(const std::string& target, Deadline deadline) const {
    const Answer answer = ask(target, deadline);
    return answer.status == 404 ? json() : answer.document();
}

json HostClient::remove(const std::string& target, Deadline deadline) const {
    const Request request = makeRequest(http::verb::delete_, target);
    return answerOf(exchange(socketPath_, request, deadline, {})).document();
}

QueryAnswer HostClient::query(const TableQuery& query, Deadline deadline,
                              const Ticker& tick) const {
    json answer = post("/v1/query", queryDocument(query), deadline, tick).document();
    const auto rows = answer.find("rows");
    if (rows == answer.end() || !rows->is_array()) throw senseless("has no rows");
    const bool areRows =
        std::all_of(rows->begin(), rows->end(), [](const json& row) { return row.is_object(); });
    if (!areRows) throw senseless("has rows that are none");
    if (rows->size() > kMostRows) throw senseless("has more than 1,000,000 rows");
    return {std::move(*rows), listIn(answer, "warnings"), listIn(answer, "full")};
}

}  // namespace ctl
