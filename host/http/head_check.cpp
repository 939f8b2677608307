#include "host/http/head_check.h"

#include <boost/beast/core/string.hpp>

namespace host {
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

}  // namespace

std::optional<Reply> refusalOfHead(std::string_view head, const beast::http::fields& fields) {
    if (isFolded(head)) {
        return errorReply(400, "a header field goes on in a second line; that form is obsolete");
    }
    const auto codings = fields.count(field::transfer_encoding);
    if (codings == 0) return std::nullopt;
    if (codings > 1 || !beast::iequals(fields[field::transfer_encoding], "chunked")) {
        return errorReply(501, "the host knows no Transfer-Encoding but chunked");
    }
    if (fields.count(field::content_length) > 0) {
        return errorReply(400, "a request has a Content-Length or is chunked, not both");
    }
    return std::nullopt;
}

}  // namespace host
