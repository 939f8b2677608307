/// What is wrong with a request's head beyond what the parser refuses: ways to frame a message that
/// one reader understands otherwise than another, so that a second request can be hidden in the
/// first.
#pragma once

#include <boost/beast/http/fields.hpp>
#include <optional>
#include <string_view>

#include "host/http/reply.h"

namespace host {

/// The answer to a head that is refused: 400 when a field goes on in the next line, an obsolete
/// form, or when a message has two lengths; 501 for a transfer coding other than "chunked". Nothing
/// for all others. `head` is the bytes from the request line to the empty line, `fields` what the
/// parser made of them.
std::optional<Reply> refusalOfHead(std::string_view head, const boost::beast::http::fields& fields);

}  // namespace host
