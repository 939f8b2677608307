// ctest-label: threaded
// A centre on a bus of three servers, each of which has every message, that loses one of them at a
// time.
//
//   ZAV_FLEET_SEED=17 build/native/bin/fleet_server_program_threaded_tests
//   --gtest_filter='Cluster*'
//
// Without the variable the servers go in an order of chance; its seed is printed.

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <future>
#include <iostream>
#include <memory>
#include <nlohmann/json.hpp>
#include <random>
#include <string>
#include <vector>

#include "crash/variable_or.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/nats/api.h"
#include "fleet/bus/nats/store.h"
#include "fleet/server/program/centre_program.h"
#include "support/fleet/nats_server.h"
#include "support/free_port.h"
#include "support/scratch_dir.h"

namespace {

using fleet::CentreProgram;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::Number;
using nlohmann::json;
using namespace std::chrono_literals;

constexpr std::size_t kServers = 3;
constexpr int kOrdersAtATime = 40;
/// Elections and copies take their time on a machine that does much else.
constexpr auto kSettledWithin = 180s;

class ClusterOfThree : public testing::Test {
protected:
    ClusterOfThree() {
        std::vector<int> ports;
        std::string routes;
        for (std::size_t i = 0; i < kServers; ++i) {
            ports.push_back(freePort());
            routes += (i == 0 ? "" : ", ") + std::string("\"nats://127.0.0.1:") +
                      std::to_string(ports.back()) + '"';
        }
        for (std::size_t i = 0; i < kServers; ++i) {
            servers_.push_back(std::make_unique<NatsServer>(
                "server_name: s" + std::to_string(i) + "\ncluster { name: c, listen: \"127.0.0.1:" +
                std::to_string(ports[i]) + "\", routes: [ " + routes + "] }\n"));
        }
        fleet::CentreSettings settings{scratch_.path("orders"),
                                       bus(),
                                       centreKey_,
                                       {16 << 20, static_cast<int>(kServers)},
                                       "this centre"};
        centre_ = std::make_unique<CentreProgram>(std::move(settings));
        running_ = std::async(std::launch::async, [this] { return centre_->run(); });
    }
    ~ClusterOfThree() override {
        centre_->end();
        running_.wait();
    }

    fleet::ConnectionOptions bus() const {
        fleet::ConnectionOptions options;
        for (const auto& server : servers_)
            options.urls.push_back(server->url());
        options.reconnectWait = 100ms;
        options.reconnectJitter = 10ms;
        return options;
    }
    void enrolHost() {
        centre_
            ->ask([this](fleet::CentreParts& parts) {
                fleet::HostRecord record;
                record.host = host_.publicKey();
                record.name = "web-1";
                parts.store.keepHost(record);
                return true;
            })
            .get();
    }
    void submitSome() {
        const KeyPair anybody = KeyPair::make(KeyKind::User);
        for (int i = 0; i < kOrdersAtATime; ++i) {
            fleet::Order order;
            order.fleet = "demo";
            order.id = fleet::makeOrderId();
            order.host = host_.publicKey();
            order.selector = "*";
            order.kind = "START";
            order.body = "{}";
            order.expires = fleet::Moment(1);
            given_ = centre_->submit(signOrder(order, anybody, "certificate")).get().value();
        }
    }
    std::size_t unpublished() {
        return centre_
            ->ask(
                [](fleet::CentreParts& parts) { return parts.store.unpublished(1'000'000, 0).size(); })
            .get();
    }
    /// Whether all servers have all that the streams hold, so that the next one may go.
    bool areAllCurrent() const {
        const auto asked = fleet::Connection::connect(bus());
        if (!asked.connection) return false;
        for (const char* const stream : {"TASKS", "OUT", "KV_HOSTS", "KV_CENTRE"}) {
            const auto info =
                askStore(*asked.connection, std::string("STREAM.INFO.") + stream, "", 5s);
            if (!info.status.done()) return false;
            const json document = json::parse(info.json);
            const json replicas = document.at("cluster").value("replicas", json::array());
            const auto isCurrent = [](const json& replica) {
                return replica.value("current", false) && !replica.value("offline", false);
            };
            if (replicas.size() != kServers - 1 ||
                !std::all_of(replicas.begin(), replicas.end(), isCurrent)) {
                return false;
            }
        }
        return true;
    }

    ScratchDir scratch_;
    std::vector<std::unique_ptr<NatsServer>> servers_;
    const KeyPair centreKey_ = KeyPair::make(KeyKind::User);
    const KeyPair host_ = KeyPair::make(KeyKind::User);
    std::unique_ptr<CentreProgram> centre_;
    std::future<CentreProgram::End> running_;
    Number given_ = 0;  ///< the highest number of an order
};

TEST_F(ClusterOfThree, MayLoseOneServerAtATimeAndNoOrder) {
    const unsigned seed = variableOr("ZAV_FLEET_SEED", std::random_device()());
    std::cout << "the servers go with the seed " << seed << std::endl;
    std::mt19937 random(seed);
    ASSERT_TRUE(eventually([this] { return centre_->isWorking(); }, kSettledWithin));
    enrolHost();
    std::vector<std::size_t> order = {0, 1, 2};
    std::shuffle(order.begin(), order.end(), random);
    for (const std::size_t server : order) {
        ASSERT_TRUE(eventually([this] { return areAllCurrent(); }, kSettledWithin));
        submitSome();
        servers_[server]->kill();
        submitSome();
        ASSERT_TRUE(eventually([this] { return unpublished() == 0; }, kSettledWithin))
            << "two servers are enough";
        servers_[server]->start();
    }
    ASSERT_TRUE(centre_->isWorking());
    EXPECT_EQ(given_, static_cast<Number>(kOrdersAtATime) * 2 * kServers);
    const auto reader = fleet::Connection::connect(bus());
    ASSERT_TRUE(reader.connection) << reader.text;
    for (Number number = 1; number <= given_; ++number) {
        const std::string subject = fleet::taskSubject(host_.publicKey(), number);
        // A server that lags behind may not have it yet.
        EXPECT_TRUE(eventually([&] {
            return fleet::lastOn(*reader.connection, fleet::kTasksStream, subject, 10s).kind ==
                   fleet::LastResult::Kind::Found;
        })) << number;
    }
    centre_->end();
    EXPECT_EQ(running_.wait_for(60s), std::future_status::ready);
}

}  // namespace
