#include "fleet/operator/verbs/many_hosts.h"

#include <chrono>
#include <cstring>
#include <nlohmann/json.hpp>
#include <utility>
#include <vector>

#include "ctl/client/failure.h"
#include "ctl/client/interruption.h"
#include "ctl/show/printable.h"
#include "ctl/show/table.h"
#include "ctl/show/time_text.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "fleet/bus/messages/document.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/orders/order_batch.h"
#include "fleet/operator/rollouts/rollout_page.h"
#include "fleet/operator/rollouts/rollout_screen.h"
#include "fleet/operator/verbs/fleet_arguments.h"
#include "fleet/operator/verbs/operator_side.h"
#include "fleet/operator/verbs/rollout_argument.h"

using nlohmann::json;

namespace fleet {
namespace {

std::int64_t secondsIn(const ctl::Values& given, const ctl::Argument& option) {
    return std::chrono::duration_cast<std::chrono::seconds>(timeOf(given, option)).count();
}

ctl::InterruptNote nothingDone(ctl::Format format) {
    const ctl::Page page =
        ctl::failurePage({ctl::kInterrupted, "interrupted before any host got an order"}, format);
    return ctl::InterruptNote(page.err, page.out);
}

void noteThatItMayBegin(ctl::InterruptNote& note, const std::string& id, ctl::Format format) {
    const ctl::Page page =
        ctl::failurePage({ctl::kInterrupted, "interrupted while the roll-out began",
                          "zavctl rollout show " + id + " tells whether it has"},
                         format);
    note.change(page.err, page.out);
}

/// What the orders are, with "***" in the place of what only the hosts may read.
json shownBody(const Work& work) {
    json body = work.body;
    if (!work.hidden.empty()) body["sealed"] = "***";
    return body;
}

bool declares(const ctl::Verb& verb, const ctl::Argument& argument) {
    for (const ctl::Argument& own : verb.arguments) {
        if (std::strcmp(own.name, argument.name) == 0) return true;
    }
    return false;
}

std::string hostsCount(std::size_t hosts) {
    return std::to_string(hosts) + (hosts == 1 ? " host" : " hosts");
}

std::vector<std::string> ordersFor(const Choice& choice, const Work& work,
                                   const OrderMaker& maker) {
    std::vector<std::string> orders;
    orders.reserve(choice.hosts.size());
    for (const ChosenHost& host : choice.hosts)
        orders.push_back(maker.orderFor(host, work, choice.selector));
    return orders;
}

/// The roll-out, if the centre has it although its answer was lost.
json rolloutAfterLoss(Centre& centre, const std::string& id, const ctl::Failure& loss) {
    const bool wasLost = loss.status() == ctl::kNoHost || loss.status() == ctl::kNoOutcome;
    if (!wasLost) throw loss;
    try {
        return centre.get(rolloutTarget(id));
    } catch (const ctl::Failure&) {
        throw ctl::Failure(loss.status(), loss.what(),
                           "zavctl rollout show " + id + " tells whether the roll-out has begun.");
    }
}

}  // namespace

json planOf(const ctl::Values& given) {
    json plan = json::object();
    if (given.has(kWaves)) plan["waves"] = given.text(kWaves);
    if (given.has(kMaxFailures)) plan["maxFailures"] = given.text(kMaxFailures);
    if (given.has(kPause)) plan["pause"] = secondsIn(given, kPause);
    if (given.has(kWait)) plan["wait"] = secondsIn(given, kWait);
    if (given.has(kParallel)) plan["parallel"] = given.number(kParallel);
    return plan;
}

ctl::Page showDryRun(const Choice& choice, const Work& work, const json& plan, Moment lasting,
                     ctl::Format format) {
    json hosts = json::array();
    for (const ChosenHost& host : choice.hosts)
        hosts.push_back({{"host", host.key}, {"name", host.name}, {"state", host.state}});
    const json order = {{"kind", work.kind},
                        {"body", shownBody(work)},
                        {"selector", choice.selector},
                        {"seconds", lasting.count() / 1000}};
    if (format == ctl::Format::Json) {
        return ctl::jsonPage({{"hosts", hosts}, {"order", order}, {"plan", plan}});
    }
    ctl::Page page;
    page.out = ctl::tableText(hosts, {{"name", "HOST"}, {"state", "STATE"}, {"host", "KEY"}}) +
               "\nEach of these " + hostsCount(choice.hosts.size()) + " would get " +
               ctl::printable(work.kind) + " " + ctl::redacted(textOf(shownBody(work))) +
               ",\ngood for " +
               ctl::spanText(std::chrono::duration_cast<std::chrono::seconds>(lasting)) +
               ". Nothing was sent.\n";
    return page;
}

json beginRollout(Centre& centre, const Choice& choice, const Work& work, const json& plan,
                  const OrderMaker& maker, const std::string& id) {
    json wanted = plan;
    wanted["id"] = id;
    wanted["batch"] = sendOrders(centre, ordersFor(choice, work, maker));
    try {
        return centre.post("/v1/rollouts", wanted);
    } catch (const ctl::Failure& loss) {
        return rolloutAfterLoss(centre, id, loss);
    }
}

ctl::ExitStatus runOnMany(const ctl::Verb& verb, const ctl::Invocation& invocation) {
    const ctl::Values& given = invocation.given;
    const bool isAwaited = !declares(verb, ctl::kNoWait) || !given.flag(ctl::kNoWait);
    return runWork(workOf(verb.requestOf(given)), invocation, isAwaited);
}

ctl::ExitStatus runWork(const Work& work, const ctl::Invocation& invocation, bool isAwaited,
                        const BringFiles& bringFiles) {
    const ctl::Values& given = invocation.given;
    const json plan = planOf(given);
    const Moment lasting = timeOf(given, kExpires);
    OperatorSide side(invocation);
    const std::string id = makeOrderId();
    const auto makerNow = [&] { return OrderMaker(side.identity, id, wallClock(), lasting); };
    makerNow().insistThatAllowed(work.kind, work.product());
    json rollout;
    {
        ctl::InterruptNote note = nothingDone(invocation.format);
        const Choice choice = chooseHosts(side.centre, given.text(kOn));
        if (given.flag(kDryRun)) {
            return ctl::print(showDryRun(choice, work, plan, lasting, invocation.format));
        }
        if (bringFiles) bringFiles(side.centre);
        noteThatItMayBegin(note, id, invocation.format);
        rollout = beginRollout(side.centre, choice, work, plan, makerNow(), id);
    }
    if (invocation.format == ctl::Format::Json && !isAwaited) {
        return ctl::print(ctl::jsonPage(rollout));
    }
    if (invocation.format == ctl::Format::Text) {
        ctl::print({"Roll-out " + id + ": " + workText(rollout) + " on " +
                        hostsCount(memberNumber(rollout, "hosts")) + "\n",
                    {}});
    }
    return isAwaited ? watchRollout(side.centre, id, side.deadline, invocation.format)
                     : ctl::kSuccess;
}

}  // namespace fleet
