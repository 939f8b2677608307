#include "fleet/operator/verbs/hosts.h"

#include <algorithm>
#include <cmath>
#include <nlohmann/json.hpp>
#include <optional>

#include "ctl/client/http/percent_encoding.h"
#include "ctl/show/printable.h"
#include "ctl/show/table.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/orders/chosen_hosts.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "fleet/operator/verbs/operator_side.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr ctl::Argument kSelector = ctl::positional("SELECTOR", "Which hosts; see --on");
constexpr ctl::Argument kHostsArguments[] = {kSelector};
constexpr ctl::Argument kHostName = ctl::positional("HOST", "Its name or its key").required();
constexpr ctl::Argument kHostArguments[] = {kHostName};

constexpr const char* kAllHosts = "*";
constexpr const char* kOrdersShown = "10";
/// A clock that differs by less does no harm: an order may be issued up to 5 minutes ahead.
constexpr double kNoteworthySkew = 60;

ctl::ExitStatus runHosts(const ctl::Invocation& invocation) {
    OperatorSide side(invocation);
    const std::string& selector = invocation.given.text(kSelector);
    const json hosts = hostDocuments(side.centre, selector.empty() ? kAllHosts : selector);
    return ctl::print(showHosts(hosts, std::chrono::system_clock::now(), invocation.format));
}

std::string targetOf(const ctl::Invocation& invocation) {
    return "/v1/hosts/" + ctl::percentEncoded(invocation.given.text(kHostName));
}

ctl::ExitStatus runHostsShow(const ctl::Invocation& invocation) {
    OperatorSide side(invocation);
    const std::string target = targetOf(invocation);
    const json host = side.centre.get(target);
    const json orders = side.centre.get(target + "/orders?limit=" + kOrdersShown);
    return ctl::print(showHost(host, orders, std::chrono::system_clock::now(), invocation.format));
}

std::string labelsText(const json& host) {
    const auto labels = host.is_object() ? host.find("labels") : host.end();
    if (labels == host.end() || !labels->is_object()) return {};
    std::string text;
    for (const auto& item : labels->items())
        text +=
            (text.empty() ? "" : ",") + item.key() + "=" + memberText(*labels, item.key().c_str());
    return text;
}

std::string heardText(const json& host, ctl::WallTime now) {
    const std::string heard = memberText(host, "heard");
    if (heard.empty()) return "never";
    const std::optional<ctl::WallTime> time = ctl::parseTime(heard);
    if (!time) return ctl::printable(heard);
    return ctl::spanText(std::chrono::duration_cast<std::chrono::seconds>(now - *time)) + " ago";
}

std::uint64_t openOrders(const json& host) {
    const std::uint64_t last = memberNumber(host, "last");
    const std::uint64_t taken = memberNumber(host, "taken");
    return last > taken ? last - taken : 0;
}

double skewOf(const json& host) {
    const auto skew = host.is_object() ? host.find("skew") : host.end();
    return skew != host.end() && skew->is_number() ? skew->get<double>() : 0;
}

std::string fact(const std::string& title, const std::string& text) {
    constexpr std::size_t kTitleWidth = 13;
    return text.empty() ? "" : title + std::string(kTitleWidth - title.size(), ' ') + text + "\n";
}

/// How much is installed, as the host has told.
std::string inventoryText(const json& facts) {
    const auto inventory = facts.find("inventory");
    if (inventory == facts.end() || !inventory->is_object()) return {};
    const auto products = inventory->find("products");
    const std::size_t count =
        products != inventory->end() && products->is_array() ? products->size() : 0;
    constexpr std::uint64_t kLongest = 1'000'000'000'000;
    const std::uint64_t age = std::min(memberNumber(*inventory, "age"), kLongest);
    return std::to_string(count) + (count == 1 ? " product, " : " products, ") +
           ctl::spanText(std::chrono::seconds(static_cast<std::int64_t>(age))) + " old";
}

/// What the host has told about itself.
std::string factsText(const json& host) {
    const auto facts = host.is_object() ? host.find("facts") : host.end();
    if (facts == host.end() || !facts->is_object()) return {};
    return fact("own labels", ctl::printable(labelsText(*facts))) +
           fact("versions", ctl::printable("host " + memberText(*facts, "version") + ", link " +
                                           memberText(*facts, "link"))) +
           fact("inventory", inventoryText(*facts));
}

json orderRows(const json& orders, ctl::WallTime now) {
    json rows = json::array();
    for (const json& order : memberList(orders, "orders")) {
        rows.push_back({{"number", std::to_string(memberNumber(order, "number"))},
                        {"work", memberText(order, "kind") + " " + memberText(order, "product")},
                        {"state", memberText(order, "state")},
                        {"by", memberText(order, "operator")},
                        {"issued", ctl::timeText(memberText(order, "issued"), now)},
                        {"reason", ctl::redacted(memberText(order, "reason"))}});
    }
    return rows;
}

}  // namespace

constexpr ctl::Verb kHostsVerb = {
    "hosts",
    "List the hosts of the fleet",
    kHostsArguments,
    {"zavctl --fleet https://centre.example hosts",
     "zavctl --fleet https://centre.example hosts env=test,!old"},
    runHosts,
};

constexpr ctl::Verb kHostsShowVerb = {
    "hosts show",
    "Show a host of the fleet and its latest orders",
    kHostArguments,
    {"zavctl --fleet https://centre.example hosts show web-1",
     "zavctl --fleet https://centre.example --json hosts show web-1"},
    runHostsShow,
};

std::string troubleOf(const json& host) {
    std::string text;
    const auto add = [&text](const std::string& what) {
        text += (text.empty() ? "" : "; ") + what;
    };
    for (const char* const member : {"stopped", "blocked", "unpublished"}) {
        const std::string reason = memberText(host, member);
        if (!reason.empty()) add(std::string(member) + ": " + ctl::redacted(reason));
    }
    const double skew = skewOf(host);
    if (std::abs(skew) >= kNoteworthySkew) {
        const auto seconds =
            std::chrono::seconds(static_cast<long long>(std::min(std::abs(skew), 1e12)));
        add("its clock is " + ctl::spanText(seconds) + (skew > 0 ? " ahead" : " behind"));
    }
    return text;
}

ctl::Page showHosts(const json& hosts, ctl::WallTime now, ctl::Format format) {
    if (format == ctl::Format::Json) return ctl::jsonPage({{"hosts", hosts}});
    json rows = json::array();
    for (const json& host : hosts) {
        const std::uint64_t open = openOrders(host);
        rows.push_back({{"name", memberText(host, "name")},
                        {"state", memberText(host, "state")},
                        {"heard", heardText(host, now)},
                        {"open", open == 0 ? "" : std::to_string(open)},
                        {"trouble", troubleOf(host)},
                        {"labels", labelsText(host)}});
    }
    if (rows.empty()) return {"There are no such hosts.\n", {}};
    return {ctl::tableText(rows, {{"name", "HOST"},
                                  {"state", "STATE"},
                                  {"heard", "HEARD"},
                                  {"open", "ORDERS"},
                                  {"labels", "LABELS"},
                                  {"trouble", "TROUBLE"}}),
            {}};
}

ctl::Page showHost(const json& host, const json& orders, ctl::WallTime now, ctl::Format format) {
    const json rows = orderRows(orders, now);
    if (format == ctl::Format::Json) {
        return ctl::jsonPage({{"host", host}, {"orders", orders.at("orders")}});
    }
    const std::uint64_t last = memberNumber(host, "last");
    ctl::Page page;
    page.out = fact("host", ctl::printable(memberText(host, "name"))) +
               fact("key", ctl::printable(memberText(host, "host"))) +
               fact("signing key", ctl::printable(memberText(host, "signing"))) +
               fact("state", ctl::printable(memberText(host, "state"))) +
               fact("heard", heardText(host, now)) +
               fact("labels", ctl::printable(labelsText(host))) +
               fact("orders", std::to_string(memberNumber(host, "taken")) + " of " +
                                  std::to_string(last) + " taken") +
               fact("journal", ctl::printable(memberText(host, "journal"))) + factsText(host) +
               fact("trouble", troubleOf(host));
    if (rows.empty()) return page;
    page.out += "\n" + ctl::tableText(rows, {{"number", "NUMBER"},
                                             {"work", "ORDER"},
                                             {"state", "STATE"},
                                             {"by", "BY"},
                                             {"issued", "ISSUED"},
                                             {"reason", "REASON"}});
    return page;
}

}  // namespace fleet
