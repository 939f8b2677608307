#include "ctl/client/http/event_stream.h"

#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http.hpp>
#include <cstdint>
#include <limits>

#include "ctl/client/http/percent_encoding.h"
#include "ctl/client/http/transport.h"

namespace http = boost::beast::http;

namespace ctl {
namespace {

std::string tableTarget(const std::string& table,
                        const std::vector<std::pair<std::string, std::string>>& where) {
    std::string target = "/v1/events?table=" + percentEncoded(table);
    for (const auto& [column, value] : where)
        target += "&" + percentEncoded(column) + "=" + percentEncoded(value);
    return target;
}

std::string behind(const std::string& event) {
    return event.empty() ? std::string() : "&after=" + percentEncoded(event);
}

}  // namespace

struct EventStream::Connection {
    explicit Connection(const std::string& path) : transport(path) {
        // "No limit" would refuse every answer that gives its length, such as a refusal.
        parser.body_limit(std::numeric_limits<std::uint64_t>::max());
    }

    void sendRequest(const std::string& target, Deadline deadline);
    void readHeader(Deadline deadline);
    /// Lets the parser write the next part of the body to `piece`.
    void offerPiece() {
        parser.get().body().data = piece;
        parser.get().body().size = sizeof piece;
    }
    std::size_t pieceLength() const { return sizeof piece - parser.get().body().size; }

    Transport transport;
    boost::beast::flat_buffer buffer{kBufferBytes};
    http::response_parser<http::buffer_body> parser;
    char piece[4096] = {};
};

void EventStream::Connection::sendRequest(const std::string& target, Deadline deadline) {
    http::request<http::empty_body> request(http::verb::get, target, 11);
    request.set(http::field::host, "localhost");
    request.set(http::field::user_agent, "zavctl");
    request.set(http::field::accept, "text/event-stream");
    Transport::Error error;  // there may be an answer although the write failed
    transport.runInTime(deadline, {}, error,
                        [&](auto done) { http::async_write(transport.socket(), request, done); });
}

void EventStream::Connection::readHeader(Deadline deadline) {
    Transport::Error error;
    transport.runInTime(deadline, {}, error, [&](auto done) {
        http::async_read_header(transport.socket(), buffer, parser, done);
    });
    if (error) throw transport.broken(error);
    const unsigned status = parser.get().result_int();
    if (status == 200) return;
    offerPiece();
    transport.run(deadline, {}, error,
                  [&](auto done) { http::async_read(transport.socket(), buffer, parser, done); });
    throw refusal(status, std::string(piece, pieceLength()));
}

EventStream::EventStream(const std::string& socketPath, const std::string& table,
                         const std::vector<std::pair<std::string, std::string>>& where,
                         Deadline deadline, const std::string& after)
    : EventStream(socketPath, tableTarget(table, where) + behind(after), deadline) {}

EventStream::EventStream(const std::string& socketPath, const std::string& target,
                         Deadline deadline)
    : connection_(std::make_unique<Connection>(socketPath)) {
    connection_->sendRequest(target, deadline);
    connection_->readHeader(deadline);
    const auto begin = connection_->parser.get()["Last-Event-ID"];
    position_.assign(begin.data(), begin.size());
}

EventStream::~EventStream() = default;

EventStream::Result EventStream::next(Deadline deadline, ServerEvent& event, const Ticker& tick) {
    Connection& c = *connection_;
    while (pending_.empty()) {
        if (c.parser.is_done()) return Result::Ended;
        c.offerPiece();
        Transport::Error error;
        if (!c.transport.run(deadline, tick, error, [&](auto done) {
                http::async_read_some(c.transport.socket(), c.buffer, c.parser, done);
            })) {
            return Result::TimedOut;
        }
        for (ServerEvent& complete : parser_.feed(c.piece, c.pieceLength())) {
            pending_.push_back(std::move(complete));
        }
        if (error && error != http::error::need_buffer && pending_.empty()) return Result::Ended;
    }
    event = std::move(pending_.front());
    pending_.pop_front();
    if (!event.id.empty()) position_ = event.id;
    return Result::Event;
}

}  // namespace ctl
