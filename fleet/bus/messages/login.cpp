#include "fleet/bus/messages/login.h"

#include <nlohmann/json.hpp>
#include <stdexcept>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/trust/signed.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::size_t kLongestLogin = 4096;
constexpr std::size_t kMostCentresOfFleet = 16;

}  // namespace

std::string signLogin(const LoginRequest& request, const KeyPair& key) {
    if (key.publicKey() != request.key) {
        throw std::invalid_argument("an operator logs in with their own key");
    }
    return signMessage(
        Purpose::LoggingIn, key,
        textOf({{"fleet", request.fleet}, {"token", request.token}, {"key", request.key}}));
}

LoginRequest readLogin(std::string_view bytes) {
    const auto parts = bytes.size() > kLongestLogin ? std::nullopt : partsOf(bytes);
    if (!parts || !parts->carried.empty()) throw MessageError("this is no request to log in");
    const json document = readDocument(parts->text);
    LoginRequest request;
    request.fleet = textIn(document, "fleet");
    request.token = textIn(document, "token");
    request.key = textIn(document, "key");
    if (!isPublicKey(request.key, KeyKind::User)) throw MessageError("\"key\" is no key");
    if (!isSigned(*parts, Purpose::LoggingIn, request.key)) {
        throw MessageError("the request is not signed by its key");
    }
    return request;
}

std::string loginAnswerText(const LoginAnswer& answer) {
    json document = {{"centres", json::array()}};
    for (const std::string& centre : answer.centres)
        document["centres"].push_back(base64Of(centre));
    if (answer.certificate) document["certificate"] = base64Of(*answer.certificate);
    return textOf(document);
}

LoginAnswer readLoginAnswer(std::string_view text) {
    const json document = readDocument(text);
    LoginAnswer answer;
    if (document.contains("certificate")) {
        answer.certificate = bytesOfBase64(textIn(document, "certificate"));
    }
    for (const std::string& centre : textsIn(document, "centres", kMostCentresOfFleet))
        answer.centres.push_back(bytesOfBase64(centre));
    return answer;
}

}  // namespace fleet
