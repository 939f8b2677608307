/// zavctl --fleet URL task output and doctor, with all programs of a fleet behind.
#include <gtest/gtest.h>

#include <chrono>
#include <csignal>
#include <memory>
#include <nlohmann/json.hpp>
#include <sstream>
#include <string>
#include <vector>

#include "support/process/left_running.h"
#include "tests/fleet/e2e/fleet_scene.h"
#include "tests/fleet/e2e/program_fleet.h"

namespace {

using fleet_e2e::kPatience;
using fleet_e2e::ProgramFleet;
using nlohmann::json;
using std::chrono::seconds;

class OutputOfAFleet : public testing::Test {
protected:
    OutputOfAFleet() { fleet.join("anna", {"--role", "admin"}); }

    std::string released() const { return fleet.home().files().path("released"); }
    void release() { fleet.home().files().write("released", ""); }
    /// An install that prints a line a second until it is released, and then another.
    std::string installThatPrints() {
        return install("n=0\nuntil [ -e '" + released() +
                       "' ] || [ $n -gt 600 ]; do n=$((n + 1)); echo \"line $n\"; "
                       "sleep 1; done\necho the end >&2");
    }
    json latestOrder() const {
        const ProgramResult shown = fleet.zavctl("anna", {"--json", "hosts", "show", "web-1"});
        const json document = json::parse(shown.out, nullptr, false);
        const json orders = document.is_object() ? document.value("orders", json()) : json();
        return orders.empty() ? json::object() : orders.front();
    }
    /// The identifier of an order whose task runs this script; "" if it does not in time.
    std::string install(const std::string& script) {
        const ProgramResult begun =
            fleet.zavctl("anna", {"--on", "env=test", "install", "ux", "010000000", "--no-wait",
                                  "--", "/bin/sh", fleet.home().files().script("script", script)});
        EXPECT_EQ(begun.status, 0) << begun.err;
        const auto runs = [&] {
            const ProgramResult tasks =
                fleet.zavctl("anna", {"--json", "tasks", "--on", "*", "--state", "running"});
            return tasks.out.find(latestOrder().value("order", "none")) != std::string::npos;
        };
        return eventually(runs, kPatience) ? latestOrder().value("order", "") : "";
    }

    ProgramFleet fleet;
};

TEST_F(OutputOfAFleet, ComesWhileTheTaskRunsAndEndsWithIt) {
    const std::string order = installThatPrints();
    ASSERT_NE(order, "");
    const auto following = fleet.startZavctl("anna", {"task", "output", "-f", order});
    EXPECT_TRUE(following->awaitOutput("line 2\n", kPatience)) << following->err();
    EXPECT_EQ(following->out().find("the end"), std::string::npos);
    // Past the first question's time: it is asked again and again.
    EXPECT_TRUE(following->awaitOutput("line 36\n", kPatience)) << following->err();
    release();
    const ProgramResult end = following->wait(kPatience);
    EXPECT_EQ(end.status, 0) << end.err;
    EXPECT_EQ(end.out.rfind("line 1\nline 2\nline 3\n", 0), 0U) << end.out;
    EXPECT_NE(end.err.find("the end"), std::string::npos) << end.err;
    EXPECT_EQ(end.err.find("lost"), std::string::npos) << end.err;

    const ProgramResult kept = fleet.zavctl("anna", {"--json", "task", "output", order});
    EXPECT_EQ(kept.status, 0) << kept.err;
    EXPECT_NE(kept.out.find("line 2"), std::string::npos) << kept.out;
    const ProgramResult named = fleet.zavctl("anna", {"task", "output", order, "--on", "web-1"});
    EXPECT_EQ(named.status, 0) << named.err;
    EXPECT_NE(named.out.find("line 2"), std::string::npos) << named.out;
}

TEST_F(OutputOfAFleet, IsForThoseWhoseCertificateSaysSo) {
    fleet.join("vera", {"--role", "viewer", "--on", "*"});
    fleet.join("otto",
               {"--role", "operator", "--commands", "START", "--products", "*", "--on", "*"});
    fleet.join("dora",
               {"--role", "operator", "--commands", "OUTPUT", "--products", "db", "--on", "*"});
    fleet.join("ulla",
               {"--role", "operator", "--commands", "OUTPUT", "--products", "ux", "--on", "*"});
    const std::string order = installThatPrints();
    ASSERT_NE(order, "");
    for (const char* const name : {"vera", "otto"}) {
        const ProgramResult refused = fleet.zavctl(name, {"task", "output", "-f", order});
        EXPECT_EQ(refused.status, 1);
        EXPECT_NE(refused.err.find("certificate does not allow OUTPUT"), std::string::npos)
            << refused.err;
    }
    const ProgramResult other = fleet.zavctl("dora", {"task", "output", "-f", order});
    EXPECT_EQ(other.status, 1);
    EXPECT_NE(other.err.find("for the product of that task"), std::string::npos) << other.err;
    const auto own = fleet.startZavctl("ulla", {"task", "output", "-f", order});
    EXPECT_TRUE(own->awaitOutput("line 1\n", kPatience)) << own->err();
    release();
    EXPECT_EQ(own->wait(kPatience).status, 0);
}

TEST_F(OutputOfAFleet, IsThatOfFourTasksAtATime) {
    const std::string order = installThatPrints();
    ASSERT_NE(order, "");
    std::vector<std::unique_ptr<Program>> readers;
    for (int i = 0; i < 4; ++i) {
        readers.push_back(fleet.startZavctl("anna", {"task", "output", "-f", order}));
        ASSERT_TRUE(readers.back()->awaitOutput("line 1\n", kPatience)) << readers.back()->err();
    }
    const ProgramResult fifth = fleet.zavctl("anna", {"task", "output", "-f", order});
    EXPECT_EQ(fifth.status, 1);
    EXPECT_NE(fifth.err.find("the output of 4 tasks at a time"), std::string::npos) << fifth.err;
    // Who goes away makes room within half a minute.
    readers.front()->signal(SIGINT);
    EXPECT_EQ(readers.front()->wait(kPatience).status, 130);
    EXPECT_TRUE(eventually(
        [&] {
            return fleet.zavctl("anna", {"task", "output", order}).status == 0;
        },
        kPatience));
    release();
    for (std::size_t i = 1; i < readers.size(); ++i)
        EXPECT_EQ(readers[i]->wait(kPatience).status, 0);
}

TEST_F(OutputOfAFleet, IsNoFasterThanItsLimit) {
    const std::string order = install("echo begun\n" + untilReleased(released()) +
                                      "head -c 6000000 /dev/zero | tr '\\0' x");
    ASSERT_NE(order, "");
    const auto following = fleet.startZavctl("anna", {"task", "output", "-f", order});
    // Who comes when the task is over gets the end that is kept, and that at once.
    ASSERT_TRUE(following->awaitOutput("begun\n", kPatience)) << following->err();
    const auto begun = std::chrono::steady_clock::now();
    release();
    const ProgramResult end = following->wait(kPatience);
    const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - begun;
    EXPECT_EQ(end.status, 0) << end.err;
    EXPECT_GT(end.out.size(), 200'000U);
    EXPECT_LE(static_cast<double>(end.out.size()), 256 * 1024 * (taken.count() + 1));
    EXPECT_NE(end.err.find("bytes came too fast"), std::string::npos) << end.err;
}

TEST_F(OutputOfAFleet, EndsInAClearWordWhenThereIsNothingToShow) {
    const ProgramResult none = fleet.zavctl("anna", {"task", "output", "none", "--on", "web-1"});
    EXPECT_EQ(none.status, 2);
    EXPECT_EQ(none.err, "zavctl: web-1: the host refused the request: there is no task \"none\"\n");
    const ProgramResult nobody = fleet.zavctl("anna", {"task", "output", std::string(32, 'a')});
    EXPECT_EQ(nobody.status, 2);
    EXPECT_NE(nobody.err.find("there is no order"), std::string::npos) << nobody.err;

    const std::string order = installThatPrints();
    ASSERT_NE(order, "");
    const auto following = fleet.startZavctl("anna", {"task", "output", "-f", order});
    ASSERT_TRUE(following->awaitOutput("line 1\n", kPatience)) << following->err();
    fleet.host().program().signal(SIGKILL);
    const ProgramResult gone = following->wait(kPatience);
    EXPECT_EQ(gone.status, 3);
    EXPECT_EQ(gone.err, "zavctl: web-1: the host went away\n");
    fleet.host().program().wait();
}

TEST_F(OutputOfAFleet, IsGivenUpWhenTheLinkIsGone) {
    const std::string order = installThatPrints();
    ASSERT_NE(order, "");
    const auto following = fleet.startZavctl("anna", {"task", "output", "-f", order});
    ASSERT_TRUE(following->awaitOutput("line 1\n", kPatience)) << following->err();
    const auto begun = std::chrono::steady_clock::now();
    fleet.link().signal(SIGKILL);
    const ProgramResult gone = following->wait(kPatience);
    EXPECT_EQ(gone.status, 3);
    EXPECT_EQ(gone.err, "zavctl: web-1 has not answered for 30 seconds\n");
    EXPECT_LT(std::chrono::steady_clock::now() - begun, seconds(120));
    release();
}

TEST_F(OutputOfAFleet, GoesOnWhereItWasWithALinkThatWasStartedAnew) {
    const std::string order = installThatPrints();
    ASSERT_NE(order, "");
    const auto following = fleet.startZavctl("anna", {"task", "output", "-f", order});
    ASSERT_TRUE(following->awaitOutput("line 1\n", kPatience)) << following->err();
    fleet.restartLink();
    const std::string before = following->out();
    EXPECT_TRUE(eventually([&] { return following->out() != before; }, kPatience))
        << following->err();
    release();
    const ProgramResult end = following->wait(kPatience);
    EXPECT_EQ(end.status, 0) << end.err;
    EXPECT_NE(end.err.find("the end"), std::string::npos) << end.err;
    std::istringstream lines(end.out);
    int count = 0;
    for (std::string line; std::getline(lines, line);)
        EXPECT_EQ(line, "line " + std::to_string(++count)) << "none is lost and none comes twice";
    EXPECT_GT(count, 2);
}

TEST_F(OutputOfAFleet, HasTheChecksOfItsHostsBesideIt) {
    const ProgramResult checks = fleet.zavctl("anna", {"--json", "doctor", "--on", "env=test"});
    const json hosts = json::parse(checks.out, nullptr, false).value("hosts", json::array());
    ASSERT_EQ(hosts.size(), 1U) << checks.out << checks.err;
    EXPECT_EQ(hosts[0].value("host", ""), "web-1");
    EXPECT_GT(hosts[0].value("checks", json::array()).size(), 5U) << checks.out;
    const std::string worst = hosts[0]["checks"][0].value("result", "");
    EXPECT_EQ(checks.status, worst == "error" ? 1 : 0) << checks.out;
}

}  // namespace
