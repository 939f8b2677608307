/// A fleet of real programs to which something is done while roll-outs run, and the comparison
/// afterwards: of what the centre has recorded with the journals of the hosts, and with what their
/// agents wrote down themselves.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <map>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>
#include <thread>
#include <vector>

#include "host/raw_client.h"
#include "tests/fleet/programs/centre_records.h"
#include "tests/fleet/programs/program_fleet.h"

namespace harmed_fleet {

using fleet_programs::CentreRecords;
using fleet_programs::JoinedHost;
using fleet_programs::kPatience;
using fleet_programs::ProgramFleet;
using fleet_programs::RolledOut;
using nlohmann::json;

/// Small enough for one machine, and enough that they are not all in the same state.
inline constexpr int kHosts = 5;

class HarmedFleet : public testing::Test {
protected:
    HarmedFleet() {
        fleet_.startBus();
        fleet_.startCentre();
        fleet_.awaitCentre();
        for (int i = 0; i < kHosts; ++i) {
            hosts_.push_back(std::make_unique<JoinedHost>(fleet_, "host-" + std::to_string(i + 1)));
            // Long enough that some are killed within it.
            hosts_.back()->home().agentScript("sleep 0.2");
        }
    }

    /// A roll-out to all hosts of a START of a product of its own. It may be there although zavctl
    /// has failed: then there is one more.
    void beginRollout() {
        ASSERT_TRUE(eventually([this] { return tryRollout(); }, kPatience)) << lastTrouble_;
    }
    /// A centre that has lost its lease ends, and its service manager starts it again.
    void supervise() {
        if (!fleet_.centre().running()) fleet_.startCentre();
    }
    bool tryRollout() {
        supervise();
        const std::string product = "k" + std::to_string(++products_);
        const ProgramResult result = fleet_
                                         .zavctl({"--timeout", "60", "start", product, "--on", "*",
                                                  "--no-wait", "--max-failures", "100%"})
                                         ->wait(kPatience);
        lastTrouble_ = result.err;
        if (result.status == 0) return true;
        // The centre opens so many sessions and no more.
        std::this_thread::sleep_for(std::chrono::seconds(1));
        return false;
    }

    /// Roll-outs that the centre has made, among them those of which the operator got no answer.
    std::int64_t madeRollouts() const { return CentreRecords(fleet_.directory()).rollouts(); }

    bool isAllOver() const {
        CentreRecords records(fleet_.directory());
        const std::vector<RolledOut> orders = records.rolledOut();
        return records.finishedRollouts() == records.rollouts() &&
               std::all_of(orders.begin(), orders.end(), [](const RolledOut& order) {
                   return !order.partState.empty() && !order.orderState.empty();
               });
    }
    /// Waits until all orders are over, and longer if much was done to the fleet. A centre that has
    /// ended is started again.
    bool awaitEnd(std::chrono::seconds more) {
        return eventually(
            [this] {
                std::this_thread::sleep_for(std::chrono::milliseconds(100));
                supervise();
                return isAllOver();
            },
            kPatience + more);
    }
    /// What is not over, for whoever reads why a test has failed.
    std::string whatIsOpen() const {
        std::string text;
        for (const RolledOut& order : CentreRecords(fleet_.directory()).rolledOut()) {
            if (!order.partState.empty()) continue;
            text += order.product + " of " + order.host + ", number " +
                    std::to_string(order.number) + ": \"" + order.orderState + "\"\n";
        }
        return text + fleet_.centre().err();
    }

    /// The products whose agents were called on the host, in turn.
    static std::vector<std::string> callsOf(JoinedHost& host) {
        std::vector<std::string> products;
        for (const std::string& call : host.home().agentCalls())
            products.push_back(call.substr(call.rfind(' ') + 1));
        return products;
    }

    /// The host's own record of an order; 404 if it has none.
    static RawClient::Answer taskOf(JoinedHost& host, const std::string& order) {
        RawClient client(host.host().socket());
        return client.get("/v1/tasks/" + order);
    }

    /// Where the centre, the host's journal and the agent's own notes do not agree.
    void checkOrders(JoinedHost& host, const std::vector<RolledOut>& all,
                     std::vector<std::string>& faults) {
        const std::vector<std::string> calls = callsOf(host);
        std::map<std::string, std::int64_t> numbers;
        for (const RolledOut& order : all) {
            if (order.host != host.key()) continue;
            const std::string what = host.name() + ", " + order.product + ": ";
            numbers[order.product] = order.number;
            if (order.partState != order.orderState) {
                faults.push_back(what + "is " + order.orderState + ", and " + order.partState +
                                 " to the roll-out");
            }
            const RawClient::Answer task = taskOf(host, order.order);
            const std::string state =
                task.status == 200 ? json::parse(task.body).at("state") : json("unknown");
            if (order.orderState != state) {
                faults.push_back(what + "is " + order.orderState + ", and " + state +
                                 " in the host's journal");
            }
            const auto ran = std::count(calls.begin(), calls.end(), order.product);
            const bool mayHaveRun = state == "done" || state == "interrupted";
            if (ran > 1 || (state == "done" && ran != 1) || (!mayHaveRun && ran > 0)) {
                faults.push_back(what + "is " + state + " and ran " + std::to_string(ran) +
                                 " times");
            }
        }
        checkTurns(host, calls, numbers, faults);
    }
    static void checkTurns(JoinedHost& host, const std::vector<std::string>& calls,
                           const std::map<std::string, std::int64_t>& numbers,
                           std::vector<std::string>& faults) {
        std::int64_t last = 0;
        for (const std::string& product : calls) {
            const auto number = numbers.find(product);
            if (number == numbers.end()) {
                faults.push_back(host.name() + ": " + product + " ran without a record");
            } else if (number->second <= last) {
                faults.push_back(host.name() + ": " + product + " ran out of its turn");
            } else {
                last = number->second;
            }
        }
    }
    std::vector<std::string> faults() {
        std::vector<std::string> found;
        const std::vector<RolledOut> all = CentreRecords(fleet_.directory()).rolledOut();
        for (const auto& host : hosts_)
            checkOrders(*host, all, found);
        return found;
    }
    /// How often orders have ended in which state.
    std::map<std::string, int> ends() const {
        std::map<std::string, int> counts;
        for (const RolledOut& order : CentreRecords(fleet_.directory()).rolledOut())
            ++counts[order.orderState];
        return counts;
    }

    ProgramFleet fleet_;
    std::vector<std::unique_ptr<JoinedHost>> hosts_;
    int products_ = 0;
    std::string lastTrouble_;
};

}  // namespace harmed_fleet
