#include "fleet/operator/verbs/hosts_label.h"

#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/show/printable.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "fleet/operator/verbs/hosts.h"
#include "fleet/operator/verbs/operator_side.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr ctl::Argument kLabelledHost = ctl::positional("HOST", "Its name or its key").required();
constexpr ctl::Argument kLabelChanges =
    ctl::positionals("LABEL", "NAME=VALUE gives it a label, NAME- takes one away").required();
constexpr ctl::Argument kLabelArguments[] = {kLabelledHost, kLabelChanges};

std::map<std::string, std::string> knownLabels(const json& host) {
    std::map<std::string, std::string> labels;
    // Those of the host's own configuration stay where they are.
    const auto found = host.find("centreLabels");
    if (found == host.end() || !found->is_object()) return labels;
    for (const auto& item : found->items())
        labels[item.key()] = memberText(*found, item.key().c_str());
    return labels;
}

ctl::ExitStatus runHostsLabel(const ctl::Invocation& invocation) {
    OperatorSide side(invocation);
    const std::string target =
        "/v1/hosts/" + ctl::percentEncoded(invocation.given.text(kLabelledHost));
    const auto labels =
        changedLabels(knownLabels(side.centre.get(target)), invocation.given.texts(kLabelChanges));
    const json host = side.centre.post(target + "/labels", {{"labels", json(labels)}});
    return ctl::print(
        showHosts(json::array({host}), std::chrono::system_clock::now(), invocation.format));
}

}  // namespace

constexpr ctl::Verb kHostsLabelVerb = {
    "hosts label",
    "Change the labels that the centre knows a host by",
    kLabelArguments,
    {"zavctl --fleet https://centre.example hosts label web-1 env=test",
     "zavctl --fleet https://centre.example hosts label web-1 site=a old-"},
    runHostsLabel,
};

std::map<std::string, std::string> changedLabels(std::map<std::string, std::string> labels,
                                                 const std::vector<std::string>& changes) {
    for (const std::string& change : changes) {
        const std::size_t equals = change.find('=');
        if (equals != std::string::npos && equals > 0) {
            labels[change.substr(0, equals)] = change.substr(equals + 1);
            continue;
        }
        const bool isRemoval =
            equals == std::string::npos && change.size() > 1 && change.back() == '-';
        if (!isRemoval || labels.erase(change.substr(0, change.size() - 1)) == 0) {
            throw ctl::Failure(
                ctl::kWrongUsage,
                isRemoval
                    ? "the host has no label " + ctl::printable(change.substr(0, change.size() - 1))
                    : "\"" + ctl::printable(change) + "\" is neither NAME=VALUE nor NAME-");
        }
    }
    return labels;
}

}  // namespace fleet
