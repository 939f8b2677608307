#include "fleet/operator/verbs/looks/fleet_config_get.h"

#include <algorithm>
#include <map>
#include <nlohmann/json.hpp>
#include <sstream>

#include "ctl/client/row.h"
#include "ctl/show/message_catalogue.h"
#include "ctl/show/printable.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/config/config_get.h"
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

constexpr ctl::Argument kDiff =
    ctl::flag("--diff", "Show how other hosts differ from the largest group of equal ones");
constexpr ctl::Argument kFleetConfigArguments[] = {ctl::kProduct, ctl::kTarget, kDiff};

/// Comparing takes as many steps and bytes as the product of the numbers of lines.
constexpr std::size_t kMostCompared = 4'000'000;

ctl::ExitStatus runFleetConfigGet(const ctl::Invocation& invocation) {
    const ctl::Values& given = invocation.given;
    OperatorSide side(invocation);
    Inquiry inquiry{kAsksConfiguration, {{"product", given.text(ctl::kProduct)}}};
    if (given.has(ctl::kTarget)) inquiry.body["target"] = given.text(ctl::kTarget);
    const Choice choice = chooseHosts(side.centre, given.text(kOn));
    const auto answers = askHosts(side.centre, side.identity, choice, inquiry, side.deadline);
    return ctl::print(showConfigurations(answers, given.flag(kDiff), invocation.format));
}

/// The configuration in an answer; what is wrong becomes its trouble.
std::string configurationOf(HostAnswer& answer) {
    const json& document = answer.answer;
    const auto listIn = [&document](const char* member) {
        const auto found = document.is_object() ? document.find(member) : document.end();
        return found != document.end() && found->is_array() ? *found : json::array();
    };
    ctl::QueryAnswer query;
    query.rows = listIn("rows");
    query.full = listIn("full");
    if (query.rows.empty() || !query.rows.front().is_object()) {
        answer.trouble = "its answer makes no sense";
        return {};
    }
    const ctl::Configuration configuration = ctl::configurationIn(query);
    if (ctl::returnCodeOf(configuration.row) != 0) {
        answer.trouble = ctl::describeRow(configuration.row);
    } else if (!configuration.isWhole) {
        answer.trouble = "its configuration is not whole";
    }
    return configuration.text;
}

struct SameOnes {
    std::string text;
    std::vector<std::string> hosts;
};

/// The largest groups first.
std::vector<SameOnes> groupsOf(std::vector<HostAnswer>& answers) {
    std::map<std::string, std::vector<std::string>> byText;
    for (HostAnswer& answer : answers) {
        if (!answer.trouble.empty()) continue;
        const std::string text = configurationOf(answer);
        if (answer.trouble.empty()) byText[text].push_back(answer.host.name);
    }
    std::vector<SameOnes> groups;
    for (auto& [text, hosts] : byText)
        groups.push_back({text, std::move(hosts)});
    std::stable_sort(groups.begin(), groups.end(), [](const SameOnes& a, const SameOnes& b) {
        return a.hosts.size() > b.hosts.size();
    });
    return groups;
}

std::string titleOf(const SameOnes& group) {
    std::string names;
    for (const std::string& host : group.hosts)
        names += (names.empty() ? "" : ", ") + ctl::printable(host);
    const std::size_t count = group.hosts.size();
    return "# " + std::to_string(count) + (count == 1 ? " host: " : " hosts: ") + names + "\n";
}

std::vector<std::string> linesIn(const std::string& text) {
    std::vector<std::string> lines;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line);)
        lines.push_back(line);
    return lines;
}

/// How many lines two texts have in common, from each pair of places on.
class CommonLines {
public:
    CommonLines(const std::vector<std::string>& before, const std::vector<std::string>& after)
        : width_(after.size() + 1), counts_((before.size() + 1) * width_) {
        for (std::size_t i = before.size(); i-- > 0;) {
            for (std::size_t j = after.size(); j-- > 0;) {
                counts_[i * width_ + j] = before[i] == after[j]
                                              ? 1 + from(i + 1, j + 1)
                                              : std::max(from(i + 1, j), from(i, j + 1));
            }
        }
    }
    std::uint32_t from(std::size_t i, std::size_t j) const { return counts_[i * width_ + j]; }

private:
    std::size_t width_;
    std::vector<std::uint32_t> counts_;
};

std::string prefixed(const char* prefix, const std::vector<std::string>& lines) {
    std::string text;
    for (const std::string& line : lines)
        text += prefix + line + "\n";
    return text;
}

}  // namespace

constexpr ctl::Verb kFleetConfigGetVerb = {
    "config get",
    "Show which hosts have the same configuration, and where others differ",
    kFleetConfigArguments,
    {"zavctl --fleet https://centre.example config get ux --on env=test",
     "zavctl --fleet https://centre.example config get ux --on env=test --diff"},
    runFleetConfigGet,
};

std::string differingLines(const std::string& before, const std::string& after) {
    const std::vector<std::string> a = linesIn(before);
    const std::vector<std::string> b = linesIn(after);
    if ((a.size() + 1) * (b.size() + 1) > kMostCompared) {
        return prefixed("-", a) + prefixed("+", b);
    }
    const CommonLines common(a, b);
    std::string text;
    std::size_t i = 0;
    std::size_t j = 0;
    while (i < a.size() || j < b.size()) {
        if (i < a.size() && j < b.size() && a[i] == b[j]) {
            ++i;
            ++j;
        } else if (i < a.size() &&
                   (j == b.size() || common.from(i + 1, j) >= common.from(i, j + 1))) {
            text += "-" + a[i++] + "\n";
        } else {
            text += "+" + b[j++] + "\n";
        }
    }
    return text;
}

ctl::Page showConfigurations(const std::vector<HostAnswer>& answers, bool isDiff,
                             ctl::Format format) {
    std::vector<HostAnswer> known = answers;
    const std::vector<SameOnes> groups = groupsOf(known);
    ctl::Page page;
    page.err = troubleLines(known);
    if (!page.err.empty()) page.status = ctl::kHostReportedFailure;
    json documents = json::array();
    for (const SameOnes& group : groups) {
        const bool isOther = isDiff && &group != &groups.front();
        documents.push_back({{"hosts", group.hosts}, {"configuration", group.text}});
        std::string text = isOther ? differingLines(groups.front().text, group.text) : group.text;
        if (!text.empty() && text.back() != '\n') text += '\n';
        page.out += titleOf(group) + ctl::printableLines(text);
    }
    if (format == ctl::Format::Text) {
        page.isVerbatim = true;
        return page;
    }
    json failed = json::array();
    for (const HostAnswer& answer : known) {
        if (!answer.trouble.empty()) {
            failed.push_back({{"host", answer.host.name}, {"error", answer.trouble}});
        }
    }
    return ctl::jsonPage({{"groups", documents}, {"failed", failed}}, page.status);
}

}  // namespace fleet
