/// A centre with hosts and roll-outs, on a database in memory and a bus without faults.
#pragma once

#include <gtest/gtest.h>

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "fleet/bus/messages/order.h"
#include "fleet/server/core/centre.h"
#include "fleet/server/rollouts/rollout_error.h"
#include "fleet/server/rollouts/rollouts.h"
#include "fleet/server/store/centre_schema.h"
#include "fleet/server/store/sqlite_centre_store.h"
#include "fleet/server/store/sqlite_rollout_store.h"
#include "tests/fleet/model/sim_bus.h"

namespace rollout_test {

using fleet::Moment;
using fleet::Part;
using fleet::PartState;
using fleet::PauseCause;
using fleet::RolloutError;
using fleet::RolloutState;
using Names = std::vector<std::string>;

constexpr Moment kSecond{1'000};
constexpr Moment kMinute{60'000};
constexpr Moment kHour{3'600'000};

class RolloutTest : public testing::Test {
protected:
    RolloutTest() {
        dice_.faults = false;
        bus_.republish = [](const std::string&, fleet::Number) {};
        fleet::makeCentreTables(database_);
        rollouts_ = std::make_unique<fleet::Rollouts>(store_, giver());
    }

    /// Hosts "h00", "h01" and so on, heard right now.
    Names enrol(std::size_t count) {
        Names hosts;
        for (std::size_t i = 0; i < count; ++i) {
            hosts.push_back(std::string("h") + (i < 10 ? "0" : "") + std::to_string(i));
            hear(hosts.back());
        }
        return hosts;
    }
    /// The host says hello.
    void hear(const std::string& host) {
        fleet::HostRecord record = centreStore_.host(host).value_or(fleet::HostRecord{});
        record.host = host;
        record.heard = now_;
        centreStore_.keepHost(record);
    }

    /// A START of "ux", good for a day.
    fleet::Order order(const std::string& host) const {
        fleet::Order made;
        made.fleet = "fleet";
        made.id = fleet::makeOrderId();
        made.host = host;
        made.selector = "env=test";
        made.kind = "START";
        made.body = R"({"product":"ux"})";
        made.issued = now_;
        made.expires = now_ + 24 * kHour;
        return made;
    }
    std::string sign(const fleet::Order& made) const {
        return fleet::signOrder(made, key_, "certificate");
    }
    Names orders(const Names& hosts) const {
        Names signedOrders;
        for (const std::string& host : hosts)
            signedOrders.push_back(sign(order(host)));
        return signedOrders;
    }
    fleet::RolloutOperator by() const { return {"anna", key_.publicKey()}; }
    /// A roll-out whose orders nobody has read yet.
    struct Wanted {
        std::string id;
        fleet::RolloutOperator by;
        fleet::RolloutPlan plan;
        Names orders;
    };
    std::vector<fleet::IncomingOrder> read(const Names& signedOrders) const {
        return fleet::readIncomingOrders(signedOrders, by(), "fleet", now_);
    }
    fleet::NewRollout read(const Wanted& wanted) const {
        return {wanted.id, wanted.by, wanted.plan,
                fleet::readIncomingOrders(wanted.orders, wanted.by, "fleet", now_)};
    }
    std::string make(const Wanted& wanted) { return rollouts_->create(read(wanted), now_); }
    Wanted wanted(const Names& hosts) const {
        Wanted made;
        made.by = by();
        made.plan = plan_;
        made.orders = orders(hosts);
        return made;
    }
    /// A roll-out to that many new hosts, as plan_ says.
    std::string create(std::size_t hosts) {
        id_ = make(wanted(enrol(hosts)));
        return id_;
    }

    /// Ticks until nothing is left to be done at once.
    void tick() {
        while (rollouts_->tick(now_)) {
        }
    }
    void tickAfter(Moment time) {
        now_ += time;
        tick();
    }
    /// The host tells how its order ended.
    void end(const std::string& host, const std::string& state, const std::string& task = "") {
        fleet::Outcome outcome;
        outcome.host = host;
        outcome.order = part(host).order;
        outcome.journal = "journal";
        outcome.state = state;
        outcome.task = task;
        centre_.hear(outcome);
    }
    void endAll(const Names& hosts, const std::string& state) {
        for (const std::string& host : hosts)
            end(host, state);
    }

    Part part(const std::string& host) const {
        return store_.part(store_.rollout(id_).value().row, host).value();
    }
    fleet::RolloutView view() const { return rollouts_->show(id_, now_); }
    RolloutState state() const { return view().rollout.state; }
    PauseCause cause() const { return view().rollout.cause; }
    std::size_t wave() const { return view().rollout.wave; }
    /// Hosts in the state "waiting", "released" or in one of those in which orders end.
    Names hostsThatAre(const std::string& name) const {
        Names hosts;
        for (const fleet::PartView& one : rollouts_->parts(id_, 0, 1'000'000, now_)) {
            if (nameOfState(one.sight.part) == name) hosts.push_back(one.sight.part.host);
        }
        return hosts;
    }
    /// The orders that the host was given, ascending.
    Names given(const std::string& host) const {
        Names names;
        for (fleet::Number number = 1; const auto found = centreStore_.orderAt(host, number);
             ++number)
            names.push_back(found->order);
        return names;
    }
    static Names hostsOf(const std::vector<fleet::HostToSign>& toSign) {
        Names hosts;
        for (const fleet::HostToSign& one : toSign)
            hosts.push_back(one.host);
        return hosts;
    }
    /// Orders that cancel what toCancel() names.
    Names cancels() const {
        Names made;
        for (const fleet::HostToSign& one : rollouts_->toCancel(id_)) {
            fleet::Order cancel = order(one.host);
            cancel.kind = fleet::kCancel;
            cancel.body = R"({"order":")" + one.order + R"("})";
            made.push_back(sign(cancel));
        }
        return made;
    }

    /// Insists that the call is refused so, and that no row changed.
    template <typename Call>
    void expectRefusal(RolloutError::Kind kind, const std::string& words, Call call) {
        const std::string before = allRows();
        try {
            call();
            ADD_FAILURE() << "it was done";
        } catch (const RolloutError& error) {
            EXPECT_EQ(error.kind(), kind) << error.what();
            EXPECT_NE(std::string(error.what()).find(words), std::string::npos) << error.what();
        }
        EXPECT_EQ(allRows(), before);
    }
    /// All that the roll-outs' tables hold.
    std::string allRows() {
        std::string text;
        for (const auto& [table, columns] : std::map<std::string, int>{{"rollouts", 23},
                                                                       {"rollout_parts", 13},
                                                                       {"rollout_orders", 3},
                                                                       {"rollout_cancels", 3},
                                                                       {"rollout_news", 2},
                                                                       {"orders", 11}}) {
            sqlite::Statement rows = database_.ask(("SELECT * FROM " + table).c_str());
            while (rows.step()) {
                text += table;
                for (int column = 0; column < columns; ++column)
                    text += '|' + rows.bytes(column);
                text += '\n';
            }
        }
        return text;
    }
    fleet::GiveNumber giver() {
        return [this](const std::string& host, const std::string& order, const std::string& bytes) {
            return centre_.submit(host, order, [&](fleet::Number number) {
                return std::to_string(number) + "=" + bytes;
            });
        };
    }

    Moment now_{1'700'000'000'000};
    const fleet::KeyPair key_ = fleet::KeyPair::make(fleet::KeyKind::User);
    fleet::RolloutPlan plan_;
    std::string id_;  ///< the roll-out that the functions above mean
    sqlite::Database database_{":memory:"};
    model::Dice dice_{1};
    model::SimBus disk_{dice_};
    model::SimCentreBus bus_{disk_, dice_};
    fleet::SqliteCentreStore centreStore_{database_};
    fleet::Centre centre_{centreStore_, bus_, [](const fleet::Alarm&) {}};
    fleet::SqliteRolloutStore store_{database_};
    std::unique_ptr<fleet::Rollouts> rollouts_;
};

}  // namespace rollout_test
