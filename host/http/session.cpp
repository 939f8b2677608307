#include "host/http/session.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/write.hpp>
#include <boost/beast/core/bind_handler.hpp>
#include <boost/beast/core/string.hpp>
#include <boost/beast/http/read.hpp>
#include <boost/beast/http/write.hpp>
#include <utility>

#include "host/http/event_stream.h"
#include "host/tables/query_job.h"

namespace host {
namespace {

namespace net = boost::asio;
namespace beast = boost::beast;
namespace http = beast::http;

constexpr std::size_t kReadBytes = 4096;
constexpr std::size_t kBufferBytes = 64 * 1024;
/// A client that goes on sending after the last answer is cut off at this.
constexpr std::size_t kDrainBytes = 4 * 1024 * 1024;

std::string_view view(beast::string_view text) {
    return {text.data(), text.size()};
}

bool wantsContinue(const http::request<http::string_body>& request) {
    return request.version() >= 11 && beast::iequals(request[http::field::expect], "100-continue");
}

}  // namespace

HttpSession::HttpSession(ServerCore& core, Stream stream)
    : core_(core), stream_(std::move(stream)), buffer_(kBufferBytes) {}

void HttpSession::serve() {
    core_.add(shared_from_this());
    awaitRequest();
}

void HttpSession::refuse(unsigned status, std::string_view text) {
    core_.add(shared_from_this());
    refusal_ = true;
    ++core_.refusals;
    respond(errorReply(status, text));
}

bool HttpSession::quiet() const {
    return state_ != State::Working && state_ != State::Writing;
}

void HttpSession::prepareForEnd() {
    if (state_ == State::Idle) close();
}

void HttpSession::awaitRequest() {
    state_ = State::Idle;
    if (core_.ending) return close();
    if (buffer_.size() > 0) return readRequest();  // the next one came with the last
    buffer_.shrink_to_fit();
    stream_.expires_after(core_.limits.idleTime);
    stream_.async_read_some(buffer_.prepare(kReadBytes),
                            [self = shared_from_this()](Error error, std::size_t bytes) {
                                if (error) return self->close();
                                self->buffer_.commit(bytes);
                                self->readRequest();
                            });
}

void HttpSession::readRequest() {
    if (state_ == State::Closed) return;
    state_ = State::Reading;
    parser_.emplace();
    parser_->header_limit(core_.limits.headBytes);
    parser_->body_limit(core_.limits.bodyBytes);
    keepAlive_ = false;
    isHead_ = false;
    stream_.expires_after(core_.limits.requestTime);
    http::async_read_header(
        stream_, buffer_, *parser_,
        [self = shared_from_this()](Error error, std::size_t) { self->onHead(error); });
}

void HttpSession::onHead(Error error) {
    if (error) return onReadError(error);
    if (parser_->is_done() || buffer_.size() > 0 || !wantsContinue(parser_->get())) {
        return readBody();
    }
    static constexpr std::string_view kContinue = "HTTP/1.1 100 Continue\r\n\r\n";
    net::async_write(stream_, net::buffer(kContinue.data(), kContinue.size()),
                     [self = shared_from_this()](Error failure, std::size_t) {
                         if (failure) return self->close();
                         self->readBody();
                     });
}

void HttpSession::readBody() {
    http::async_read(
        stream_, buffer_, *parser_,
        [self = shared_from_this()](Error error, std::size_t) { self->onRequest(error); });
}

void HttpSession::onRequest(Error error) {
    if (error) return onReadError(error);
    stream_.expires_never();
    dispatch();
}

void HttpSession::onReadError(Error error) {
    static const beast::error_category& kHttpErrors =
        http::make_error_code(http::error::end_of_stream).category();
    if (error == http::error::end_of_stream || error.category() != kHttpErrors) return close();
    if (error == http::error::body_limit) {
        return respond(errorReply(
            413, "the body is larger than " + std::to_string(core_.limits.bodyBytes) + " bytes"));
    }
    if (error == http::error::header_limit || error == http::error::buffer_overflow) {
        return respond(errorReply(400, "the request's head is larger than " +
                                           std::to_string(core_.limits.headBytes) + " bytes"));
    }
    if (error == http::error::partial_message) {
        return respond(errorReply(400, "the request ended before it was complete"));
    }
    respond(errorReply(400, "the request is not HTTP/1.1: " + error.message()));
}

void HttpSession::dispatch() {
    const auto& request = parser_->get();
    keepAlive_ = request.keep_alive() && !core_.ending;
    isHead_ = request.method() == http::verb::head;
    state_ = State::Working;
    if (core_.ending) return respond(errorReply(503, "the host is about to end"));
    const Request wanted =
        core_.router.route(view(request.method_string()), view(request.target()), request.body());
    parser_.reset();
    std::visit([this](const auto& kind) { answer(kind); }, wanted);
}

void HttpSession::answer(const TablesRequest&) {
    respond({200, tablesDocument(core_.router.tables()), ""});
}

void HttpSession::answer(const HealthRequest&) {
    using std::chrono::duration_cast;
    const auto uptime = std::chrono::steady_clock::now() - core_.started;
    const Health health{core_.home, oxa::originNode(),
                        duration_cast<std::chrono::seconds>(uptime).count(), core_.streams};
    respond({200, healthDocument(health, core_.router.codePage()), ""});
}

void HttpSession::answer(const Refusal& refusal) {
    respond(refusalReply(refusal));
}

void HttpSession::answerOverload() {
    respond(errorReply(503, "too many requests are waiting"));
}

void HttpSession::answer(const QueryRequest& query) {
    // The session is handed on, never kept: it ends on the I/O thread whoever is last.
    auto job = [self = shared_from_this(), query]() mutable {
        ServerCore& core = self->core_;
        Reply reply = answerQuery(query, core.router.codePage(), core.watch);
        net::post(core.io, [self = std::move(self), reply = std::move(reply)]() mutable {
            self->respond(std::move(reply));
        });
    };
    if (!core_.pool.submit(std::move(job))) answerOverload();
}

void HttpSession::answer(const EventsRequest& events) {
    auto job = [self = shared_from_this(), where = events.where,
                stream = std::make_shared<EventStream>(core_, *events.table)]() mutable {
        const bool live = stream->subscribe(where);
        ServerCore& core = self->core_;
        net::post(core.io, [self = std::move(self), stream = std::move(stream), live] {
            self->becomeStream(stream, live);
        });
    };
    if (!core_.pool.submit(std::move(job))) answerOverload();
}

void HttpSession::becomeStream(const std::shared_ptr<EventStream>& events, bool live) {
    if (!live) return respond(errorReply(500, "the table takes no subscription"));
    if (core_.ending) {
        events->retire();
        return respond(errorReply(503, "the host is about to end"));
    }
    state_ = State::Closed;
    core_.remove(this);
    events->start(std::move(stream_));
}

void HttpSession::respond(Reply reply) {
    if (state_ == State::Closed) return;
    state_ = State::Writing;
    parser_.reset();
    keepAlive_ = keepAlive_ && !core_.ending;
    response_.emplace(static_cast<http::status>(reply.status), 11);
    response_->set(http::field::content_type, "application/json");
    if (!reply.allow.empty()) response_->set(http::field::allow, reply.allow);
    response_->keep_alive(keepAlive_);
    reply.body += '\n';
    response_->content_length(reply.body.size());
    if (!isHead_) response_->body() = std::move(reply.body);
    stream_.expires_after(core_.limits.answerTime);
    http::async_write(stream_, *response_, [self = shared_from_this()](Error error, std::size_t) {
        self->onWritten(error);
    });
}

void HttpSession::onWritten(Error error) {
    response_.reset();
    if (error) return close();
    if (keepAlive_) return awaitRequest();
    // A socket that is closed with unread bytes in it resets the connection, and the client might
    // lose the answer: so it is read empty until the client has closed its side.
    stream_.socket().shutdown(net::socket_base::shutdown_send, error);
    if (error) return close();
    state_ = State::Lingering;
    stream_.expires_after(core_.limits.lingerTime);
    linger(0);
}

void HttpSession::linger(std::size_t drained) {
    if (drained > kDrainBytes) return close();
    buffer_.clear();
    stream_.async_read_some(buffer_.prepare(kReadBytes),
                            [self = shared_from_this(), drained](Error error, std::size_t bytes) {
                                if (error) return self->close();
                                self->linger(drained + bytes);
                            });
}

void HttpSession::close() {
    if (state_ == State::Closed) return;
    state_ = State::Closed;
    stream_.close();
    if (refusal_) --core_.refusals;
    core_.remove(this);
}

}  // namespace host
