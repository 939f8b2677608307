#include "fleet/operator/centre/answers.h"

#include <nlohmann/json.hpp>
#include <utility>

#include "ctl/client/http/bounded_json.h"

using nlohmann::json;

namespace fleet {
namespace {

const json* memberIn(const json& object, const char* member) {
    if (!object.is_object()) return nullptr;
    const auto found = object.find(member);
    return found == object.end() ? nullptr : &*found;
}

}  // namespace

std::string memberText(const json& object, const char* member) {
    const json* const found = memberIn(object, member);
    return found != nullptr && found->is_string() ? found->get<std::string>() : "";
}

std::uint64_t memberNumber(const json& object, const char* member) {
    const json* const found = memberIn(object, member);
    if (found == nullptr || !found->is_number_integer()) return 0;
    const bool isNegative = !found->is_number_unsigned() && found->get<std::int64_t>() < 0;
    return isNegative ? 0 : found->get<std::uint64_t>();
}

bool memberFlag(const json& object, const char* member) {
    const json* const found = memberIn(object, member);
    return found != nullptr && found->is_boolean() && found->get<bool>();
}

const json& memberList(const json& answer, const char* member) {
    const json* const found = memberIn(answer, member);
    if (found == nullptr || !found->is_array()) {
        throw senseless(std::string("it has no list \"") + member + '"');
    }
    return *found;
}

json documentIn(const HttpsAnswer& answer) {
    const bool isSuccess = answer.status >= 200 && answer.status < 300;
    if (!isSuccess) throw centreRefusal(answer.status, answer.body);
    ctl::ParsedJson parsed = ctl::parseBounded(answer.body);
    if (parsed.fault != nullptr) throw senseless(std::string("it ") + parsed.fault);
    if (!parsed.document.is_object()) throw senseless("it is no JSON object");
    return std::move(parsed.document);
}

ctl::Failure senseless(const std::string& what) {
    return {ctl::kNoHost, "the centre's answer makes no sense: " + what};
}

ctl::Failure centreRefusal(unsigned status, const std::string& body) {
    if (status < 400) return senseless("its status is " + std::to_string(status));
    std::string reason = memberText(ctl::objectIn(body), "error");
    if (reason.empty()) reason = "status " + std::to_string(status);
    const bool isForNow =
        status == 401 || status == 403 || status == 409 || status == 429 || status >= 500;
    return {isForNow ? ctl::kHostReportedFailure : ctl::kWrongUsage,
            "the centre refused the request: " + reason};
}

ctl::Failure centreFailure(const HttpsError& error) {
    const bool isLate = error.kind() == HttpsError::Kind::TooLate;
    return {isLate ? ctl::kNoOutcome : ctl::kNoHost, error.what()};
}

}  // namespace fleet
