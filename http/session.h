/// One client's connection: its requests, one after the other.
#pragma once

#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/string_body.hpp>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "http/server_core.h"

namespace http {

struct PieceBody;

/// Lives on the I/O thread. Requests go to the server's handler, their jobs to the worker threads.
/// When a client sends requests without waiting for the answers, they are answered in order.
class HttpSession final : public Connection,
                          public AnswerTaker,
                          public std::enable_shared_from_this<HttpSession> {
public:
    HttpSession(ServerCore& core, Stream stream, const Peer& peer);

    /// Enters the server's books and reads requests.
    void serve();
    /// Enters the server's books as a refusal: answers before anything is read, and closes.
    void refuse(unsigned status, std::string_view text);

    void take(unsigned exchange, Answer answer) override;
    bool quiet() const override;
    void prepareForEnd() override;
    bool onlyReads() const override { return peer_.access == Access::Read && !refusal_; }

private:
    enum class State { Idle, Reading, Working, Writing, Lingering, Closed };
    using Error = boost::beast::error_code;

    void awaitRequest();
    void readRequest();
    void readHead();
    void onEndInHead(Error error);
    void onHead(Error error);
    bool plan();
    bool isBodyTooLarge();
    std::uint64_t mostBodyBytes() const;
    void readBody();
    void onRequest(Error error);
    void readPiece();
    void onPiece(Error error);
    void onPieceTaken(std::optional<Reply> refusal);
    void onReadError(Error error);

    bool begin(bool keepAlive, bool isHead);
    void dispatch();
    void submit(Job job);
    void answer(Answer answer);
    void answer(Reply reply) { respond(std::move(reply)); }
    void answer(std::unique_ptr<EventSource> source);
    void answer(Later later);
    void endWait();
    void watchClient(std::function<void()> onGone);
    bool hasClientGone();

    void respond(Reply reply);
    void onWritten(Error error);
    void linger(std::size_t drained);
    void close();

    ServerCore& core_;
    Stream stream_;
    const Peer peer_;
    boost::beast::flat_buffer buffer_;
    std::optional<boost::beast::http::request_parser<boost::beast::http::string_body>> parser_;
    std::optional<boost::beast::http::response<boost::beast::http::string_body>> response_;
    std::shared_ptr<const void> held_;   ///< see Reply
    std::string head_;                   ///< the bytes of the request's head so far
    std::optional<Request> request_;     ///< once its head is there
    std::shared_ptr<PieceBody> pieces_;  ///< of a body that is handed over piece by piece
    State state_ = State::Idle;
    unsigned exchange_ = 0;           ///< counts requests; tells late answers from others
    std::optional<Timer> waitTimer_;  ///< made by the first answer that comes later
    Job atLimit_;                     ///< with State::Working: ends the wait
    bool refusal_ = false;
    bool keepAlive_ = false;
    bool isHead_ = false;
};

}  // namespace http
