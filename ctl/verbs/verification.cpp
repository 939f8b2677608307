#include "ctl/verbs/verification.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"
#include "ctl/client/guarded.h"
#include "ctl/client/host_client.h"
#include "ctl/client/row.h"

using nlohmann::json;

namespace ctl {
namespace {

/// A version's digits without those that only fill its parts up: "063" of "063000000", "6.3" and
/// "06.30" are all "63".
std::string significant(const std::string& version) {
    std::string digits;
    std::copy_if(version.begin(), version.end(), std::back_inserter(digits),
                 [](char c) { return c >= '1' && c <= '9'; });
    return digits;
}

bool endedWell(const TaskResult& result) {
    return result.end == TaskResult::End::Outcome && !result.events.empty() &&
           returnCodeOf(result.events.back()) == 0;
}

}  // namespace

bool isSameVersion(const std::string& asked, const std::string& listed) {
    if (asked.find_first_not_of("0123456789.") != std::string::npos) return true;
    return asked == listed || significant(asked) == significant(listed);
}

std::string doubtAboutInstall(const TaskRequest& request, const json& rows) {
    const bool isListed = std::any_of(rows.begin(), rows.end(), [&request](const json& row) {
        return isSameVersion(request.version, textOf(row, "VERSION"));
    });
    if (isListed) return {};
    std::string listed;
    for (const json& row : rows)
        listed += (listed.empty() ? "" : ", ") + textOf(row, "VERSION");
    return "the host reported success, but " + request.product + " " + request.version +
           " is not in the inventory" + (listed.empty() ? "" : ", which lists " + listed);
}

std::string doubtAboutUninstall(const TaskRequest& request, std::size_t before, const json& rows) {
    if (rows.empty() || rows.size() < before) return {};
    return "the host reported success, but " + request.product + " is still in the inventory";
}

Verification::Verification(const HostAddress& host, const TaskRequest& request, bool isWanted)
    : host_(host),
      request_(request),
      deadline_(deadlineIn(host.timeout)),
      isWanted_(isWanted && isGuarded(host, deadline_)) {
    if (!isWanted_ || request_.command != "UNINSTALL") return;
    try {
        before_ = inventory().size();
    } catch (const Failure& failure) {
        fault_ = failure.what();
    }
}

void Verification::check(TaskResult& result) const {
    if (!isWanted_ || !endedWell(result)) return;
    if (!fault_.empty()) {
        result.note = "not verified: " + fault_;
        return;
    }
    try {
        if (request_.command == "INSTALL") {
            result.doubt = doubtAboutInstall(request_, inventory());
        } else if (request_.command == "UNINSTALL") {
            result.doubt = doubtAboutUninstall(request_, before_, inventory());
        } else {
            result.note =
                "not verified: the home has no way to ask whether " + request_.product + " runs";
        }
    } catch (const Failure& failure) {
        result.note = std::string("not verified: ") + failure.what();
    }
}

/// The product's rows. Throws Failure also when the home could not take its inventory.
json Verification::inventory() const {
    QueryAnswer answer =
        HostClient(host_.socket).query({"KINAGT", {{"PRODUCT", "=", request_.product}}}, deadline_);
    if (!answer.warnings.empty()) {
        throw Failure(kHostReportedFailure, "the inventory could not be taken");
    }
    return std::move(answer.rows);
}

}  // namespace ctl
