/// One complete HTTP response, before it becomes bytes.
#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace http {

/// Names and values of header fields.
using Fields = std::vector<std::pair<std::string, std::string>>;

struct Reply {
    unsigned status = 200;
    std::string body;                       ///< bytes as they are sent
    std::string type = "application/json";  ///< Content-Type; not sent with status 204 or 304
    Fields fields{};                        ///< further header fields
    /// Something that lives until the reply has been sent, or cannot be; may be null.
    std::shared_ptr<const void> held{};
};

/// A reply whose body is this JSON text and a line feed.
Reply jsonReply(unsigned status, std::string document);

/// {"error": text}. Bytes of `text` that are not UTF-8 are replaced, so it may quote the client.
Reply errorReply(unsigned status, std::string_view text);

/// The same with "guard", the name of the guard that refused the request, and "hint", the way out,
/// which is left out if it is empty.
Reply guardReply(unsigned status, std::string_view text, std::string_view guard,
                 std::string_view hint);

}  // namespace http
