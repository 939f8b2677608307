#include "http/event_stream.h"

#include <sys/socket.h>

#include <boost/asio/buffer.hpp>
#include <boost/asio/write.hpp>
#include <boost/beast/http/write.hpp>
#include <cerrno>
#include <utility>

namespace http {

namespace net = boost::asio;
namespace wire = boost::beast::http;

namespace {

bool isTcp(const Stream& stream) {
    Stream::endpoint_type here = stream.socket().local_endpoint();
    return here.data()->sa_family != AF_UNIX;
}

}  // namespace

EventStream::EventStream(ServerCore& core, Stream stream, std::unique_ptr<EventSource> source,
                         bool clientOnlyReads)
    : core_(core),
      stream_(std::move(stream)),
      source_(std::move(source)),
      onlyReads_(clientOnlyReads),
      heartbeat_(core.io) {}

EventStream::~EventStream() {
    if (!closed_) --core_.counts.streams;
}

void EventStream::start() {
    core_.add(shared_from_this());
    ++core_.counts.streams;
    closed_ = false;
    stream_.expires_never();
    awaitHangUp();
    if (isTcp(stream_)) awaitEndOfInput();
    awaitHeartbeat();
    writeHead();
    source_->start([mailbox = core_.mailbox, weak = weak_from_this()] {
        mailbox->post([weak] {
            if (const auto self = weak.lock()) self->pump();
        });
    });
}

bool EventStream::quiet() const {
    return closed_ || (!writing_ && source_->empty());
}

/// Does not wait for the end of input: a client that has shut down its sending side may still read.
/// Only when both sides are closed is the socket in an error state.
void EventStream::awaitHangUp() {
    stream_.socket().async_wait(net::socket_base::wait_error,
                                [self = shared_from_this()](Error) { self->close(); });
}

/// A client that closes a TCP connection looks at first like one that has ended its sending only,
/// and those of TCP do not do that.
void EventStream::awaitEndOfInput() {
    stream_.socket().async_wait(
        net::socket_base::wait_read, [self = shared_from_this()](Error error) {
            if (error || self->closed_) return;
            char piece[4096];  // what a client sends behind its request is of no use
            const ssize_t got =
                ::recv(self->stream_.socket().native_handle(), piece, sizeof piece, MSG_DONTWAIT);
            const bool isOver = got == 0 || (got < 0 && errno != EAGAIN && errno != EINTR);
            if (isOver) return self->close();
            self->awaitEndOfInput();
        });
}

void EventStream::awaitHeartbeat() {
    heartbeat_.expires_after(core_.limits.heartbeat);
    heartbeat_.async_wait([self = shared_from_this()](Error error) {
        if (error || self->closed_) return;
        if (!self->writing_) self->write(std::string(kHeartbeat));
        self->awaitHeartbeat();
    });
}

void EventStream::writeHead() {
    limitWrite();
    head_.result(wire::status::ok);
    head_.version(11);
    head_.set(wire::field::cache_control, "no-cache");
    for (const auto& [name, value] : core_.handler.commonFields())
        head_.set(name, value);
    head_.set(wire::field::content_type, "text/event-stream");
    const std::string position = source_->position();
    if (!position.empty()) head_.set("Last-Event-ID", position);
    head_.keep_alive(false);  // the stream is as long as the connection
    headWriter_.emplace(head_);
    wire::async_write_header(
        stream_, *headWriter_,
        [self = shared_from_this()](Error error, std::size_t) { self->onWritten(error); });
}

void EventStream::write(std::string text) {
    limitWrite();
    out_ = std::move(text);
    net::async_write(
        stream_, net::buffer(out_),
        [self = shared_from_this()](Error error, std::size_t) { self->onWritten(error); });
}

void EventStream::limitWrite() {
    writing_ = true;
    if (core_.limits.streamTime.count() > 0) stream_.expires_after(core_.limits.streamTime);
}

void EventStream::pump() {
    if (writing_ || closed_) return;
    std::string text = source_->take();
    if (!text.empty()) return write(std::move(text));
    if (source_->over()) close();
}

void EventStream::onWritten(Error error) {
    writing_ = false;
    stream_.expires_never();
    std::string().swap(out_);  // a large batch does not stay allocated
    if (error) return close();
    pump();
}

void EventStream::close() {
    if (closed_) return;
    closed_ = true;
    stream_.close();
    heartbeat_.cancel();
    source_.reset();
    --core_.counts.streams;
    core_.remove(this);
}

}  // namespace http
