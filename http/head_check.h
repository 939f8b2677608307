/// What is wrong with a request's head beyond what the parser refuses: ways to frame a message that
/// one reader understands otherwise than another, so that a second request can be hidden in the
/// first.
#pragma once

#include <boost/beast/http/message.hpp>
#include <optional>
#include <string_view>

#include "http/reply.h"

namespace http {

/// The answer to a head that is refused: 400 when a field goes on in the next line, an obsolete
/// form, when a message has two lengths, two hosts or chunks in a version that knows none; 501 for
/// a transfer coding other than "chunked". Nothing for all others. `head` is the bytes from the
/// request line to the empty line, `request` what the parser made of them.
std::optional<Reply> refusalOfHead(std::string_view head,
                                   const boost::beast::http::request_header<>& request);

/// Whether the extensions of a chunk, as they were sent, hold the end of a line in the eyes of some
/// readers.
bool hidesALine(std::string_view chunkExtensions);

}  // namespace http
