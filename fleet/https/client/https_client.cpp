#include "fleet/https/client/https_client.h"

#include <atomic>
#include <boost/asio/connect.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/ssl/context.hpp>
#include <boost/asio/ssl/error.hpp>
#include <boost/asio/ssl/stream.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http/read.hpp>
#include <boost/beast/http/string_body.hpp>
#include <boost/beast/http/write.hpp>
#include <optional>
#include <utility>

#include "fleet/https/client/tls_checks.h"

namespace fleet {
namespace {

namespace asio = boost::asio;
namespace wire = boost::beast::http;
using boost::asio::ip::tcp;
using std::chrono::milliseconds;
using Error = boost::system::error_code;
using Kind = HttpsError::Kind;
using TlsStream = asio::ssl::stream<tcp::socket>;
using WireRequest = wire::request<wire::string_body>;
using WireAnswer = wire::response_parser<wire::string_body>;

constexpr unsigned kOk = 200;
constexpr std::uint32_t kLongestHeader = 16 * 1024;
/// Of an answer that are kept until they can be understood, such as the line before a chunk.
constexpr std::size_t kBufferBytes = 64UL * 1024;
/// A server may close a connection on which nothing happens for longer, just when a request comes.
constexpr std::chrono::seconds kFresh{2};

WireRequest wireRequestOf(const HttpsRequest& request, const ServerUrl& url) {
    WireRequest sent(wire::string_to_verb(request.method), request.target, 11);
    sent.set(wire::field::host, url.authority());
    sent.set(wire::field::accept, "application/json");
    if (!request.session.empty()) {
        sent.set(wire::field::authorization, "Bearer " + request.session);
    }
    if (!request.range.empty()) sent.set(wire::field::range, request.range);
    if (!request.lastEventId.empty()) sent.set("Last-Event-ID", request.lastEventId);
    if (!request.body.empty()) sent.set(wire::field::content_type, request.contentType);
    sent.body() = request.body;
    sent.prepare_payload();
    return sent;
}

HttpsAnswer answerFrom(WireAnswer& answer) {
    return {answer.get().result_int(), std::move(answer.get().body()),
            std::string(answer.get()[wire::field::retry_after])};
}

/// Whether an error tells that the other end has gone, and not that it talks nonsense.
bool isEnd(const Error& error) {
    return error == asio::error::eof || error == asio::ssl::error::stream_truncated ||
           error == wire::error::end_of_stream || error == wire::error::partial_message ||
           error.category() == asio::error::get_system_category();
}

}  // namespace

/// A connection to the server, or what makes one. Each operation runs until a deadline.
class HttpsClient::Connection {
public:
    Connection(ServerUrl url, ServerTrust trust)
        : url_(std::move(url)), trust_(std::move(trust)), tls_(asio::ssl::context::tls_client) {
        insistOnTrust(tls_.native_handle(), trust_);
    }

    bool isOpen() const { return stream_.has_value(); }
    bool isFresh() const { return std::chrono::steady_clock::now() - used_ < kFresh; }
    const std::string& authority() const { return authority_; }

    void close() {
        stream_.reset();
        buffer_.clear();
    }

    void open(Deadline deadline) {
        close();
        connect(deadline);
        SSL* const session = stream_->native_handle();
        insistOnHost(session, url_.host);
        const Error error = run(deadline, [this](auto done) {
            stream_->async_handshake(asio::ssl::stream_base::client, done);
        });
        if (error) throw notTrusted(session, error);
        authority_ = authorityOf(session);
    }

    /// Nothing if the connection was at its end before an answer began.
    std::optional<HttpsAnswer> exchange(const WireRequest& request, std::size_t mostBytes,
                                        Deadline deadline) {
        Error error = run(deadline, [&](auto done) { wire::async_write(*stream_, request, done); });
        WireAnswer answer;
        answer.header_limit(kLongestHeader);
        answer.body_limit(mostBytes);
        // The head by itself: a parser that goes on to the body within one piece of bytes forgets
        // that the body is too long.
        if (!error) {
            error = run(deadline, [&](auto done) {
                wire::async_read_header(*stream_, buffer_, answer, done);
            });
        }
        if (!error) {
            error = run(deadline,
                        [&](auto done) { wire::async_read(*stream_, buffer_, answer, done); });
        }
        if (error && isEnd(error) && !answer.got_some()) return std::nullopt;
        if (error) throw unusable(error);
        used_ = std::chrono::steady_clock::now();
        if (!answer.keep_alive()) close();
        return answerFrom(answer);
    }

    /// As HttpsClient::read(), on a connection that was just opened.
    HttpsAnswer read(const WireRequest& request, std::size_t mostBytes, Deadline deadline,
                     milliseconds quiet, const TakePiece& take, const OnBegin& onBegin) {
        Error error = run(deadline, [&](auto done) { wire::async_write(*stream_, request, done); });
        WireAnswer answer;
        answer.header_limit(kLongestHeader);
        answer.body_limit(mostBytes);
        if (!error) {
            error = run(deadline, [&](auto done) {
                wire::async_read_header(*stream_, buffer_, answer, done);
            });
        }
        if (error) throw unusable(error);
        const unsigned status = answer.get().result_int();
        if (status == kOk) {
            answer.body_limit(boost::none);
            if (onBegin) onBegin(std::string(answer.get()["Last-Event-ID"]));
            readPieces(answer, quiet, take);
            return {status, {}};
        }
        error =
            run(deadline, [&](auto done) { wire::async_read(*stream_, buffer_, answer, done); });
        if (error) throw unusable(error);
        return answerFrom(answer);
    }

    void cancel() {
        isCancelled_ = true;
        asio::post(context_, [] {});  // lets a wait look at it
    }

    HttpsError failure(Kind kind, const std::string& what) const {
        return {kind, "the server at https://" + url_.authority() + " " + what};
    }

private:
    void readPieces(WireAnswer& answer, milliseconds quiet, const TakePiece& take) {
        answer.eager(true);
        std::string& body = answer.get().body();
        for (;;) {
            if (!body.empty() && !take(std::exchange(body, {}))) return;
            if (answer.is_done()) return;
            const Error error = run(std::chrono::steady_clock::now() + quiet, [&](auto done) {
                wire::async_read_some(*stream_, buffer_, answer, done);
            });
            // Such an answer is as long as its connection: its end is no failure.
            const bool isOver = error && isEnd(error);
            if (error && !isOver) throw unusable(error);
            if (!isOver) continue;
            if (!body.empty()) take(body);
            return;
        }
    }

    void connect(Deadline deadline) {
        tcp::resolver resolver(context_);
        tcp::resolver::results_type found;
        Error error = run(deadline, [&](auto done) {
            resolver.async_resolve(url_.host, url_.port,
                                   [&found, done](const Error& result, const auto& addresses) {
                                       found = addresses;
                                       done(result);
                                   });
        });
        if (error) throw failure(Kind::NotReached, "cannot be found: " + error.message());
        stream_.emplace(context_, tls_);
        error = run(deadline,
                    [&](auto done) { asio::async_connect(stream_->next_layer(), found, done); });
        if (error) throw failure(Kind::NotReached, "cannot be reached: " + error.message());
        stream_->next_layer().set_option(tcp::no_delay(true), error);
    }

    /// Starts an operation and waits for its end. The operation's handler refers to what the caller
    /// has, so when the deadline has passed, or it was cancelled, it is run out before this throws.
    template <typename Start>
    Error run(Deadline deadline, Start start) {
        bool ended = false;
        Error result;
        start([&](const Error& error, auto&&...) {
            result = error;
            ended = true;
        });
        context_.restart();
        while (!ended && !isCancelled_ && context_.run_one_until(deadline) != 0) {
        }
        if (ended) return result;
        if (stream_) {
            Error ignored;
            stream_->next_layer().close(ignored);
        }
        context_.restart();
        context_.run();
        close();
        if (isCancelled_) throw failure(Kind::Cancelled, "is asked no more");
        throw failure(Kind::TooLate, "has not answered in time");
    }

    HttpsError notTrusted(const SSL* session, const Error& error) const {
        const std::string reason = reasonOfDistrust(session);
        if (!reason.empty()) return failure(Kind::NotTrusted, "is not trusted: " + reason);
        return failure(Kind::NotReached, "broke the handshake off: " + error.message());
    }

    HttpsError unusable(const Error& error) const {
        if (isEnd(error)) return failure(Kind::NoAnswer, "broke the connection");
        if (error == wire::error::body_limit || error == wire::error::header_limit ||
            error == wire::error::buffer_overflow) {
            return failure(Kind::WrongAnswer, "sends more than it should");
        }
        return failure(Kind::WrongAnswer, "sends what is no answer: " + error.message());
    }

    const ServerUrl url_;
    const ServerTrust trust_;
    asio::io_context context_;
    asio::ssl::context tls_;
    std::optional<TlsStream> stream_;
    boost::beast::flat_buffer buffer_{kBufferBytes};
    std::string authority_;
    std::chrono::steady_clock::time_point used_{};
    std::atomic<bool> isCancelled_{false};
};

HttpsClient::HttpsClient(ServerUrl url, ServerTrust trust)
    : url_(std::move(url)), connection_(std::make_unique<Connection>(url_, std::move(trust))) {}
HttpsClient::~HttpsClient() = default;

HttpsAnswer HttpsClient::ask(const HttpsRequest& request, Deadline deadline) {
    const WireRequest sent = wireRequestOf(request, url_);
    const bool isRepeatable = request.method == "GET";
    bool isReused = connection_->isOpen() && (isRepeatable || connection_->isFresh());
    try {
        for (;;) {
            if (!isReused) connection_->open(deadline);
            std::optional<HttpsAnswer> answer =
                connection_->exchange(sent, request.mostBytes, deadline);
            if (answer) return std::move(*answer);
            if (!isReused || !isRepeatable) {
                throw connection_->failure(Kind::NoAnswer, "broke the connection");
            }
            isReused = false;
        }
    } catch (const HttpsError&) {
        connection_->close();
        throw;
    }
}

HttpsAnswer HttpsClient::read(const HttpsRequest& request, Deadline deadline,
                              std::chrono::milliseconds quiet, const TakePiece& take,
                              const OnBegin& onBegin) {
    // A connection of its own: what was asked before may have left one that has gone.
    const struct Closer {
        Connection& connection;
        ~Closer() { connection.close(); }
    } closer{*connection_};
    connection_->open(deadline);
    return connection_->read(wireRequestOf(request, url_), request.mostBytes, deadline, quiet, take,
                             onBegin);
}

void HttpsClient::cancel() {
    connection_->cancel();
}

const std::string& HttpsClient::authority() const {
    return connection_->authority();
}

}  // namespace fleet
