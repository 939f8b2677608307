/// One client's connection: its requests, one after the other.
#pragma once

#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/string_body.hpp>
#include <memory>
#include <optional>
#include <string>

#include "host/http/reply.h"
#include "host/http/server_core.h"

namespace host {

/// Lives on the I/O thread; queries and subscriptions are handed to the worker threads and come
/// back. Requests that a client sends without waiting for answers are read and answered in order.
class HttpSession final : public Connection, public std::enable_shared_from_this<HttpSession> {
public:
    HttpSession(ServerCore& core, Stream stream);

    /// Enters the server's books and reads requests.
    void serve();
    /// Enters the server's books as a refusal: answers before anything is read, and closes.
    void refuse(unsigned status, std::string_view text);

    bool quiet() const override;
    void prepareForEnd() override;

private:
    enum class State { Idle, Reading, Working, Writing, Lingering, Closed };
    using Error = boost::beast::error_code;

    void awaitRequest();
    void readRequest();
    void onHead(Error error);
    void readBody();
    void onRequest(Error error);
    void onReadError(Error error);

    void dispatch();
    void answer(const TablesRequest&);
    void answer(const HealthRequest&);
    void answer(const QueryRequest& query);
    void answer(const EventsRequest& events);
    void answer(const Refusal& refusal);
    void answerOverload();
    void becomeStream(const std::shared_ptr<class EventStream>& events, bool live);

    void respond(Reply reply);
    void onWritten(Error error);
    void linger(std::size_t drained);
    void close();

    ServerCore& core_;
    Stream stream_;
    boost::beast::flat_buffer buffer_;
    std::optional<boost::beast::http::request_parser<boost::beast::http::string_body>> parser_;
    std::optional<boost::beast::http::response<boost::beast::http::string_body>> response_;
    State state_ = State::Idle;
    bool refusal_ = false;
    bool keepAlive_ = false;
    bool isHead_ = false;
};

}  // namespace host
