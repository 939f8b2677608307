/// Orders on their way from the centre to the agents of a host, and back.
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/trust/sealed.h"
#include "support/process/left_running.h"
#include "tests/fleet/e2e/fleet_scene.h"

namespace {

using fleet_e2e::FleetHost;
using fleet_e2e::FleetScene;
using fleet_e2e::kPatience;
using nlohmann::json;

class FleetOrders : public testing::Test {
protected:
    FleetOrders() { host->startLink(); }

    json taskOf(const std::string& order) { return json::parse(scene.outcome(*host, order)->task); }
    /// The agent waits until release() is called.
    void holdAgents() {
        host->home().agentScript(untilReleased(host->home().files().path("released")));
    }
    void release() { host->home().files().write("released", ""); }

    FleetScene scene;
    std::unique_ptr<FleetHost> host = scene.enrol("web-1");
};

TEST_F(FleetOrders, RunOnTheHostAndTheirOutcomesAreKept) {
    const std::string order = scene.submit(*host, "START");
    EXPECT_EQ(scene.awaitEnd(*host, order), "done");
    EXPECT_EQ(host->callsOf("start"), 1U);
    const json task = taskOf(order);
    EXPECT_EQ(task.at("transid"), order);
    EXPECT_EQ(task.at("command"), "START");
    EXPECT_EQ(task.at("product"), "ux");
}

TEST_F(FleetOrders, RunInTheOrderInWhichTheCentreTookThem) {
    std::vector<std::string> orders;
    for (int i = 0; i < 6; ++i) {
        const std::string product = "{\"product\":\"p" + std::to_string(i) + "\"}";
        orders.push_back(scene.submit(scene.order(*host, "START", product)));
    }
    for (const std::string& order : orders)
        EXPECT_EQ(scene.awaitEnd(*host, order), "done");
    const std::vector<std::string> calls = host->home().agentCalls();
    ASSERT_EQ(calls.size(), 6U);
    for (std::size_t i = 0; i < calls.size(); ++i)
        EXPECT_NE(calls[i].find("p" + std::to_string(i)), std::string::npos) << calls[i];
}

TEST_F(FleetOrders, ThatFailSayWhyTheyDid) {
    host->home().agentScript("echo no licence >&2; exit 3");
    const std::string order = scene.submit(*host, "START");
    EXPECT_EQ(scene.awaitEnd(*host, order), "failed");
    EXPECT_EQ(taskOf(order).at("details").at("commands").at(0).at("stderr"), "no licence\n");
}

TEST_F(FleetOrders, ThatTheOperatorMayNotGiveAreRefusedByTheHost) {
    scene.certificate().commands = {"STOP"};
    const std::string order = scene.submit(*host, "START");
    EXPECT_EQ(scene.awaitEnd(*host, order), "refused");
    EXPECT_EQ(taskOf(order).at("reason"),
              "the operator's certificate does not allow this command for this product");
    EXPECT_EQ(host->callsOf("start"), 0U);
}

TEST_F(FleetOrders, ForHostsWithOtherLabelsAreRefusedByTheHost) {
    fleet::Order order = scene.order(*host, "START");
    order.selector = "env=production";
    scene.submit(order);
    EXPECT_EQ(scene.awaitEnd(*host, order.id), "refused");
    EXPECT_EQ(taskOf(order.id).at("reason"), "the order is not for hosts with these labels");
}

TEST_F(FleetOrders, ThatTheHostDoesNotUnderstandAreRefusedInItsWords) {
    const std::string order = scene.submit(scene.order(*host, "START", R"({"colour":"red"})"));
    EXPECT_EQ(scene.awaitEnd(*host, order), "refused");
    EXPECT_NE(taskOf(order).at("reason").get<std::string>().find("colour"), std::string::npos);
    const std::string wrong = R"({"product":"ux","optional":7})";
    EXPECT_EQ(scene.awaitEnd(*host, scene.submit(scene.order(*host, "START", wrong))), "refused");
    EXPECT_EQ(scene.awaitEnd(*host, scene.submit(*host, "START")), "done");
}

TEST_F(FleetOrders, ThatWaitedForTooLongExpire) {
    host->stopLink();
    fleet::Order order = scene.order(*host, "START");
    order.expires = fleet_e2e::now() + std::chrono::milliseconds(1);
    scene.submit(order);
    host->startLink();
    EXPECT_EQ(scene.awaitEnd(*host, order.id), "expired");
    EXPECT_EQ(host->callsOf("start"), 0U);
}

TEST_F(FleetOrders, CanBeCancelledBeforeTheirTurn) {
    holdAgents();
    const std::string first = scene.submit(*host, "START");
    const std::string second = scene.submit(*host, "STOP");
    const std::string cancel =
        scene.submit(scene.order(*host, fleet::kCancel, json({{"order", second}}).dump()));
    EXPECT_EQ(scene.awaitEnd(*host, second), "cancelled");
    EXPECT_EQ(scene.awaitEnd(*host, cancel), "done");
    release();
    EXPECT_EQ(scene.awaitEnd(*host, first), "done");
    EXPECT_EQ(host->callsOf("stop"), 0U);
}

TEST_F(FleetOrders, KeepTheirSecretsFromBusAndCentre) {
    const std::string secret = "a-password-that-nobody-else-may-see";
    const std::string sealed =
        fleet::sealFor(host->signing(), json({{"context", "PASSWORD=" + secret}}).dump());
    const std::string order = scene.submit(scene.order(
        *host, "SETCONFIG", json({{"product", "ux"}, {"sealed", fleet::base64Of(sealed)}}).dump()));
    const std::string end = scene.awaitEnd(*host, order);
    EXPECT_NE(end, "");
    EXPECT_NE(end, "refused") << taskOf(order);
    EXPECT_NE(taskOf(order).at("command"), "");
    scene.stopCentre();
    for (const std::string& directory : {scene.bus().server().dir().path(), scene.files().path()}) {
        const ProgramResult found = runProgram({"/bin/grep", "-r", "-l", "-a", secret, directory});
        EXPECT_EQ(found.status, 1) << found.out;
    }
}

}  // namespace
