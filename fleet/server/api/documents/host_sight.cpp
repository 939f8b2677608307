#include "fleet/server/api/documents/host_sight.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "fleet/server/api/documents/facts_document.h"
#include "fleet/server/api/schema.h"
#include "text/utc_time.h"

using nlohmann::json;

namespace fleet {
namespace {

const char* stateOf(const HostSight& sight, Moment now) {
    return sight.record ? hostState(sight.record->heard, sight.record->stopped, now) : "unknown";
}

}  // namespace

const char* hostState(Moment heard, const std::string& stopped, Moment now) {
    if (!stopped.empty()) return "stopped";
    if (heard == Moment{}) return "unknown";
    return now - heard < kAwayAfter ? "here" : "away";
}

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

nlohmann::ordered_json timeSchema(Components&) {
    return {{"title", "Time"},
            {"type", "string"},
            {"format", "date-time"},
            {"description", "A time in UTC, as RFC 3339 writes it, with Z at its end."}};
}

nlohmann::ordered_json hostSchema(Components& components) {
    return shape::object(
        "Host", "A host of the fleet.",
        {{"host", shape::text("its bus key, by which the fleet knows it")},
         {"name", shape::text("for people")},
         {"labels", labelsShape("those that selectors mean: the centre's and the host's own")},
         {"centreLabels", labelsShape("those that the centre has given it")},
         {"state", components.ref(hostStateSchema)},
         {"blocked", shape::text("why its next order waits; empty if nothing is in the way")},
         {"signing", shape::text("the public key with which its link signs"), Need::Optional},
         {"last", shape::wholeNumber("the highest number of an order that it was given"),
          Need::Optional},
         {"taken", shape::wholeNumber("the highest number that its link has told it took"),
          Need::Optional},
         {"stopped", shape::text("why its link must not go on; empty if it may"), Need::Optional},
         {"unpublished", shape::text("why nothing goes to the bus for it; empty if all is well"),
          Need::Optional},
         {"journal", shape::text("the identity of its journal; empty before one was seen"),
          Need::Optional},
         {"heard", shape::about("when its last hello came", components.ref(timeSchema)),
          Need::Optional},
         {"facts", components.ref(factsSchema), Need::Optional},
         {"skew", numberShape("by how many seconds its clock is ahead of the centre's"),
          Need::Optional}});
}

nlohmann::ordered_json hostStateSchema(Components&) {
    nlohmann::ordered_json state = shape::oneOf(
        "Unknown before the first hello, away when the last one came long ago, stopped when an "
        "administrator has to look.",
        {"unknown", "here", "away", "stopped"});
    state["title"] = "HostState";
    return state;
}

}  // namespace fleet
