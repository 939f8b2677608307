#include "fleet/operator/verbs/looks/fleet_doctor.h"

#include <algorithm>
#include <iterator>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>

#include "ctl/show/printable.h"
#include "ctl/show/table.h"
#include "ctl/verbs/invocation.h"
#include "fleet/bus/messages/question.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/verbs/fleet_arguments.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "fleet/operator/verbs/looks/fleet_tasks.h"
#include "fleet/operator/verbs/operator_side.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr const char* kFine = "ok";
/// The worst first. A result that nobody knows is worse than none.
constexpr const char* kResults[] = {"error", "warning"};

ctl::ExitStatus runFleetDoctor(const ctl::Invocation& invocation) {
    OperatorSide side(invocation);
    const Choice choice = chooseHosts(side.centre, invocation.given.text(kOn));
    const auto answers =
        askHosts(side.centre, side.identity, choice, {kAsksDoctor, json::object()}, side.deadline);
    return ctl::print(showFleetChecks(answers, invocation.format));
}

/// 0 for the worst.
std::size_t badness(const json& check) {
    const std::string result = memberText(check, "result");
    if (result == kFine) return std::size(kResults) + 1;
    const auto known = std::find(std::begin(kResults), std::end(kResults), result);
    return static_cast<std::size_t>(known - std::begin(kResults));
}

struct HostChecks {
    std::string host;
    std::vector<json> checks;  ///< the worst first; at least one

    std::size_t worst() const { return badness(checks.front()); }
};

/// The checks in an answer; what is wrong becomes its trouble.
HostChecks checksIn(HostAnswer& answer) {
    HostChecks own{answer.host.name, {}};
    const bool isList = answer.answer.is_array() && !answer.answer.empty() &&
                        std::all_of(answer.answer.begin(), answer.answer.end(),
                                    [](const json& check) { return check.is_object(); });
    if (!isList) {
        answer.trouble = "its answer makes no sense";
        return own;
    }
    own.checks.assign(answer.answer.begin(), answer.answer.end());
    std::stable_sort(own.checks.begin(), own.checks.end(),
                     [](const json& a, const json& b) { return badness(a) < badness(b); });
    return own;
}

std::string textOfCheck(const json& check) {
    const std::string remedy = memberText(check, "remedy");
    return memberText(check, "text") + (remedy.empty() ? "" : "; " + remedy);
}

std::string fleetCheckTable(const std::vector<HostChecks>& hosts) {
    json rows = json::array();
    for (const HostChecks& host : hosts) {
        for (const json& check : host.checks) {
            if (memberText(check, "result") == kFine) break;  // those behind it are, too
            rows.push_back({{"host", host.host},
                            {"result", memberText(check, "result")},
                            {"check", memberText(check, "check")},
                            {"text", ctl::redacted(textOfCheck(check))}});
        }
    }
    if (rows.empty()) return {};
    return ctl::tableText(
        rows, {{"host", "HOST"}, {"result", "RESULT"}, {"check", "CHECK"}, {"text", "FOUND"}});
}

std::string fineHosts(const std::vector<HostChecks>& hosts) {
    std::string names;
    for (const HostChecks& host : hosts) {
        if (host.worst() <= std::size(kResults)) continue;
        names += (names.empty() ? "" : ", ") + ctl::printable(host.host);
    }
    return names.empty() ? names : "Everything is in order on: " + names + "\n";
}

}  // namespace

constexpr ctl::Verb kFleetDoctorVerb = {
    "doctor",
    "Check the homes and machines of many hosts",
    {},
    {"zavctl --fleet https://centre.example doctor --on env=test",
     "zavctl --fleet https://centre.example --json doctor --on '*'"},
    runFleetDoctor,
};

ctl::Page showFleetChecks(const std::vector<HostAnswer>& answers, ctl::Format format) {
    std::vector<HostAnswer> known = answers;
    std::vector<HostChecks> hosts;
    for (HostAnswer& answer : known) {
        if (!answer.trouble.empty()) continue;
        HostChecks own = checksIn(answer);
        if (answer.trouble.empty()) hosts.push_back(std::move(own));
    }
    std::stable_sort(hosts.begin(), hosts.end(), [](const HostChecks& a, const HostChecks& b) {
        return a.worst() < b.worst();
    });
    ctl::Page page{fleetCheckTable(hosts) + fineHosts(hosts), troubleLines(known)};
    const bool hasError = !hosts.empty() && hosts.front().worst() == 0;
    if (hasError || !page.err.empty()) page.status = ctl::kHostReportedFailure;
    if (format == ctl::Format::Text) return page;
    json documents = json::array();
    for (const HostChecks& host : hosts)
        documents.push_back({{"host", host.host}, {"checks", host.checks}});
    for (const HostAnswer& answer : known) {
        if (answer.trouble.empty()) continue;
        documents.push_back({{"host", answer.host.name}, {"error", answer.trouble}});
    }
    return ctl::jsonPage({{"hosts", documents}}, page.status);
}

}  // namespace fleet
