#include "fleet/operator/console/outputs/output_centre.h"

#include <chrono>
#include <nlohmann/json.hpp>
#include <utility>

#include "fleet/bus/messages/document.h"
#include "fleet/https/client/https_error.h"
#include "fleet/operator/centre/answers.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr unsigned kTooMany = 429;
constexpr unsigned kCentresFault = 500;

}  // namespace

json OutputCentre::get(const std::string& target) {
    return ask({"GET", target});
}

json OutputCentre::post(const std::string& target, const json& body) {
    return ask({"POST", target, textOf(body)});
}

json OutputCentre::postBytes(const std::string& target, std::string bytes) {
    return ask({"POST", target, std::move(bytes), "application/octet-stream"});
}

json OutputCentre::ask(HttpsRequest request) {
    const HttpsClient::Deadline deadline = std::chrono::steady_clock::now() + answerTime_;
    try {
        const HttpsAnswer answer =
            session_.ask(client_, std::move(request), deadline,
                         [&](const HttpsRequest& asked) { return client_.ask(asked, deadline); });
        // A centre that has just started refuses for a moment; the page is to ask again then.
        if (answer.status == kTooMany || answer.status >= kCentresFault) {
            throw ctl::Failure(ctl::kNoHost, centreRefusal(answer.status, answer.body).what());
        }
        return documentIn(answer);
    } catch (const HttpsError& error) {
        throw centreFailure(error);
    }
}

}  // namespace fleet
