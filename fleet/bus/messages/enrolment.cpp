#include "fleet/bus/messages/enrolment.h"

#include <nlohmann/json.hpp>
#include <stdexcept>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/trust/signed.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::size_t kLongestRequest = 4096;
constexpr std::size_t kLongestMachine = 128;
constexpr std::size_t kMostUrls = 64;
constexpr std::size_t kMostCentres = 16;

EnrolmentRequest requestIn(std::string_view text) {
    const json document = readDocument(text);
    EnrolmentRequest request;
    request.fleet = textIn(document, "fleet");
    request.token = textIn(document, "token");
    request.host = textIn(document, "host");
    request.signing = textIn(document, "signing");
    request.machine = textIn(document, "machine");
    return request;
}

void checkEnrolment(const EnrolmentRequest& request) {
    if (!isPublicKey(request.host, KeyKind::User)) throw MessageError("\"host\" is no key");
    if (!isPublicKey(request.signing, KeyKind::User)) throw MessageError("\"signing\" is no key");
    // A bus can have the one key sign anything, as a connection's nonce.
    if (request.host == request.signing) throw MessageError("the two keys are the same");
    if (request.machine.empty() || request.machine.size() > kLongestMachine) {
        throw MessageError("\"machine\" is no identity of a machine");
    }
}

}  // namespace

std::string signEnrolment(const EnrolmentRequest& request, const KeyPair& bus,
                          const KeyPair& signing) {
    if (bus.publicKey() != request.host || signing.publicKey() != request.signing) {
        throw std::invalid_argument("a host enrols with its own keys");
    }
    const std::string text = textOf({{"fleet", request.fleet},
                                     {"token", request.token},
                                     {"host", request.host},
                                     {"signing", request.signing},
                                     {"machine", request.machine}});
    return signMessage(Purpose::Enrolling, signing, text,
                       signMessage(Purpose::Enrolling, bus, text));
}

EnrolmentRequest readEnrolment(std::string_view bytes) {
    const auto outer = bytes.size() > kLongestRequest ? std::nullopt : partsOf(bytes);
    const auto inner = outer ? partsOf(outer->carried) : std::nullopt;
    if (!inner || inner->text != outer->text || !inner->carried.empty()) {
        throw MessageError("this is no request to join a fleet");
    }
    EnrolmentRequest request = requestIn(outer->text);
    checkEnrolment(request);
    if (!isSigned(*outer, Purpose::Enrolling, request.signing) ||
        !isSigned(*inner, Purpose::Enrolling, request.host)) {
        throw MessageError("the request is not signed by its keys");
    }
    return request;
}

std::string enrolmentAnswerText(const EnrolmentAnswer& answer) {
    json centres = json::array();
    for (const std::string& centre : answer.centres)
        centres.push_back(base64Of(centre));
    return textOf({{"name", answer.name},
                   {"token", answer.userToken},
                   {"bus", answer.busUrls},
                   {"server", answer.serverName},
                   {"authority", answer.authority},
                   {"centres", centres}});
}

EnrolmentAnswer readEnrolmentAnswer(std::string_view text) {
    const json document = readDocument(text);
    EnrolmentAnswer answer;
    answer.name = textIn(document, "name");
    answer.userToken = textIn(document, "token");
    answer.busUrls = textsIn(document, "bus", kMostUrls);
    answer.serverName = textIn(document, "server");
    answer.authority = textIn(document, "authority");
    for (const std::string& centre : textsIn(document, "centres", kMostCentres))
        answer.centres.push_back(bytesOfBase64(centre));
    return answer;
}

}  // namespace fleet
