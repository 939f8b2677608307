#include "fleet/operator/orders/chosen_hosts.h"

#include <nlohmann/json.hpp>
#include <set>
#include <sstream>
#include <utility>

#include "ctl/client/failure.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/client/whole_file.h"
#include "ctl/show/printable.h"
#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/selector.h"
#include "fleet/operator/centre/answers.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr const char* kHostsOfOnePage = "1000";
/// A bad centre could go on for ever.
constexpr std::size_t kMostHosts = 1'000'000;
constexpr const char* kEveryHost = "*";

void checkSelector(const std::string& selector) {
    try {
        const Selector read(selector);
    } catch (const SelectorError& error) {
        throw ctl::Failure(ctl::kWrongUsage,
                           "the selector makes no sense: " + std::string(error.what()));
    }
}

/// The words of a file, one on each line; what stands behind a # is for people.
std::vector<std::string> linesOf(const std::string& text) {
    std::vector<std::string> words;
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
        line.erase(std::min(line.find('#'), line.size()));
        constexpr const char* kBlanks = " \t\r";
        const std::size_t begin = line.find_first_not_of(kBlanks);
        if (begin == std::string::npos) continue;
        words.push_back(line.substr(begin, line.find_last_not_of(kBlanks) - begin + 1));
    }
    return words;
}

/// The documents of the hosts that the file names, each once.
json documentsInFile(Centre& centre, const std::string& file) {
    json documents = json::array();
    std::set<std::string> seen;
    for (const std::string& name : linesOf(ctl::readFile(file))) {
        json document = centre.get("/v1/hosts/" + ctl::percentEncoded(name));
        const ChosenHost host = hostOf(document);
        if (name != host.key && name != host.name) throw senseless("it is about another host");
        if (seen.insert(host.key).second) documents.push_back(std::move(document));
    }
    return documents;
}

Choice choiceOf(const std::string& selector, const json& documents) {
    Choice choice{selector, {}};
    for (const json& document : documents)
        choice.hosts.push_back(hostOf(document));
    return choice;
}

bool isFileName(const std::string& selector) {
    return !selector.empty() && selector.front() == '@';
}

void insistOnSome(const std::string& selector, bool areThere) {
    if (areThere) return;
    if (isFileName(selector)) {
        throw ctl::Failure(ctl::kHostReportedFailure,
                           "no host is named in " + ctl::printable(selector.substr(1)));
    }
    throw ctl::Failure(ctl::kHostReportedFailure,
                       "no host is selected by " + ctl::printable(selector),
                       "A word without * is a label's name; hosts' names have one, as web-1*, or "
                       "stand in a file: --on @FILE.");
}

/// All pages of a list of hosts.
json documentsAt(Centre& centre, const std::string& path, const std::string& selector) {
    checkSelector(selector);
    json hosts = json::array();
    std::string next;
    do {
        std::string target = path + "?limit=" + std::string(kHostsOfOnePage) +
                             "&selector=" + ctl::percentEncoded(selector);
        if (!next.empty()) target += "&after=" + ctl::percentEncoded(next);
        const json page = centre.get(target);
        const json& list = memberList(page, "hosts");
        hosts.insert(hosts.end(), list.begin(), list.end());
        std::string following = memberText(page, "next");
        const bool isEndless = hosts.size() > kMostHosts || (!following.empty() && list.empty());
        if (isEndless) throw senseless("its list of hosts does not end");
        next = std::move(following);
    } while (!next.empty());
    return hosts;
}

}  // namespace

json hostDocuments(Centre& centre, const std::string& selector) {
    return documentsAt(centre, "/v1/hosts", selector);
}

json inventoryDocuments(Centre& centre, const std::string& selector) {
    json documents = isFileName(selector) ? documentsInFile(centre, selector.substr(1))
                                          : documentsAt(centre, "/v1/inventory", selector);
    insistOnSome(selector, !documents.empty());
    return documents;
}

ChosenHost hostOf(const json& document) {
    ChosenHost host{memberText(document, "host"), memberText(document, "name"),
                    memberText(document, "state"), memberText(document, "signing")};
    if (!isPublicKey(host.key, KeyKind::User)) throw senseless("a host has no key");
    if (host.name.empty()) host.name = host.key;
    return host;
}

Choice chooseHosts(Centre& centre, const std::string& selector) {
    Choice choice = isFileName(selector)
                        ? choiceOf(kEveryHost, documentsInFile(centre, selector.substr(1)))
                        : choiceOf(selector, hostDocuments(centre, selector));
    insistOnSome(selector, !choice.hosts.empty());
    return choice;
}

}  // namespace fleet
