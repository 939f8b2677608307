#include "host/http/reply.h"

#include <nlohmann/json.hpp>

namespace host {

Reply jsonReply(unsigned status, std::string document) {
    document += '\n';
    return {status, std::move(document)};
}

Reply errorReply(unsigned status, std::string_view text) {
    using nlohmann::json;
    const json document = {{"error", text}};
    return jsonReply(status, document.dump(-1, ' ', false, json::error_handler_t::replace));
}

}  // namespace host
