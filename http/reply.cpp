#include "http/reply.h"

#include <nlohmann/json.hpp>

namespace http {
namespace {

Reply documentReply(unsigned status, const nlohmann::ordered_json& document) {
    using nlohmann::json;
    return jsonReply(status, document.dump(-1, ' ', false, json::error_handler_t::replace));
}

}  // namespace

Reply jsonReply(unsigned status, std::string document) {
    document += '\n';
    return {status, std::move(document)};
}

Reply errorReply(unsigned status, std::string_view text) {
    return documentReply(status, {{"error", text}});
}

Reply guardReply(unsigned status, std::string_view text, std::string_view guard,
                 std::string_view hint) {
    nlohmann::ordered_json document = {{"error", text}, {"guard", guard}};
    if (!hint.empty()) document["hint"] = hint;
    return documentReply(status, document);
}

}  // namespace http
