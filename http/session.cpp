#include "http/session.h"

#include <sys/socket.h>

#include <boost/asio/buffer.hpp>
#include <boost/asio/write.hpp>
#include <boost/beast/core/bind_handler.hpp>
#include <boost/beast/core/string.hpp>
#include <boost/beast/http/read.hpp>
#include <boost/beast/http/write.hpp>
#include <cerrno>
#include <exception>
#include <limits>
#include <optional>
#include <utility>
#include <variant>

#include "http/event_stream.h"
#include "http/head_check.h"
#include "http/piece_body.h"

namespace http {
namespace {

namespace net = boost::asio;
namespace beast = boost::beast;
namespace wire = beast::http;

constexpr unsigned kNoContent = 204;
constexpr unsigned kNotModified = 304;
constexpr std::size_t kReadBytes = 4096;
constexpr std::size_t kBufferBytes = std::size_t{64} * 1024;
/// A client that keeps sending after the last answer is cut off after this many bytes.
constexpr std::size_t kDrainBytes = std::size_t{4} * 1024 * 1024;

std::string_view view(beast::string_view text) {
    return {text.data(), text.size()};
}

bool wantsContinue(const wire::request<wire::string_body>& request) {
    return request.version() >= 11 && beast::iequals(request[wire::field::expect], "100-continue");
}

bool hasBody(const wire::request_header<>& head) {
    return head.count(wire::field::content_length) > 0 ||
           head.count(wire::field::transfer_encoding) > 0;
}

/// The request without its body. Made of the head alone: what a chunked body brings behind it
/// counts for nothing.
Request requestOf(const wire::request_header<>& head, const Peer& peer,
                  const std::vector<std::string>& wantedFields) {
    Request request{std::string(view(head.method_string())),
                    std::string(view(head.target())),
                    {},
                    peer,
                    std::string(view(head["Last-Event-ID"])),
                    std::string(view(head[wire::field::authorization])),
                    std::string(view(head[wire::field::range]))};
    for (const std::string& name : wantedFields) {
        const auto [first, last] = head.equal_range(name);
        for (auto field = first; field != last; ++field)
            request.fields.emplace_back(name, std::string(view(field->value())));
    }
    return request;
}

/// Looks at the extensions of each chunk, which the parser passes by as far as the end of the line.
void checkChunk(std::uint64_t, beast::string_view extensions, beast::error_code& error) {
    if (hidesALine(view(extensions))) error = wire::error::bad_chunk_extension;
}

/// Composes no text: memory may be what is missing.
Reply failure() {
    return {500, "{\"error\":\"the request failed for want of memory\"}\n"};
}

}  // namespace

HttpSession::HttpSession(ServerCore& core, Stream stream, const Peer& peer)
    : core_(core), stream_(std::move(stream)), peer_(peer), buffer_(kBufferBytes) {}

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
    if (atLimit_) endWait();
}

void HttpSession::awaitRequest() {
    state_ = State::Idle;
    if (core_.ending) return close();
    if (buffer_.size() > 0) return readRequest();  // it came together with the last one
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
    // How much a body may hold depends on what the head asks for.
    parser_->body_limit(std::numeric_limits<std::uint64_t>::max());
    parser_->on_chunk_header(checkChunk);
    request_.reset();
    pieces_.reset();
    keepAlive_ = false;
    isHead_ = false;
    head_.clear();
    stream_.expires_after(core_.limits.requestTime);
    readHead();
}

/// Keeps the head's bytes, because the parser mends some of what is to be refused.
void HttpSession::readHead() {
    Error error;
    while (buffer_.size() > 0 && !error && !parser_->is_header_done()) {
        const std::size_t taken = parser_->put(buffer_.data(), error);
        head_.append(static_cast<const char*>(buffer_.data().data()), taken);
        buffer_.consume(taken);
    }
    if (parser_->is_header_done() || (error && error != wire::error::need_more)) {
        return onHead(error);
    }
    stream_.async_read_some(buffer_.prepare(kReadBytes),
                            [self = shared_from_this()](Error failure, std::size_t bytes) {
                                if (failure) return self->onEndInHead(failure);
                                self->buffer_.commit(bytes);
                                self->readHead();
                            });
}

void HttpSession::onEndInHead(Error error) {
    const bool begun = parser_->got_some() || buffer_.size() > 0;
    onReadError(error == net::error::eof && begun ? wire::error::partial_message : error);
}

void HttpSession::onHead(Error error) {
    if (error) return onReadError(error);
    std::optional<Reply> refused = refusalOfHead(head_, parser_->get());
    head_ = {};
    if (refused) return respond(std::move(*refused));
    const bool asksFirst = !parser_->is_done() && wantsContinue(parser_->get());
    if (!plan()) return;
    if (isBodyTooLarge()) return onReadError(wire::error::body_limit);
    if (buffer_.size() > 0 || !asksFirst) return readBody();
    static constexpr std::string_view kContinue = "HTTP/1.1 100 Continue\r\n\r\n";
    net::async_write(stream_, net::buffer(kContinue.data(), kContinue.size()),
                     [self = shared_from_this()](Error failure, std::size_t) {
                         if (failure) return self->close();
                         self->readBody();
                     });
}

/// Decides what becomes of the body; returns false if the request has been answered.
bool HttpSession::plan() {
    try {
        const auto& head = parser_->get();
        request_ = requestOf(head, peer_, core_.handler.wantedFields());
        BodyPlan plan = hasBody(head) ? core_.handler.planFor(*request_) : BodyPlan();
        if (auto* const refusal = std::get_if<Reply>(&plan)) {
            respond(std::move(*refusal));
            return false;
        }
        if (auto* const taker = std::get_if<std::unique_ptr<BodyTaker>>(&plan)) {
            pieces_ = std::make_shared<PieceBody>(std::move(*parser_), std::move(*taker));
        }
        return true;
    } catch (const std::exception&) {
        respond(failure());
        return false;
    }
}

/// Limits the body, and looks at the length that the head announces.
bool HttpSession::isBodyTooLarge() {
    if (pieces_) return pieces_->parser.content_length_remaining().value_or(0) > mostBodyBytes();
    parser_->body_limit(mostBodyBytes());
    return parser_->content_length_remaining().value_or(0) > mostBodyBytes();
}

std::uint64_t HttpSession::mostBodyBytes() const {
    return pieces_ ? pieces_->taker->mostBytes() : core_.limits.bodyBytes;
}

void HttpSession::readBody() {
    if (pieces_) return readPiece();
    wire::async_read(
        stream_, buffer_, *parser_,
        [self = shared_from_this()](Error error, std::size_t) { self->onRequest(error); });
}

void HttpSession::onRequest(Error error) {
    if (error) return onReadError(error);
    stream_.expires_never();
    dispatch();
}

void HttpSession::readPiece() {
    if (pieces_->parser.is_done()) {
        const auto& head = pieces_->parser.get();
        if (!begin(head.keep_alive(), false)) return;
        return submit(
            [pieces = std::exchange(pieces_, nullptr)] { return pieces->taker->answer(); });
    }
    pieces_->offer();
    stream_.expires_after(core_.limits.requestTime);
    wire::async_read(
        stream_, buffer_, pieces_->parser,
        [self = shared_from_this()](Error error, std::size_t) { self->onPiece(error); });
}

/// Hands the piece over on a worker thread. The next one is read after that, so that a client that
/// sends faster than its body is taken waits.
void HttpSession::onPiece(Error error) {
    if (state_ == State::Closed) return;
    if (error && error != wire::error::need_buffer) return onReadError(error);
    stream_.expires_never();
    const bool taken =
        core_.pool.submit([mailbox = core_.mailbox, weak = weak_from_this(), pieces = pieces_] {
            std::optional<Reply> refusal;
            try {
                refusal = pieces->taker->take(pieces->piece());
            } catch (...) {
                refusal = failure();
            }
            mailbox->post([weak, refusal = std::move(refusal)]() mutable {
                if (const auto self = weak.lock()) self->onPieceTaken(std::move(refusal));
            });
        });
    if (!taken) respond(errorReply(503, "too many requests are waiting"));
}

void HttpSession::onPieceTaken(std::optional<Reply> refusal) {
    if (state_ == State::Closed) return;
    if (refusal) return respond(std::move(*refusal));
    readPiece();
}

void HttpSession::onReadError(Error error) {
    static const beast::error_category& kHttpErrors =
        wire::make_error_code(wire::error::end_of_stream).category();
    if (error == wire::error::end_of_stream || error.category() != kHttpErrors) return close();
    if (error == wire::error::body_limit) {
        return respond(errorReply(
            413, "the body is larger than " + std::to_string(mostBodyBytes()) + " bytes"));
    }
    if (error == wire::error::header_limit || error == wire::error::buffer_overflow) {
        return respond(errorReply(400, "the request's head is larger than " +
                                           std::to_string(core_.limits.headBytes) + " bytes"));
    }
    if (error == wire::error::partial_message) {
        return respond(errorReply(400, "the request ended before it was complete"));
    }
    respond(errorReply(400, "the request is not HTTP/1.1: " + error.message()));
}

/// The request is complete; returns false if there is no time left to answer it.
bool HttpSession::begin(bool keepAlive, bool isHead) {
    keepAlive_ = keepAlive && !core_.ending;
    isHead_ = isHead;
    state_ = State::Working;
    ++exchange_;
    if (core_.ending) respond(errorReply(503, "the host is about to end"));
    return !core_.ending;
}

void HttpSession::dispatch() {
    auto& message = parser_->get();
    if (!begin(message.keep_alive(), message.method() == wire::verb::head)) return;
    try {
        Request request = std::move(*request_);
        request.body = std::move(message.body());
        request_.reset();
        parser_.reset();
        std::variant<Answer, Job> wanted = core_.handler.handle(std::move(request));
        if (auto* const job = std::get_if<Job>(&wanted)) return submit(std::move(*job));
        answer(std::get<Answer>(std::move(wanted)));
    } catch (const std::exception&) {
        respond(failure());
    }
}

void HttpSession::submit(Job job) {
    const Responder responder(core_.mailbox, weak_from_this(), exchange_);
    const bool taken = core_.pool.submit([responder, job = std::move(job)] {
        try {
            responder(job());
        } catch (...) {
            responder(failure());
        }
    });
    if (!taken) respond(errorReply(503, "too many requests are waiting"));
}

void HttpSession::take(unsigned exchange, Answer given) {
    if (state_ == State::Working && exchange == exchange_) answer(std::move(given));
}

void HttpSession::answer(Answer given) {
    atLimit_ = nullptr;
    if (waitTimer_) waitTimer_->cancel();
    std::visit([this](auto&& kind) { answer(std::move(kind)); }, std::move(given));
}

void HttpSession::answer(std::unique_ptr<EventSource> source) {
    if (core_.ending) return respond(errorReply(503, "the host is about to end"));
    if (isHead_) return respond({200, "", "text/event-stream"});
    const auto self = shared_from_this();  // what the books hold may be all that holds it
    state_ = State::Closed;
    core_.remove(this);
    std::make_shared<EventStream>(core_, std::move(stream_), std::move(source), onlyReads())
        ->start();
}

void HttpSession::answer(Later later) {
    atLimit_ = std::move(later.atLimit);
    if (core_.ending) return endWait();
    if (!waitTimer_) waitTimer_.emplace(core_.io);
    waitTimer_->expires_after(later.limit);
    waitTimer_->async_wait([weak = weak_from_this(), exchange = exchange_](Error error) {
        const auto self = weak.lock();
        if (!error && self && self->exchange_ == exchange && self->atLimit_) self->endWait();
    });
    if (later.onGone) watchClient(std::move(later.onGone));
    later.begin(Responder(core_.mailbox, weak_from_this(), exchange_));
}

void HttpSession::watchClient(std::function<void()> onGone) {
    stream_.socket().async_wait(
        net::socket_base::wait_read,
        [weak = weak_from_this(), exchange = exchange_, onGone = std::move(onGone)](Error error) {
            const auto self = weak.lock();
            const bool waits = !error && self && self->atLimit_ && self->exchange_ == exchange;
            if (!waits || !self->hasClientGone()) return;
            onGone();
            self->close();
        });
}

/// Whether the connection is at its end, and not at the beginning of the next request.
bool HttpSession::hasClientGone() {
    if (buffer_.size() > 0) return false;
    char next = 0;
    const ssize_t length =
        ::recv(stream_.socket().native_handle(), &next, sizeof next, MSG_PEEK | MSG_DONTWAIT);
    return length == 0 || (length < 0 && errno != EAGAIN && errno != EINTR);
}

void HttpSession::endWait() {
    submit(std::exchange(atLimit_, nullptr));
}

void HttpSession::respond(Reply reply) {
    if (state_ == State::Closed) return;
    state_ = State::Writing;
    parser_.reset();
    pieces_.reset();
    keepAlive_ = keepAlive_ && !core_.ending;
    response_.emplace(static_cast<wire::status>(reply.status), 11);
    for (const auto& [name, value] : core_.handler.commonFields())
        response_->set(name, value);
    for (const auto& [name, value] : reply.fields)
        response_->set(name, value);
    response_->keep_alive(keepAlive_);
    if (reply.status != kNoContent && reply.status != kNotModified) {
        response_->set(wire::field::content_type, reply.type);
        // HEAD may ask about a stream, which has no length.
        if (!isHead_ || !reply.body.empty()) response_->content_length(reply.body.size());
    }
    if (!isHead_) response_->body() = std::move(reply.body);
    held_ = std::move(reply.held);
    stream_.expires_after(core_.limits.answerTime);
    wire::async_write(stream_, *response_, [self = shared_from_this()](Error error, std::size_t) {
        self->onWritten(error);
    });
}

void HttpSession::onWritten(Error error) {
    response_.reset();
    held_.reset();
    if (error) return close();
    if (keepAlive_) return awaitRequest();
    // Closing a socket with unread bytes resets the connection, and the client might lose the
    // answer. So read until the client has closed its side.
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

}  // namespace http
