#include "fleet/bus/messages/session.h"

#include <nlohmann/json.hpp>
#include <optional>
#include <stdexcept>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/trust/signed.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::size_t kLongestSessionRequest = 4096;

}  // namespace

std::string makeSessionNonce() {
    // As many bits, written the same way.
    return makeOrderId();
}

std::string signSessionRequest(const SessionRequest& request, const KeyPair& key) {
    if (key.publicKey() != request.key) {
        throw std::invalid_argument("an operator opens a session with their own key");
    }
    return signMessage(Purpose::OpeningSession, key,
                       textOf({{"fleet", request.fleet},
                               {"key", request.key},
                               {"url", request.url},
                               {"time", request.time.count()},
                               {"nonce", request.nonce}}));
}

SessionRequest readSessionRequest(std::string_view bytes) {
    const auto parts = bytes.size() > kLongestSessionRequest ? std::nullopt : partsOf(bytes);
    if (!parts || !parts->carried.empty()) {
        throw MessageError("this is no request for a session");
    }
    const json document = readDocument(parts->text);
    SessionRequest request;
    request.fleet = textIn(document, "fleet");
    request.key = textIn(document, "key");
    request.url = textIn(document, "url");
    request.time = momentIn(document, "time");
    request.nonce = textIn(document, "nonce");
    if (!isPublicKey(request.key, KeyKind::User)) throw MessageError("\"key\" is no key");
    if (!isOrderId(request.nonce)) throw MessageError("\"nonce\" is none");
    if (!isSigned(*parts, Purpose::OpeningSession, request.key)) {
        throw MessageError("the request is not signed by its key");
    }
    return request;
}

}  // namespace fleet
