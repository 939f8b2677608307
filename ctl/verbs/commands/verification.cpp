#include "ctl/verbs/commands/verification.h"

#include <strings.h>

#include <algorithm>
#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"
#include "ctl/client/guarded.h"
#include "ctl/client/host_client.h"
#include "ctl/client/instances.h"
#include "ctl/client/row.h"

using nlohmann::json;

namespace ctl {
namespace {

/// The version as the inventory writes it: two digits before the point, nine in all, so that "6.3"
/// and "06.30" are "063000000".
std::string listedForm(const std::string& version) {
    constexpr std::size_t kBeforeThePoint = 2;
    constexpr std::size_t kDigits = 9;
    std::string digits = version;
    const std::size_t first = std::min(version.find('.'), version.size());
    if (first < kBeforeThePoint) digits.insert(0, kBeforeThePoint - first, '0');
    digits.erase(std::remove(digits.begin(), digits.end(), '.'), digits.end());
    if (digits.size() < kDigits) digits.append(kDigits - digits.size(), '0');
    return digits;
}

bool isNumeric(const std::string& version) {
    return version.find_first_not_of("0123456789.") == std::string::npos;
}

/// Whether a start or stop was for this instance. Its target is a managed system name, or with
/// OPTIONAL "INSTANCE" the instance's own name; without one it is the default instance.
bool isMeant(const TaskRequest& request, const json& instance) {
    const std::string& target = request.targetmsn;
    if (textOf(instance, "product") != request.product) return false;
    if (target.empty()) return textOf(instance, "instance").empty();
    if (request.optional == "INSTANCE") return textOf(instance, "instance") == target;
    return ::strcasecmp(textOf(instance, "target").c_str(), target.c_str()) == 0;
}

bool endedWell(const TaskResult& result) {
    if (result.end != TaskResult::End::Outcome || result.events.empty()) return false;
    const json& row = result.completion.is_null() ? result.events.back() : result.completion;
    return returnCodeOf(row) == 0;
}

}  // namespace

bool isSameVersion(const std::string& asked, const std::string& listed) {
    if (!isNumeric(asked)) return true;
    return asked == listed || (!asked.empty() && listedForm(asked) == listed);
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

std::string doubtAboutState(const TaskRequest& request, const json& instance) {
    const bool runs = textOf(instance, "state") == "running";
    if (runs != (request.command == "STOP")) return {};
    return "the host reported success, but " + textOf(instance, "target") +
           (runs ? " still runs" : " does not run");
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
            if (result.doubt.empty() && !isNumeric(request_.version)) {
                result.note =
                    "not verified: no inventory lists a version such as " + request_.version;
            }
        } else if (request_.command == "UNINSTALL") {
            result.doubt = doubtAboutUninstall(request_, before_, inventory());
        } else {
            checkState(result);
        }
    } catch (const Failure& failure) {
        result.note = std::string("not verified: ") + failure.what();
    }
}

void Verification::checkState(TaskResult& result) const {
    const json instances = listInstances(HostClient(host_.socket), deadline_);
    if (instances.is_null()) {
        result.note =
            "not verified: the home has no way to ask whether " + request_.product + " runs";
        return;
    }
    const auto found =
        std::find_if(instances.begin(), instances.end(),
                     [this](const json& instance) { return isMeant(request_, instance); });
    if (found != instances.end()) {
        result.doubt = doubtAboutState(request_, *found);
    } else if (request_.command != "STOP") {  // a stopped instance may be gone
        result.note = "not verified: the home lists no instance of " + request_.product +
                      (request_.targetmsn.empty() ? "" : " called " + request_.targetmsn);
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
