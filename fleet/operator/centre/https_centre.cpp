#include "fleet/operator/centre/https_centre.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <utility>

#include "ctl/client/http/bounded_json.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/session.h"
#include "fleet/operator/centre/answers.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr unsigned kNoSession = 401;

bool isSuccess(const HttpsAnswer& answer) {
    return answer.status >= 200 && answer.status < 300;
}

json documentOf(const HttpsAnswer& answer) {
    if (!isSuccess(answer)) throw centreRefusal(answer.status, answer.body);
    ctl::ParsedJson parsed = ctl::parseBounded(answer.body);
    if (parsed.fault != nullptr) throw senseless(std::string("it ") + parsed.fault);
    if (!parsed.document.is_object()) throw senseless("it is no JSON object");
    return std::move(parsed.document);
}

}  // namespace

HttpsCentre::HttpsCentre(const OperatorIdentity& identity, HttpsClient::Deadline deadline)
    : identity_(identity),
      deadline_(deadline),
      client_(readServerUrl(identity.url), ServerTrust::byAuthority(identity.authority)) {}

HttpsAnswer HttpsCentre::ask(const HttpsRequest& request) {
    try {
        return client_.ask(request,
                           std::min(deadline_, std::chrono::steady_clock::now() + kAnswerTime));
    } catch (const HttpsError& error) {
        throw centreFailure(error);
    }
}

void HttpsCentre::openSession() {
    const SessionRequest wanted{identity_.fleet, identity_.key.publicKey(), identity_.url,
                                wallClock(), makeSessionNonce()};
    const json answer =
        documentOf(ask({"POST", "/v1/sessions", signSessionRequest(wanted, identity_.key),
                        "application/octet-stream"}));
    session_ = memberText(answer, "session");
    const bool isToken =
        !session_.empty() &&
        std::all_of(session_.begin(), session_.end(), [](char c) { return c > ' ' && c < '\x7f'; });
    if (!isToken) throw senseless("it has no session");
}

json HttpsCentre::request(HttpsRequest request) {
    const bool isNew = session_.empty();
    if (isNew) openSession();
    request.session = session_;
    HttpsAnswer answer = ask(request);
    if (answer.status == kNoSession && !isNew) {
        // It has ended meanwhile. What was refused for that has not been done.
        openSession();
        request.session = session_;
        answer = ask(request);
    }
    return documentOf(answer);
}

json HttpsCentre::get(const std::string& target) {
    return request({"GET", target});
}

json HttpsCentre::post(const std::string& target, const json& body) {
    return request({"POST", target, textOf(body)});
}

json HttpsCentre::postBytes(const std::string& target, std::string bytes) {
    return request({"POST", target, std::move(bytes), "application/octet-stream"});
}

}  // namespace fleet
