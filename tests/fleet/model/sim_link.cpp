#include "tests/fleet/model/sim_link.h"

#include <sstream>
#include <utility>

namespace model {

using fleet::Moment;
using fleet::Number;

std::string bytesOf(const SimOrder& order, Number number) {
    std::ostringstream out;
    out << order.host << ' ' << number << ' ' << order.order << ' '
        << (order.cancels.empty() ? "-" : order.cancels) << ' ' << order.hasFiles << ' '
        << order.isBad << ' ' << order.isForbidden << ' ' << order.issued.count() << ' '
        << order.expires.count();
    return out.str();
}

SimOrder orderIn(const std::string& bytes, Number& number) {
    std::istringstream in(bytes);
    SimOrder order;
    Moment::rep issued = 0;
    Moment::rep expires = 0;
    in >> order.host >> number >> order.order >> order.cancels >> order.hasFiles >> order.isBad >>
        order.isForbidden >> issued >> expires;
    if (order.cancels == "-") order.cancels.clear();
    order.issued = Moment(issued);
    order.expires = Moment(expires);
    return order;
}

std::optional<fleet::Directive> directiveOf(const std::string& bytes, const std::string& host,
                                            Number number) {
    Number signedNumber = 0;
    const SimOrder order = orderIn(bytes, signedNumber);
    if (signedNumber != number || order.host != host) return std::nullopt;
    fleet::Directive directive;
    directive.number = number;
    directive.order = order.order;
    directive.cancels = order.cancels;
    directive.hasFiles = order.hasFiles;
    directive.issued = order.issued;
    directive.expires = order.expires;
    directive.allowedUntil = Moment::max();
    if (order.isForbidden) directive.refusal = "not allowed";
    directive.request = order.isBad ? "bad" : "good";
    return directive;
}

SimLink::SimLink(SimHost& host, SimBus& bus, Dice& dice, std::string name)
    : host_(host), bus_(bus), dice_(dice), name_(std::move(name)) {}

fleet::LinkSettings SimLink::settings() {
    fleet::LinkSettings settings;
    settings.host = host_.key();
    settings.session = name_ + "-" + std::to_string(++starts_);
    settings.machine = host_.key() + "-machine";
    settings.nonce = [this] { return name_ + "-nonce-" + std::to_string(++nonces_); };
    settings.pause = [this] { return Moment(20'000 + dice_.below(20'000)); };
    return settings;
}

void SimLink::start(Moment now) {
    if (!stopped_.empty()) return;
    link_ = std::make_unique<fleet::Link>(settings(), disk_);
    isConnected_ = listensToHost_ = false;
    if (host_.isUp()) hostStarted(now);
}

void SimLink::kill() {
    link_.reset();
    underWay_.clear();
    isConnected_ = listensToHost_ = false;
}

void SimLink::connect(Moment now) {
    isConnected_ = true;
    carryOut(link_->connected(now), now);
}

void SimLink::disconnect() {
    isConnected_ = false;
    link_->disconnected();
}

void SimLink::tick(Moment now) {
    carryOut(link_->tick(now), now);
}

bool SimLink::deliver(Moment now) {
    if (!isUp() || underWay_.empty()) return false;
    const std::size_t which = dice_.below(underWay_.size());
    const Arrival arrival = std::move(underWay_[which]);
    underWay_.erase(underWay_.begin() + static_cast<std::ptrdiff_t>(which));
    carryOut(arrival(*link_, now), now);
    return true;
}

void SimLink::seen(Number number, Moment now) {
    if (isConnected()) carryOut(link_->seen(number, now), now);
}

void SimLink::replied(const fleet::Reply& reply, Moment now) {
    if (isConnected()) carryOut(link_->replied(reply, now), now);
}

void SimLink::ended(const fleet::Outcome& outcome, Moment now) {
    if (isUp() && listensToHost_) carryOut(link_->ended(outcome, now), now);
}

void SimLink::hostStarted(Moment now) {
    if (!isUp()) return;
    listensToHost_ = true;
    carryOut(link_->hostIs(host_.journal(), host_.unfinished(), now), now);
}

void SimLink::hostEnded(Moment now) {
    if (!isUp()) return;
    listensToHost_ = false;
    carryOut(link_->hostIsAway(now), now);
}

void SimLink::carryOut(const fleet::Actions& actions, Moment) {
    for (const fleet::Action& action : actions) {
        if (dice_.fault(1)) throw Killed{};
        std::visit([this](const auto& one) { apply(one); }, action);
    }
}

void SimLink::apply(const fleet::ReadOrder& action) {
    const Number number = action.number;
    underWay_.push_back([this, number](fleet::Link& link, Moment now) {
        if (!isConnected_ || dice_.fault(5)) return link.unanswered(number, now);
        // A server that lags behind does not have it yet.
        const auto message = bus_.fetch(host_.key(), number);
        if (!message || dice_.fault(5)) return link.missing(number, now);
        std::optional<fleet::Directive> directive =
            directiveOf(message->bytes, host_.key(), number);
        if (!directive) return link.missing(number, now);
        return link.read(number, std::move(*directive), now);
    });
}

void SimLink::apply(const fleet::PrepareFiles& action) {
    const Number number = action.directive.number;
    underWay_.push_back([this, number](fleet::Link& link, Moment now) {
        if (dice_.fault(10)) return link.prepared(number, fleet::NotNow{"no file server"}, now);
        return link.prepared(number, fleet::FilesPlaced{}, now);
    });
}

void SimLink::apply(const fleet::HandOver& action) {
    const Number number = action.directive.number;
    const fleet::HandOverAnswer answer = host_.handOver(action);
    if (dice_.fault(2)) throw Killed{};
    underWay_.push_back([this, number, answer](fleet::Link& link, Moment now) {
        fleet::Actions actions = link.recorded(number, answer, now);
        if (std::holds_alternative<fleet::OtherJournal>(answer) && host_.isUp()) {
            fleet::Actions more = link.hostIs(host_.journal(), host_.unfinished(), now);
            actions.insert(actions.end(), more.begin(), more.end());
        }
        return actions;
    });
}

void SimLink::apply(const fleet::EnterEnd& action) {
    const Number number = action.directive.number;
    const fleet::HandOverAnswer answer = host_.enter(action);
    underWay_.push_back([this, number, answer](fleet::Link& link, Moment now) {
        fleet::Actions actions = link.recorded(number, answer, now);
        if (std::holds_alternative<fleet::OtherJournal>(answer) && host_.isUp()) {
            fleet::Actions more = link.hostIs(host_.journal(), host_.unfinished(), now);
            actions.insert(actions.end(), more.begin(), more.end());
        }
        return actions;
    });
}

void SimLink::apply(const fleet::CancelTask& action) {
    const Number by = action.by;
    const fleet::CancelAnswer answer = host_.cancel(action.order);
    underWay_.push_back(
        [by, answer](fleet::Link& link, Moment now) { return link.cancelled(by, answer, now); });
}

void SimLink::apply(const fleet::LookUp& action) {
    const std::string order = action.order;
    const fleet::LookUpAnswer answer = host_.lookUp(order);
    underWay_.push_back(
        [order, answer](fleet::Link& link, Moment now) { return link.found(order, answer, now); });
}

void SimLink::apply(const fleet::Report& action) {
    if (isConnected_ && !dice_.fault(15)) bus_.publish(action.outcome);
}

void SimLink::apply(const fleet::Keep& action) {
    if (dice_.fault(1)) throw Killed{};
    disk_ = action.kept;
    if (dice_.fault(1)) throw Killed{};
}

void SimLink::apply(const fleet::SayHello& action) {
    fleet::Hello hello = action.hello;
    if (action.listWanted && host_.isUp()) {
        hello.have.emplace();
        for (const auto& [order, task] : host_.journals().back().tasks) {
            hello.have->push_back({order, 0});
        }
    }
    if (isConnected_ && !dice_.fault(10)) return onHello(hello);
    const std::string nonce = hello.nonce;
    underWay_.push_back(
        [nonce](fleet::Link& link, Moment now) { return link.unheard(nonce, now); });
}

void SimLink::apply(const fleet::StopLink& action) {
    stopped_ = action.reason;
}

}  // namespace model
