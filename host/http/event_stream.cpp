#include "host/http/event_stream.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/write.hpp>
#include <boost/beast/http/write.hpp>
#include <utility>

#include "host/tables/json_documents.h"

namespace host {

namespace net = boost::asio;
namespace http = boost::beast::http;

EventStream::EventStream(ServerCore& core, const oxa::Table& table) : core_(core), table_(table) {}

bool EventStream::subscribe(const std::vector<oxa::Predicate>& where) {
    queue_ = std::make_shared<EventQueue>(core_.limits.events, [this, weak = weak_from_this()] {
        net::post(core_.io, [weak] {
            if (const auto self = weak.lock()) self->pump();
        });
    });
    subscription_ = oxa::subscribe(
        table_.name, where, [queue = queue_](const oxa::Rows& rows) { return queue->push(rows); });
    return subscription_ != nullptr;
}

void EventStream::start(Stream stream) {
    core_.add(shared_from_this());
    ++core_.streams;
    stream_.emplace(std::move(stream));
    stream_->expires_never();
    awaitHangUp();
    writeHead();
}

void EventStream::retire() {
    core_.retired.push_back(std::move(subscription_));
}

bool EventStream::quiet() const {
    return closed_ || (!writing_ && queue_->empty());
}

/// Reading would not do: a client that has only ended its own side, having nothing more to say,
/// still reads. Both sides closed is an error state of the socket.
void EventStream::awaitHangUp() {
    stream_->socket().async_wait(net::socket_base::wait_error,
                                 [self = shared_from_this()](Error) { self->close(); });
}

void EventStream::writeHead() {
    writing_ = true;
    head_.result(http::status::ok);
    head_.version(11);
    head_.set(http::field::content_type, "text/event-stream");
    head_.set(http::field::cache_control, "no-cache");
    head_.keep_alive(false);  // the stream is as long as the connection
    headWriter_.emplace(head_);
    http::async_write_header(
        *stream_, *headWriter_,
        [self = shared_from_this()](Error error, std::size_t) { self->onWritten(error); });
}

void EventStream::pump() {
    if (!stream_ || writing_ || closed_) return;
    const EventQueue::Batch batch = queue_->take();
    if (batch.empty()) return;
    out_ = render(batch);
    writing_ = true;
    net::async_write(
        *stream_, net::buffer(out_),
        [self = shared_from_this()](Error error, std::size_t) { self->onWritten(error); });
}

void EventStream::onWritten(Error error) {
    writing_ = false;
    std::string().swap(out_);
    if (error) return close();
    pump();
}

std::string EventStream::render(const EventQueue::Batch& batch) const {
    std::string text;
    for (std::size_t i = 0; i < batch.rows.count(); ++i) {
        text += "data: ";
        text += rowDocument(table_, rowOf(batch.rows, i), core_.router.codePage());
        text += "\n\n";
    }
    if (batch.lost > 0) {
        text += "event: overflow\ndata: {\"lost\":" + std::to_string(batch.lost) + "}\n\n";
    }
    return text;
}

void EventStream::close() {
    if (closed_) return;
    closed_ = true;
    stream_->close();
    if (core_.ending) {
        retire();
    } else {
        subscription_.reset();
    }
    --core_.streams;
    core_.remove(this);
}

}  // namespace host
