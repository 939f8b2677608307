#include "ctl/client/host_client.h"

#include <boost/asio/io_context.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http.hpp>
#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"

namespace asio = boost::asio;
namespace beast = boost::beast;
namespace http = boost::beast::http;
using boost::system::error_code;
using nlohmann::json;

namespace ctl {
namespace {

constexpr std::uint64_t kAnswerLimit = 256ULL * 1024 * 1024;  // a table of many rows

/// A connected socket on which one operation at a time runs until a deadline.
class Transport {
public:
    explicit Transport(const std::string& path) : path_(path), socket_(context_) {
        error_code error;
        try {
            socket_.connect(asio::local::stream_protocol::endpoint(path), error);
        } catch (const boost::system::system_error& tooLong) {
            error = tooLong.code();
        }
        if (error) {
            throw Failure(kNoHost, "no host reached at " + path + ": " + error.message());
        }
    }

    /// Starts an operation and waits for its end. False when the deadline passed; the connection
    /// is of no more use then.
    template <typename Start>
    bool run(Deadline deadline, const Ticker& tick, error_code& error, Start start) {
        bool ended = false;
        start([&](const error_code& result, std::size_t) {
            error = result;
            ended = true;
        });
        context_.restart();
        while (!ended) {
            const auto now = std::chrono::steady_clock::now();
            if (now >= deadline) break;
            // An hour at a time: a far deadline must not overflow the clock's arithmetic.
            const auto pause = tick ? std::chrono::seconds(1) : std::chrono::seconds(3600);
            context_.run_for(std::min<std::chrono::nanoseconds>(pause, deadline - now));
            if (tick && !ended) tick();
            if (!ended) context_.restart();
        }
        if (ended) return true;
        error_code ignored;
        socket_.close(ignored);
        context_.restart();
        context_.run();
        return false;
    }

    asio::local::stream_protocol::socket& socket() { return socket_; }
    Failure broken(const error_code& error) const {
        return {kNoHost, "the connection to the host at " + path_ + " broke: " + error.message()};
    }

private:
    std::string path_;
    asio::io_context context_;
    asio::local::stream_protocol::socket socket_;
};

Failure timedOut() {
    return {kNoOutcome, "no answer within the time-out"};
}

/// What the host says of a request that it does not serve.
Failure refused(unsigned status, const std::string& body) {
    const json parsed = json::parse(body, nullptr, false);
    std::string text = "status " + std::to_string(status);
    if (parsed.is_object() && parsed.contains("error") && parsed["error"].is_string()) {
        text = parsed["error"].get<std::string>();
    }
    return {status >= 500 ? kNoHost : kWrongUsage, "the host refused the request: " + text};
}

template <typename Request>
void addFields(Request& request) {
    request.set(http::field::host, "localhost");
    request.set(http::field::user_agent, "zavctl");
}

json exchange(const std::string& path, const http::request<http::string_body>& request,
              Deadline deadline, const Ticker& tick) {
    Transport transport(path);
    error_code error;
    if (!transport.run(deadline, {}, error,
                       [&](auto done) { http::async_write(transport.socket(), request, done); })) {
        throw timedOut();
    }
    // A host that refuses a request early answers and closes before it has read everything, so a
    // failed write is no reason not to look for the answer.
    beast::flat_buffer buffer;
    http::response_parser<http::string_body> parser;
    parser.body_limit(kAnswerLimit);
    if (!transport.run(deadline, tick, error, [&](auto done) {
            http::async_read(transport.socket(), buffer, parser, done);
        })) {
        throw timedOut();
    }
    if (error) throw transport.broken(error);
    const auto& response = parser.get();
    if (response.result_int() != 200) throw refused(response.result_int(), response.body());
    json answer = json::parse(response.body(), nullptr, false);
    if (answer.is_discarded()) throw Failure(kNoHost, "the host's answer is no JSON");
    return answer;
}

std::string percentEncoded(const std::string& text) {
    static const char* const kHex = "0123456789ABCDEF";
    std::string out;
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        const bool plain = (byte >= '0' && byte <= '9') || (byte >= 'A' && byte <= 'Z') ||
                           (byte >= 'a' && byte <= 'z') || byte == '-' || byte == '.' ||
                           byte == '_' || byte == '~';
        if (plain) {
            out += c;
        } else {
            out += '%';
            out += kHex[byte >> 4];
            out += kHex[byte & 15];
        }
    }
    return out;
}

}  // namespace

json HostClient::get(const std::string& target, Deadline deadline) const {
    http::request<http::string_body> request(http::verb::get, target, 11);
    addFields(request);
    request.keep_alive(false);
    return exchange(socketPath_, request, deadline, {});
}

json HostClient::query(const std::string& table, const std::vector<Condition>& where,
                       Deadline deadline, const Ticker& tick) const {
    json conditions = json::array();
    for (const Condition& condition : where) {
        conditions.push_back(
            {{"column", condition.column}, {"op", condition.op}, {"value", condition.value}});
    }
    http::request<http::string_body> request(http::verb::post, "/v1/query", 11);
    addFields(request);
    request.keep_alive(false);
    request.set(http::field::content_type, "application/json");
    // Arguments come from a terminal or a file and may be in any encoding.
    request.body() = json{{"table", table}, {"where", conditions}}.dump(
        -1, ' ', false, json::error_handler_t::replace);
    request.prepare_payload();
    json answer = exchange(socketPath_, request, deadline, tick);
    if (!answer.is_object() || !answer.contains("rows") || !answer["rows"].is_array()) {
        throw Failure(kNoHost, "the host's answer has no rows");
    }
    return answer["rows"];
}

struct EventStream::Connection {
    explicit Connection(const std::string& path) : transport(path) {
        parser.body_limit(boost::none);
    }
    Transport transport;
    beast::flat_buffer buffer;
    http::response_parser<http::buffer_body> parser;
    char piece[4096] = {};
};

EventStream::EventStream(const std::string& socketPath, const std::string& table,
                         const std::vector<std::pair<std::string, std::string>>& where,
                         Deadline deadline)
    : connection_(std::make_unique<Connection>(socketPath)) {
    std::string target = "/v1/events?table=" + percentEncoded(table);
    for (const auto& [column, value] : where) {
        target += "&" + percentEncoded(column) + "=" + percentEncoded(value);
    }
    http::request<http::empty_body> request(http::verb::get, target, 11);
    addFields(request);
    request.set(http::field::accept, "text/event-stream");

    Connection& c = *connection_;
    error_code error;
    if (!c.transport.run(deadline, {}, error, [&](auto done) {
            http::async_write(c.transport.socket(), request, done);
        })) {
        throw timedOut();
    }
    if (!c.transport.run(deadline, {}, error, [&](auto done) {
            http::async_read_header(c.transport.socket(), c.buffer, c.parser, done);
        })) {
        throw timedOut();
    }
    if (error) throw c.transport.broken(error);
    const unsigned status = c.parser.get().result_int();
    if (status == 200) return;
    c.parser.get().body().data = c.piece;
    c.parser.get().body().size = sizeof c.piece;
    c.transport.run(deadline, {}, error, [&](auto done) {
        http::async_read(c.transport.socket(), c.buffer, c.parser, done);
    });
    throw refused(status, std::string(c.piece, sizeof c.piece - c.parser.get().body().size));
}

EventStream::~EventStream() = default;

EventStream::Result EventStream::next(Deadline deadline, ServerEvent& event, const Ticker& tick) {
    Connection& c = *connection_;
    while (pending_.empty()) {
        if (c.parser.is_done()) return Result::Ended;
        auto& body = c.parser.get().body();
        body.data = c.piece;
        body.size = sizeof c.piece;
        error_code error;
        if (!c.transport.run(deadline, tick, error, [&](auto done) {
                http::async_read_some(c.transport.socket(), c.buffer, c.parser, done);
            })) {
            return Result::TimedOut;
        }
        const std::size_t length = sizeof c.piece - body.size;
        for (ServerEvent& complete : parser_.feed(c.piece, length)) {
            pending_.push_back(std::move(complete));
        }
        if (error && error != http::error::need_buffer && pending_.empty()) return Result::Ended;
    }
    event = std::move(pending_.front());
    pending_.pop_front();
    return Result::Event;
}

}  // namespace ctl
