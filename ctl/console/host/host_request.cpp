#include "ctl/console/host/host_request.h"

#include <algorithm>
#include <boost/beast/core/string.hpp>
#include <boost/beast/http.hpp>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "ctl/client/http/bounded_json.h"
#include "ctl/client/http/transport.h"
#include "ctl/console/refusals.h"
#include "ctl/console/request_check.h"

namespace console {
namespace {

namespace wire = boost::beast::http;
using ctl::Deadline;
using ctl::Failure;
using ctl::Transport;

constexpr std::string_view kStreamType = "text/event-stream";

wire::request<wire::string_body> requestFor(const http::Request& given) {
    wire::request<wire::string_body> request;
    request.method_string(given.method);
    request.target(given.target);
    request.version(11);
    request.set(wire::field::host, "localhost");
    request.set(wire::field::user_agent, "zavctl-console");
    const std::pair<const char*, std::string_view> passed[] = {
        {"Content-Type", fieldOf(given, "Content-Type")},
        {"Accept", fieldOf(given, "Accept")},
        {"Last-Event-ID", given.lastEventId}};
    for (const auto& [name, value] : passed) {
        if (!value.empty())
            request.set(name, boost::beast::string_view(value.data(), value.size()));
    }
    request.keep_alive(false);
    request.body() = given.body;
    request.prepare_payload();
    return request;
}

/// What a browser neither runs nor lays out. The page's policy trusts what comes from its own
/// address, and a host is no part of the page.
std::string harmlessType(const std::string& type) {
    for (const std::string_view known : {"application/json", "text/plain", "text/event-stream"}) {
        const std::string_view rest =
            std::string_view(type).substr(std::min(type.size(), known.size()));
        const bool isIt = type.compare(0, known.size(), known) == 0;
        if (isIt && (rest.empty() || rest.front() == ';' || rest.front() == ' ')) return type;
    }
    return "application/octet-stream";
}

/// One request and its answer, on a connection of its own.
class Exchange {
public:
    Exchange(const ctl::HostAddress& host, bool isHead)
        : transport_(host.socket),
          deadline_(ctl::deadlineIn(host.timeout)),
          parser_(std::make_unique<BegunStream::Parser>()) {
        parser_->skip(isHead);
        // "No limit" would refuse every answer that gives its length.
        parser_->body_limit(std::numeric_limits<std::uint64_t>::max());
    }

    void begin(const wire::request<wire::string_body>& request) {
        Transport::Error error;
        transport_.runInTime(deadline_, {}, error, [&](auto done) {
            wire::async_write(transport_.socket(), request, done);
        });
        // A host that refuses a request early answers without having read everything.
        transport_.runInTime(deadline_, {}, error, [&](auto done) {
            wire::async_read_header(transport_.socket(), buffer_, *parser_, done);
        });
        if (error) throw transport_.broken(error);
    }

    bool isStream() const {
        return parser_->get().result() == wire::status::ok && !parser_->is_done() &&
               field("Content-Type").substr(0, kStreamType.size()) == kStreamType;
    }

    /// Nothing may follow.
    BegunStream stream() {
        const std::string position = field("Last-Event-ID");
        return {sys::FileDescriptor(transport_.socket().release()), std::move(buffer_),
                std::move(parser_), position};
    }

    /// The rest of an answer that is no stream, as far as there is room for it.
    http::Reply reply(const AnswerRoom& room) {
        const unsigned status = parser_->get().result_int();
        // A browser would take the one for half an answer and the other for the console's own.
        if (status < 200 || status == 401) {
            throw Failure(ctl::kNoHost, "the host answers with the status " +
                                            std::to_string(status) + ", which makes no sense");
        }
        const std::shared_ptr<AnswerRoom::Share> share = room.share();
        std::optional<std::string> body = restOfBody(*share);
        if (!body) return noRoomForAnswer();
        http::Reply reply{status, std::move(*body), harmlessType(field("Content-Type"))};
        reply.held = share;
        for (const char* const name : {"Retry-After", "Allow"}) {
            if (const std::string value = field(name); !value.empty()) {
                reply.fields.emplace_back(name, value);
            }
        }
        return reply;
    }

private:
    std::string field(const char* name) const { return std::string(parser_->get()[name]); }

    /// Answers of this length are held however little room there is: a browser that is told to ask
    /// again sends anew what the host has accepted.
    static constexpr std::size_t kAlwaysHeld = std::size_t{64} * 1024;

    /// Nothing if there is no room for it.
    std::optional<std::string> restOfBody(AnswerRoom::Share& share) {
        std::string body;
        char piece[16 * 1024];
        while (!parser_->is_done()) {
            parser_->get().body().data = piece;
            parser_->get().body().size = sizeof piece;
            Transport::Error error;
            transport_.runInTime(deadline_, {}, error, [&](auto done) {
                wire::async_read(transport_.socket(), buffer_, *parser_, done);
            });
            if (error && error != wire::error::need_buffer) throw transport_.broken(error);
            const std::size_t length = sizeof piece - parser_->get().body().size;
            if (body.size() + length > kAlwaysHeld && !share.grow(length)) return std::nullopt;
            body.append(piece, length);
            if (body.size() > ctl::kMostBytes) {
                throw Failure(ctl::kNoHost, "the host's answer is larger than 64 MiB");
            }
        }
        return body;
    }

    Transport transport_;
    const Deadline deadline_;
    boost::beast::flat_buffer buffer_;
    std::unique_ptr<BegunStream::Parser> parser_;
};

}  // namespace

http::Answer passOn(const http::Request& request, const ctl::HostAddress& host,
                    HostStreams& streams, const AnswerRoom& room) {
    try {
        Exchange exchange(host, request.method == "HEAD");
        exchange.begin(requestFor(request));
        if (exchange.isStream()) return streams.carry(exchange.stream());
        return exchange.reply(room);
    } catch (const Failure& failure) {
        return replyTo(failure);
    }
}

}  // namespace console
