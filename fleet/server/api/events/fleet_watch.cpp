#include "fleet/server/api/events/fleet_watch.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <set>
#include <utility>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/trust/signed.h"
#include "fleet/log/log.h"
#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/documents/rollout_document.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::chrono::milliseconds kBetweenLooks{250};
constexpr Moment kSecond{1000};
/// Hosts, orders and roll-outs that one step on the centre's thread is about.
constexpr std::size_t kMostOfStep = 256;

HostFace faceIn(CentreDesk& desk, const std::string& host) {
    HostFace face;
    if (const auto record = desk.parts.store.host(host)) {
        face.heard = record->heard;
        face.stopped = record->stopped;
    }
    const auto news = desk.parts.news.find(host);
    if (news != desk.parts.news.end()) face.blocked = news->second.blocked;
    return face;
}

FleetEvent hostEvent(const HostChange& change) {
    return {"host",
            textOf({{"host", change.host},
                    {"name", change.face.name},
                    {"state", change.state},
                    {"since", timeOfDocument(change.since)},
                    {"blocked", change.face.blocked}}),
            FleetEvent::Subject{change.face.name, change.face.labels}};
}

/// Reads what the order does where no roll-out says it.
void completeOrder(ChangedOrder& order) {
    const auto numbered = partsOf(order.bytes);
    if (!numbered) return;  // only the host's journal knows of it
    try {
        const Order read = readOrder(numbered->carried).order;
        order.kind = read.kind;
        const json body = json::parse(read.body, nullptr, false);
        if (body.is_object()) order.product = textIn(body, "product");
    } catch (const MessageError&) {
        // It names no product, or an older centre has taken what this one would not.
    }
}

FleetEvent orderEvent(ChangedOrder order, const Member& member) {
    if (order.rollout.empty()) completeOrder(order);
    return {"order",
            textOf({{"order", order.order},
                    {"host", order.host},
                    {"name", member.name},
                    {"rollout", order.rollout.empty() ? json() : json(order.rollout)},
                    {"kind", order.kind},
                    {"product", order.product},
                    {"state", order.end.empty() ? std::string("released") : order.end}}),
            FleetEvent::Subject{member.name, member.labels}};
}

}  // namespace

FleetWatch::FleetWatch(ApiServices& services) : services_(services) {
    worker_.add([this] { work(); });
}

FleetWatch::~FleetWatch() {
    isEnding_ = true;
    worker_.await();
}

void FleetWatch::work() {
    do {
        try {
            endReaders();
            if (services_.isWorking()) look();
        } catch (const Unavailable&) {
            // It waits for the bus, is too busy or ends: the notes stay.
        } catch (const std::exception& error) {
            say(Priority::Warning, std::string("events of the fleet come late: ") + error.what());
            worker_.pause(kSecond);
        }
    } while (worker_.pause(kBetweenLooks));
}

void FleetWatch::endReaders() {
    if (services_.readers.isEmpty()) return;
    services_.readers.endUnless([this](const EventReaderRight& right) {
        const Moment now = wallClock();
        if (services_.keyOf(right.session, now) != right.key) return false;
        const auto grant = services_.withTrust([&](sqlite::Database& database) {
            return Operators(database).grantOf(right.key, now);
        });
        return grant && grant->selector == right.selector;
    });
}

void FleetWatch::look() {
    tell();  // what a look before could not
    while (learnChanges() && !isEnding_)
        tell();
    learnMembers();
    tell();
    const Moment now = wallClock();
    if (now - lastLook_ >= kSecond || now < lastLook_) {
        lastLook_ = now;
        for (const HostChange& change : hosts_.goneAway(now))
            events_.push_back(hostEvent(change));
    }
    showRollouts(now);
    tell();
    isBegun_ = true;
}

/// What is found at the beginning is no news.
void FleetWatch::tell() {
    std::vector<FleetEvent> events = std::exchange(events_, {});
    if (!isBegun_ || events.empty()) return;
    services_.events.add(std::move(events));
    services_.readers.wake();
}

/// Returns whether there is more.
bool FleetWatch::learnChanges() {
    const Found found = services_.ask([](CentreDesk& desk) {
        Found step;
        step.changes = ChangeNotes(desk.parts.database).take(kMostOfStep);
        for (const auto* const hosts : {&step.changes.hosts, &step.changes.facts}) {
            for (const std::string& host : *hosts)
                step.faces.emplace(host, faceIn(desk, host));
        }
        return step;
    });
    if (members_) {
        noteHosts(*members_, found.faces, found.changes.facts);
        noteOrders(found.changes.orders);
    }
    for (const std::string& rollout : found.changes.rollouts) {
        const auto shown = shown_.find(rollout);
        rollouts_.emplace(rollout, shown == shown_.end() ? Moment{} : shown->second);
    }
    return found.changes.isMore;
}

/// Who has joined or left, and other names and labels.
void FleetWatch::learnMembers() {
    const std::shared_ptr<const Members> members = services_.members();
    if (members == members_) return;
    const std::vector<std::string> changed = hosts_.changedMembers(*members);
    for (std::size_t from = 0; from < changed.size() && !isEnding_; from += kMostOfStep) {
        const std::size_t to = std::min(from + kMostOfStep, changed.size());
        const auto begin = changed.begin() + static_cast<std::ptrdiff_t>(from);
        const auto end = changed.begin() + static_cast<std::ptrdiff_t>(to);
        noteHosts(*members, facesOf({begin, end}), {});
    }
    for (const HostChange& change : hosts_.retired(*members, wallClock()))
        events_.push_back(hostEvent(change));
    members_ = members;
}

std::map<std::string, HostFace> FleetWatch::facesOf(const std::vector<std::string>& hosts) {
    return services_.ask([hosts](CentreDesk& desk) {
        std::map<std::string, HostFace> faces;
        for (const std::string& host : hosts)
            faces.emplace(host, faceIn(desk, host));
        return faces;
    });
}

void FleetWatch::noteHosts(const Members& members, const std::map<std::string, HostFace>& faces,
                           const std::vector<std::string>& told) {
    const std::set<std::string> tellers(told.begin(), told.end());
    const Moment now = wallClock();
    for (const auto& [host, known] : faces) {
        const auto member = members.find(host);
        if (member == members.end()) continue;  // it is told when its name is known
        HostFace face = known;
        face.name = member->second.name;
        face.labels = member->second.labels;
        const auto change = hosts_.note(host, face, tellers.count(host) != 0, now);
        if (change) events_.push_back(hostEvent(*change));
    }
}

void FleetWatch::noteOrders(const std::vector<ChangedOrder>& orders) {
    for (const ChangedOrder& order : orders) {
        const auto member = members_->find(order.host);
        if (member != members_->end()) events_.push_back(orderEvent(order, member->second));
    }
}

/// Each once a second at most, and none while nobody reads.
void FleetWatch::showRollouts(Moment now) {
    if (services_.readers.isEmpty()) return;
    std::vector<std::string> due;
    for (const auto& [rollout, shown] : rollouts_) {
        if (now - shown >= kSecond || now < shown) due.push_back(rollout);
    }
    for (const std::string& rollout : due) {
        const RolloutView view = services_.ask(
            [rollout](CentreDesk& desk) { return desk.rollouts.show(rollout, desk.now); });
        rollouts_.erase(rollout);
        shown_[rollout] = now;
        events_.push_back({"rollout", textOf(rolloutDocument(view)), std::nullopt});
    }
    for (auto shown = shown_.begin(); shown != shown_.end();)
        shown = now - shown->second > kSecond ? shown_.erase(shown) : std::next(shown);
}

}  // namespace fleet
