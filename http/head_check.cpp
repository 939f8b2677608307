#include "http/head_check.h"

#include <boost/beast/core/string.hpp>

namespace http {
namespace {

namespace beast = boost::beast;
using beast::http::field;

/// Whether a line begins with a blank.
bool isFolded(std::string_view head) {
    for (std::size_t end = head.find('\n'); end != std::string_view::npos;
         end = head.find('\n', end + 1)) {
        if (end + 1 < head.size() && (head[end + 1] == ' ' || head[end + 1] == '\t')) return true;
    }
    return false;
}

bool isNumber(beast::string_view text) {
    return !text.empty() && text.find_first_not_of("0123456789") == beast::string_view::npos;
}

std::optional<Reply> refusalOfFraming(const beast::http::request_header<>& request) {
    const auto lengths = request.count(field::content_length);
    if (lengths > 1 || (lengths == 1 && !isNumber(request[field::content_length]))) {
        return errorReply(400, "a request has one Content-Length, which is a number");
    }
    const auto codings = request.count(field::transfer_encoding);
    if (codings == 0) return std::nullopt;
    constexpr unsigned kFirstWithChunks = 11;
    if (request.version() < kFirstWithChunks) {
        return errorReply(400, "HTTP/1.0 knows no Transfer-Encoding");
    }
    if (codings > 1 || !beast::iequals(request[field::transfer_encoding], "chunked")) {
        return errorReply(501, "the host knows no Transfer-Encoding but chunked");
    }
    if (request.count(field::content_length) > 0) {
        return errorReply(400, "a request has a Content-Length or is chunked, not both");
    }
    return std::nullopt;
}

}  // namespace

std::optional<Reply> refusalOfHead(std::string_view head,
                                   const beast::http::request_header<>& request) {
    if (isFolded(head)) {
        return errorReply(400, "a header field goes on in a second line; that form is obsolete");
    }
    if (request.count(field::host) > 1) return errorReply(400, "a request has one Host");
    return refusalOfFraming(request);
}

bool hidesALine(std::string_view chunkExtensions) {
    return chunkExtensions.find_first_of("\r\n") != std::string_view::npos;
}

}  // namespace http
