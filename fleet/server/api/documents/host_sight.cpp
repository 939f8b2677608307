#include "fleet/server/api/documents/host_sight.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "fleet/server/api/documents/facts_document.h"
#include "text/utc_time.h"

using nlohmann::json;

namespace fleet {
namespace {

const char* stateOf(const HostSight& sight, Moment now) {
    if (!sight.record) return "unknown";
    if (!sight.record->stopped.empty()) return "stopped";
    if (sight.record->heard == Moment{}) return "unknown";
    return now - sight.record->heard < kAwayAfter ? "here" : "away";
}

}  // namespace

bool maySee(const Visit& visit, const Member& member) {
    return Selector(visit.grant.selector).matches(member.name, member.labels);
}

std::string hostNamed(const Visit& visit, const Members& members, const std::string& nameOrKey) {
    const auto known = [&](const auto& member) {
        return (member.first == nameOrKey || member.second.name == nameOrKey) &&
               maySee(visit, member.second);
    };
    const auto byKey = members.find(nameOrKey);
    if (byKey != members.end() && known(*byKey)) return byKey->first;
    const auto byName = std::find_if(members.begin(), members.end(), known);
    if (byName == members.end()) throw NothingThere("there is no host \"" + nameOrKey + "\"");
    return byName->first;
}

std::vector<std::string> hostsMeant(const Visit& visit, const Members& members,
                                    const std::string& selector, const std::string& after,
                                    std::size_t most) {
    const Selector meant(selector);
    const Selector visible(visit.grant.selector);
    std::vector<std::string> hosts;
    for (auto member = members.upper_bound(after); member != members.end(); ++member) {
        const Member& known = member->second;
        const bool isOne =
            meant.matches(known.name, known.labels) && visible.matches(known.name, known.labels);
        if (!isOne) continue;
        hosts.push_back(member->first);
        if (hosts.size() > most) break;
    }
    return hosts;
}

std::vector<HostSight> sightsOf(const Visit& visit, const Members& members,
                                const std::vector<std::string>& hosts, WithFacts withFacts) {
    std::vector<HostSight> sights;
    for (const std::string& host : hosts)
        sights.push_back({host, members.at(host), {}, {}, {}});
    return visit.services.ask([sights, withFacts](CentreDesk& desk) {
        std::vector<HostSight> known = sights;
        for (HostSight& sight : known) {
            sight.record = desk.parts.store.host(sight.host);
            const auto news = desk.parts.news.find(sight.host);
            if (news != desk.parts.news.end()) sight.news = news->second;
            if (withFacts == WithFacts::Yes) {
                sight.facts = HostFacts(desk.parts.database).of(sight.host);
            }
        }
        return known;
    });
}

json hostDocument(const HostSight& sight, Moment now) {
    json document = {{"host", sight.host},
                     {"name", sight.member.name},
                     {"labels", json(sight.member.labels)},
                     {"state", stateOf(sight, now)}};
    document["centreLabels"] = json(sight.member.given);
    for (const char* const member : {"labels", "centreLabels"}) {
        if (document[member].is_null()) document[member] = json::object();
    }
    if (sight.record) {
        const HostRecord& record = *sight.record;
        document["signing"] = record.signing;
        document["last"] = record.last;
        document["taken"] = record.told;
        document["stopped"] = record.stopped;
        document["unpublished"] = record.unpublished;
        document["journal"] = record.journal;
        if (record.heard != Moment{}) document["heard"] = timeOfDocument(record.heard);
    }
    if (sight.facts) document["facts"] = factsDocument(*sight.facts, now);
    document["blocked"] = sight.news ? sight.news->blocked : "";
    if (sight.news) {
        constexpr double kMilliseconds = 1000;
        document["skew"] = static_cast<double>(sight.news->skew.count()) / kMilliseconds;
    }
    return document;
}

std::string timeOfDocument(Moment time) {
    return text::utcTime(time);
}

}  // namespace fleet
