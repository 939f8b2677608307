#include "fleet/link/program/socket_host.h"

#include <nlohmann/json.hpp>
#include <utility>

#include "ctl/client/deadline.h"
#include "ctl/client/failure.h"
#include "ctl/client/host_client.h"
#include "ctl/client/http/event_stream.h"
#include "ctl/client/http/percent_encoding.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"

using nlohmann::json;

namespace fleet {
namespace {

using std::chrono::hours;
using std::chrono::seconds;

/// A cancel may wait 30 seconds for its task.
constexpr seconds kAnswerTime{60};
/// Between two looks for a host that is away.
constexpr seconds kLookPause{1};
/// What a hello can tell; the host keeps no order for longer than it can wait on the bus.
constexpr std::size_t kMostListed = 10'000;
constexpr int kPage = 1'000;

/// The link ends, and so does what waits for the host.
struct Ending {};

std::string taskTarget(const std::string& order, const std::string& more,
                       const std::string& journal) {
    return "/v1/tasks/" + ctl::percentEncoded(order) + more +
           "?journal=" + ctl::percentEncoded(journal);
}

json answered(const HostAnswer& answer) {
    if (answer.status != 200) throw MessageError("the host answers otherwise");
    return readDocument(answer.body);
}

}  // namespace

SocketHost::SocketHost(std::string socket, Events events)
    : socket_(socket),
      events_(std::move(events)),
      inventory_(std::move(socket)),
      follower_([this] { follow(); }) {}

SocketHost::~SocketHost() {
    isEnding_ = true;
    worker_.end();
    follower_.join();
}

/// Throws ctl::Failure when there is no answer, and Ending.
HostAnswer SocketHost::request(bool isPost, const std::string& target,
                               const std::string& body) const {
    const ctl::HostClient client(socket_);
    const ctl::Deadline deadline = ctl::deadlineIn(kAnswerTime);
    const ctl::Ticker tick = [this] {
        if (isEnding_) throw Ending{};
    };
    const ctl::Answer answer =
        isPost ? client.post(target, body.empty() ? json() : json::parse(body), deadline, tick)
               : client.ask(target, deadline, tick);
    return {answer.status, answer.body};
}

HandOverAnswer SocketHost::post(const std::string& order, const std::string& journal,
                                const std::string& body) const {
    try {
        const HostAnswer answer = request(true, "/v1/tasks", body);
        if (const std::optional<HandOverAnswer> recorded = recordedBy(answer)) return *recorded;
        return recordOf(request(false, taskTarget(order, "", journal), ""), answer);
    } catch (const ctl::Failure& failure) {
        return NotNow{failure.what()};
    }
}

void SocketHost::handOver(const HandOver& action, std::function<void(HandOverAnswer)> answer) {
    worker_.add([this, action, answer = std::move(answer)] {
        try {
            answer(post(action.directive.order, action.journal, bodyOf(action)));
        } catch (const Ending&) {
        }
    });
}

void SocketHost::enter(const EnterEnd& action, std::function<void(HandOverAnswer)> answer) {
    worker_.add([this, action, answer = std::move(answer)] {
        try {
            const std::string& order = action.directive.order;
            HandOverAnswer told = post(order, action.journal, bodyOf(action));
            if (std::holds_alternative<Unacceptable>(told)) {
                told = post(order, action.journal, bareBodyOf(action));
            }
            answer(std::move(told));
        } catch (const Ending&) {
        }
    });
}

void SocketHost::cancel(const std::string& order, const std::string& journal,
                        std::function<void(CancelAnswer)> answer) {
    worker_.add([this, order, journal, answer = std::move(answer)] {
        try {
            const HostAnswer told = request(true, taskTarget(order, "/cancel", journal), "");
            if (const std::optional<CancelAnswer> known = cancelledBy(told)) return answer(*known);
            answer(cancelledOf(request(false, taskTarget(order, "", journal), ""), told));
        } catch (const ctl::Failure& failure) {
            answer(NotNow{failure.what()});
        } catch (const Ending&) {
        }
    });
}

void SocketHost::lookUp(const std::string& order, const std::string& journal,
                        std::function<void(LookUpAnswer)> answer) {
    worker_.add([this, order, journal, answer = std::move(answer)] {
        try {
            answer(lookUpOf(request(false, taskTarget(order, "", journal), ""), order, journal));
        } catch (const ctl::Failure& failure) {
            answer(NotNow{failure.what()});
        } catch (const Ending&) {
        }
    });
}

void SocketHost::listOrders(const std::string& journal,
                            std::function<void(std::optional<std::vector<std::string>>)> answer) {
    worker_.add([this, journal, answer = std::move(answer)] {
        try {
            std::vector<std::string> orders;
            eachTask("", journal, [&orders](const std::string& transid) {
                orders.push_back(transid);
                return orders.size() < kMostListed;
            });
            answer(std::move(orders));
        } catch (const Ending&) {
        } catch (const std::exception&) {
            answer(std::nullopt);
        }
    });
}

void SocketHost::lookAgain() {
    worker_.add([this] {
        try {
            View there = view();
            events_.isThere(there.journal, std::move(there.unfinished));
        } catch (const Ending&) {
        } catch (const std::exception&) {
            events_.isAway();
        }
    });
}

void SocketHost::look(std::function<void(std::optional<HostLook>)> answer) {
    inventory_.look(std::move(answer));
}

std::string SocketHost::journalNow() const {
    return textIn(answered(request(false, "/v1/health", "")), "journal");
}

void SocketHost::eachTask(const std::string& state, const std::string& journal,
                          const std::function<bool(const std::string&)>& each) const {
    const std::string target = "/v1/tasks?limit=" + std::to_string(kPage) +
                               "&journal=" + ctl::percentEncoded(journal) +
                               (state.empty() ? "" : "&state=" + state);
    std::string cursor;
    do {
        const std::string behind = cursor.empty() ? "" : "&after=" + ctl::percentEncoded(cursor);
        const json page = answered(request(false, target + behind, ""));
        for (const json& task : page.at("tasks")) {
            const std::string transid = textIn(task, "transid");
            if (isOrderId(transid) && !each(transid)) return;
        }
        const json& next = page.at("next");
        cursor = next.is_string() ? next.get<std::string>() : "";
    } while (!cursor.empty());
}

/// Throws when no host answers, or something else than one.
SocketHost::View SocketHost::view() const {
    View there;
    there.journal = journalNow();
    // In this order: what begins to run meanwhile is in one of the lists at least.
    for (const char* const state : {"queued", "running"}) {
        eachTask(state, there.journal, [&there](const std::string& transid) {
            there.unfinished.insert(transid);
            return true;
        });
    }
    return there;
}

void SocketHost::follow() {
    std::string journal;
    std::string position;
    while (!isEnding_) {
        try {
            followOnce(journal, position);
        } catch (const Ending&) {
            return;
        } catch (const std::exception&) {
            // Why it does not answer, the next request says.
        }
        if (isEnding_) return;
        events_.isAway();
        if (!worker_.pause(kLookPause)) return;
    }
}

/// Returns or throws when the connection ends. `journal` and `position` are where to go on.
void SocketHost::followOnce(std::string& journal, std::string& position) {
    const std::string now = journalNow();
    if (std::exchange(journal, now) != now) position.clear();
    std::string target = "/v1/events?table=KAGDYST&tasks=1";
    if (!position.empty()) target += "&after=" + ctl::percentEncoded(position);
    ctl::EventStream stream(socket_, target, ctl::deadlineIn(kAnswerTime));
    position = stream.position();
    // Only now: what ends after this look comes as an event.
    View there = view();
    if (there.journal != journal) return;
    events_.isThere(there.journal, std::move(there.unfinished));
    const ctl::Ticker tick = [this] {
        if (isEnding_) throw Ending{};
    };
    ctl::ServerEvent event;
    while (stream.next(ctl::deadlineIn(hours(24)), event, tick) ==
           ctl::EventStream::Result::Event) {
        position = stream.position();
        if (event.type == "gap") lookAgain();
        if (event.type != "task") continue;
        events_.tasksChanged();
        if (std::optional<Outcome> outcome = outcomeOf(event.data, journal)) {
            events_.ended(std::move(*outcome));
        }
    }
}

}  // namespace fleet
