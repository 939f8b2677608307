/// One client's connection while events are sent on it.
#pragma once

#include <boost/beast/http/empty_body.hpp>
#include <boost/beast/http/serializer.hpp>
#include <memory>
#include <optional>
#include <string>

#include "http/server_core.h"

namespace http {

/// Sends what its source has, in order, and a heartbeat when there has been nothing for a while. It
/// ends when the client closes its connection, does not take a piece within
/// ServerLimits::streamTime, or the server ends; there is no other time-out.
class EventStream final : public Connection, public std::enable_shared_from_this<EventStream> {
public:
    EventStream(ServerCore& core, Stream stream, std::unique_ptr<EventSource> source,
                bool clientOnlyReads);
    ~EventStream() override;

    /// Enters the server's books and sends the head, then the events.
    void start();

    bool quiet() const override;
    void prepareForEnd() override {}
    bool onlyReads() const override { return onlyReads_; }

private:
    using Error = boost::beast::error_code;
    using Head = boost::beast::http::response<boost::beast::http::empty_body>;

    void awaitHangUp();
    void awaitEndOfInput();
    void awaitHeartbeat();
    void writeHead();
    void write(std::string text);
    void limitWrite();
    void pump();
    void onWritten(Error error);
    void close();

    ServerCore& core_;
    Stream stream_;
    std::unique_ptr<EventSource> source_;
    const bool onlyReads_;
    Timer heartbeat_;
    Head head_;
    std::optional<boost::beast::http::response_serializer<boost::beast::http::empty_body>>
        headWriter_;
    std::string out_;
    bool writing_ = false;
    bool closed_ = true;
};

}  // namespace http
