#include "fleet/operator/centre/https_centre.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <utility>

#include "fleet/bus/messages/document.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/centre/session_opening.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr unsigned kNoSession = 401;

}  // namespace

HttpsCentre::HttpsCentre(const OperatorIdentity& identity, HttpsClient::Deadline deadline)
    : identity_(identity),
      deadline_(deadline),
      client_(readServerUrl(identity.url), ServerTrust::byAuthority(identity.authority)) {}

HttpsAnswer HttpsCentre::ask(const HttpsRequest& request) {
    try {
        return client_.ask(request,
                           std::min(deadline_, std::chrono::steady_clock::now() + answerTime_));
    } catch (const HttpsError& error) {
        throw centreFailure(error);
    }
}

void HttpsCentre::openSession() {
    session_ = sessionIn(ask(sessionOpening(identity_)));
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
    return documentIn(answer);
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
