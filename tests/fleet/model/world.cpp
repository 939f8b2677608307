#include "tests/fleet/model/world.h"

#include <algorithm>
#include <set>

#include "tests/fleet/model/sim_store.h"

namespace model {

using fleet::Moment;
using fleet::Number;

World::World(std::uint64_t seed, Disasters disasters, const MakeStore& makeStore)
    : dice_(seed),
      disasters_(disasters),
      bus_(dice_),
      centreBus_(bus_, dice_),
      store_(makeStore(dice_)) {
    dice_.faults = false;
    const std::size_t hosts = 1 + dice_.below(3);
    seats_.resize(hosts);
    for (std::size_t i = 0; i < hosts; ++i) {
        Seat& seat = seats_[i];
        const std::string key = "H" + std::to_string(i);
        seat.host = std::make_unique<SimHost>(key, dice_);
        seat.link = std::make_unique<SimLink>(*seat.host, bus_, dice_, key + "-link");
        seat.link->onHello = [this, key](const fleet::Hello& hello) {
            hellos_.emplace_back(key, hello);
        };
        seat.host->onEnd = [this, &seat](const fleet::Outcome& outcome) {
            asLink(seat, [&] { seat.link->ended(outcome, now_); });
        };
        fleet::HostRecord record;
        record.host = key;
        store_->keepHost(record);
    }
    centreBus_.republish = [this](const std::string& host, Number number) {
        for (Seat& seat : seats_) {
            if (seat.host->key() != host || dice_.fault(20)) continue;
            asLink(seat, [&] { seat.link->seen(number, now_); });
        }
    };
    startCentre();
    store_->keepBackup();
    dice_.faults = true;
}

std::unique_ptr<ModelStore> World::inMemory(Dice& dice) {
    return std::make_unique<SimStore>(dice);
}

void World::startCentre() {
    centre_ = std::make_unique<fleet::Centre>(
        *store_, centreBus_,
        [this](const fleet::Alarm& alarm) { alarms_.push_back(alarm.host + ": " + alarm.text); });
}

template <typename Function>
void World::asCentre(Function function) {
    if (!centre_) return;
    try {
        function();
    } catch (const Killed&) {
        centre_.reset();
    }
}

template <typename Function>
void World::asLink(Seat& seat, Function function) {
    if (!seat.link->isUp()) return;
    try {
        function();
    } catch (const Killed&) {
        seat.link->kill();
    }
}

void World::run(std::size_t steps) {
    for (std::size_t i = 0; i < steps; ++i)
        step();
    makePeace();
}

void World::step() {
    now_ += Moment(dice_.below(1'500));
    if (dice_.chance(8)) submit();
    if (dice_.faults) disturb();
    serveCentre();
    for (Seat& seat : seats_)
        serveSeat(seat);
}

void World::submit() {
    SimOrder order;
    order.host = seats_[dice_.below(seats_.size())].host->key();
    order.order = "order-" + std::to_string(++orderCount_);
    order.issued = now_;
    order.expires = now_ + Moment(dice_.chance(25) ? 5'000 + dice_.below(60'000) : 86'400'000);
    order.hasFiles = dice_.chance(15);
    order.isBad = dice_.chance(5);
    order.isForbidden = dice_.chance(5);
    if (dice_.chance(15) && !orders_.empty()) {
        auto earlier = orders_.begin();
        std::advance(earlier, static_cast<std::ptrdiff_t>(dice_.below(orders_.size())));
        order.host = earlier->second.host;
        order.cancels = earlier->first;
        order.hasFiles = order.isBad = false;
    }
    asCentre([&] {
        const auto number =
            centre_->submit(order.host, order.order, [&](Number n) { return bytesOf(order, n); });
        if (number) orders_[order.order] = order;
    });
    // An operator who was not answered may have been heard.
    if (store_->order(order.host, order.order)) orders_[order.order] = order;
}

void World::disturb() {
    Seat& seat = seats_[dice_.below(seats_.size())];
    if (dice_.chance(2)) seat.link->kill();
    if (dice_.chance(2) && seat.link->isConnected()) seat.link->disconnect();
    if (dice_.chance(2) && seat.host->isUp()) {
        seat.host->kill();
        asLink(seat, [&] { seat.link->hostEnded(now_); });
    }
    if (dice_.chance(1)) centre_.reset();
    if (dice_.chance(1)) now_ += Moment(dice_.below(120'000));
    if (disasters_.journals && dice_.chance(1) && !seat.host->isUp()) seat.host->setJournalAside();
    if (disasters_.links && dice_.chance(3)) seat.backup = seat.link->disk();
    if (disasters_.links && dice_.chance(1) && !seat.link->isUp()) {
        seat.link->putBack(seat.backup);
        seat.hasForgotten = true;
    }
    if (dice_.chance(5)) bus_.sync();
    if (disasters_.power) disturbBus();
    if (disasters_.backups) restoreCentre();
}

void World::disturbBus() {
    if (dice_.below(200) == 0) bus_.losePower();
    if (dice_.below(1'000) != 0) return;
    bus_.loseDisks();
    hasLostBus_ = true;
}

void World::restoreCentre() {
    if (dice_.chance(2)) store_->keepBackup();
    if (dice_.below(400) != 0) return;
    centre_.reset();
    store_->putBack();
    hasRestored_ = true;
    const bool faults = std::exchange(dice_.faults, false);
    startCentre();
    sweep([this](const fleet::OrderRecord& order) { centre_->adoptFromBus(order); });
    centre_->restored(now_);
    dice_.faults = faults;
}

void World::serveCentre() {
    if (!centre_) {
        if (dice_.chance(20)) startCentre();
        return;
    }
    if (dice_.chance(50)) deliverHello();
    asCentre([&] {
        if (dice_.chance(50)) centre_->work(1 + dice_.below(8));
    });
    asCentre([&] {
        const auto next = bus_.nextOutcome();
        if (!next || !dice_.chance(70)) return;
        centre_->hear(next->second);
        if (!dice_.fault(5)) bus_.acknowledge(next->first);
    });
    asCentre([&] {
        if (!dice_.chance(2)) return;
        sweep([this](const fleet::OrderRecord& order) { centre_->foundOnBus(order, now_); });
    });
}

void World::sweep(const std::function<void(const fleet::OrderRecord&)>& tell) {
    const std::map<Place, StoredMessage> tasks = bus_.tasks();
    for (const auto& [place, message] : tasks) {
        fleet::OrderRecord found;
        found.host = place.first;
        found.bytes = message.bytes;
        found.order = orderIn(message.bytes, found.number).order;
        tell(found);
    }
}

void World::deliverHello() {
    if (hellos_.empty()) return;
    const auto [host, hello] = hellos_.front();
    hellos_.pop_front();
    std::optional<fleet::Reply> reply;
    asCentre([&] { reply = centre_->greet(host, hello, now_); });
    if (!reply || dice_.fault(10)) return;
    for (Seat& seat : seats_) {
        if (seat.host->key() != host) continue;
        asLink(seat, [&] { seat.link->replied(*reply, now_); });
    }
}

void World::serveSeat(Seat& seat) {
    if (!seat.host->isUp() && dice_.chance(15)) {
        seat.host->start();
        asLink(seat, [&] { seat.link->hostStarted(now_); });
    }
    if (dice_.chance(40)) seat.host->step(now_);
    if (!seat.link->isUp()) {
        if (!dice_.chance(15)) return;
        try {
            seat.link->start(now_);
        } catch (const Killed&) {
            seat.link->kill();
        }
        return;
    }
    if (!seat.link->isConnected() && dice_.chance(20)) {
        asLink(seat, [&] { seat.link->connect(now_); });
    }
    if (dice_.chance(60)) {
        asLink(seat, [&] { seat.link->tick(now_); });
    }
    for (std::size_t i = dice_.below(4); i > 0; --i) {
        asLink(seat, [&] { seat.link->deliver(now_); });
    }
}

void World::makePeace() {
    dice_.faults = false;
    // Longer than any link waits, and often enough for all that is asked for again.
    for (int i = 0; i < 4'000 && !isQuiet(); ++i) {
        now_ += Moment(700);
        serveCentre();
        for (Seat& seat : seats_)
            serveSeat(seat);
    }
}

bool World::isQuiet() const {
    if (!centre_ || bus_.nextOutcome() || !bus_.tasks().empty()) return false;
    if (hasRestored_ && now_ < store_->listUntil() + Moment(90'000)) return false;
    return store_->isAllOver();
}

std::string World::fault() const {
    for (const Seat& seat : seats_) {
        const std::string found = faultOfHost(seat);
        if (!found.empty()) return found;
    }
    if (!bus_.tasks().empty()) return "the bus keeps an order that is over";
    // What a lost record of the centre may bring about: the same order under two numbers.
    if (!alarms_.empty() && !hasRestored_) return "alarm: " + alarms_.front();
    return "";
}

const Task* World::taskOf(const Seat& seat, const fleet::Outcome& outcome) const {
    for (const Journal& journal : seat.host->journals()) {
        if (journal.identity != outcome.journal) continue;
        const auto task = journal.tasks.find(outcome.order);
        return task == journal.tasks.end() ? nullptr : &task->second;
    }
    return nullptr;
}

std::string World::faultOfHost(const Seat& seat) const {
    std::set<std::string> ran;
    Number highest = 0;
    for (const std::string& order : seat.host->ran()) {
        if (!ran.insert(order).second) return order + " ran twice";
        const auto record = store_->order(seat.host->key(), order);
        if (!record) {
            // A host that has lost its journal cannot tell a centre that has lost its record.
            if (hasRestored_ && seat.host->journals().back().tasks.count(order) == 0) continue;
            return order + " ran and the centre does not know it";
        }
        if (record->number != 0 && record->number <= highest) return order + " ran out of turn";
        highest = std::max(highest, record->number);
    }
    for (const fleet::OrderRecord& order : store_->orders()) {
        if (order.host != seat.host->key()) continue;
        const std::string found = faultOfOrder(seat, order);
        if (!found.empty()) return found;
    }
    return "";
}

std::string World::faultOfOrder(const Seat& seat, const fleet::OrderRecord& order) const {
    const std::string& name = order.order;
    if (!order.outcome) return name + " has no outcome";
    const std::string& state = order.outcome->state;
    const SimOrder& asked = orders_.at(name);
    if (state == fleet::kUnknown) {
        const bool mayBe = seat.host->hasLostJournal() || seat.hasForgotten || hasRestored_;
        return mayBe ? "" : name + " is unknown without a reason";
    }
    const Task* const task = taskOf(seat, *order.outcome);
    if (task == nullptr) return name + " has an outcome that its journal does not know";
    if (task->state != state) return name + " is " + task->state + " and the centre has " + state;
    if (asked.isForbidden && state != "refused" && state != "cancelled" && state != "expired" &&
        state != "interrupted") {
        return name + " was not refused but is " + state;
    }
    if (state == "done" && !asked.cancels.empty()) {
        const auto target = store_->order(seat.host->key(), asked.cancels);
        const bool isCancelled = target && target->outcome && target->outcome->state == "cancelled";
        // With the journal of a cancelled order its end may be gone.
        if (target && !isCancelled && !seat.host->hasLostJournal()) {
            return name + " says that it has cancelled, but " + asked.cancels + " is " +
                   target->outcome->state;
        }
    }
    return "";
}

}  // namespace model
