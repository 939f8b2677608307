// What a monitoring system gets from a real host.
// ctest-label: threaded

#include <gtest/gtest.h>

#include <fstream>
#include <set>

#include "e2e/transfers/push_fixture.h"
#include "support/host/metrics_page.h"

namespace {

class Metrics : public PushFixture {
protected:
    void startOnScripts(const std::string& agent = "exit 0") {
        home_.products({"ux"}, "exit 0");
        home_.agentScript(agent);
        start({}, "depot", ManagedHost::Guards::On);
    }
    /// The whole answer to GET /v1/metrics.
    std::string answer() const { return host_->exchange("GET /v1/metrics HTTP/1.0\r\n\r\n"); }
    std::string body() const {
        const std::string whole = answer();
        const std::size_t head = whole.find("\r\n\r\n");
        return head == std::string::npos ? "" : whole.substr(head + 4);
    }
    MetricsPage page() const { return MetricsPage(body()); }
    static std::string ends(const std::string& command, const std::string& outcome) {
        return "zavhost_tasks_total{command=\"" + command + "\",outcome=\"" + outcome + "\"}";
    }
    static std::string refusals(const std::string& guard) {
        return "zavhost_guard_refusals_total{guard=\"" + guard + "\"}";
    }
};

TEST_F(Metrics, AreTextOfThatFormatWithAllMetricsOfTheirPage) {
    startOnScripts();
    EXPECT_NE(answer().find("Content-Type: text/plain; version=0.0.4; charset=utf-8\r\n"),
              std::string::npos);
    const MetricsPage now = page();
    EXPECT_EQ(now.faults(), std::vector<std::string>());
    std::set<std::string> documented;
    std::ifstream in(ZAV_SOURCE_DIR "/docs/metrics.md");
    for (std::string line; std::getline(in, line);) {
        if (line.rfind("| `", 0) == 0) documented.insert(line.substr(3, line.find('`', 3) - 3));
    }
    std::set<std::string> told;
    for (const auto& [name, type] : now.types())
        told.insert(name);
    EXPECT_EQ(told, documented) << "a guarded host reads its inventory when it starts";
}

TEST_F(Metrics, CountTasksByCommandAndOutcome) {
    startOnScripts("[ $verb = start ] || exit 3");
    EXPECT_EQ(host_->zavctl({"start", "ux"}).status, 0);
    EXPECT_EQ(host_->zavctl({"start", "ux"}).status, 0);
    EXPECT_EQ(host_->zavctl({"stop", "ux"}).status, 1);
    const MetricsPage now = page();
    EXPECT_EQ(now.value(ends("START", "done")), 2);
    EXPECT_EQ(now.value(ends("START", "failed")), 0);
    EXPECT_EQ(now.value(ends("STOP", "failed")), 1);
    EXPECT_EQ(now.value("zavhost_task_duration_seconds_count{command=\"START\"}"), 2);
    EXPECT_GT(now.value("zavhost_task_duration_seconds_sum{command=\"START\"}"), 0);
    EXPECT_GE(now.value("zavhost_journal_commit_duration_seconds_count"), 3);
    EXPECT_EQ(now.value("zavhost_journal_commit_failures_total"), 0);
    EXPECT_EQ(now.faults(), std::vector<std::string>());
}

TEST_F(Metrics, TellWhatWaitsAndWhatRuns) {
    startOnScripts("while [ ! -e " + files_.path("go") + " ]; do sleep 0.05; done");
    const auto first = host_->startZavctl({"start", "ux"});
    EXPECT_TRUE(eventually([&] { return page().value("zavhost_tasks_running") == 1; }));
    EXPECT_EQ(host_->zavctl({"start", "ux", "--no-wait"}).status, 0);
    EXPECT_TRUE(eventually([&] { return page().value("zavhost_queue_length") == 1; }));
    EXPECT_TRUE(eventually([&] { return page().value("zavhost_queue_head_age_seconds") > 0; }));
    EXPECT_GE(page().value("zavhost_child_processes"), 1);
    files_.write("go", "");
    EXPECT_EQ(first->wait().status, 0);
    EXPECT_TRUE(eventually([&] { return page().value(ends("START", "done")) == 2; }));
    EXPECT_TRUE(eventually([&] { return page().value("zavhost_tasks_running") == 0; }));
    EXPECT_EQ(page().value("zavhost_queue_length"), 0);
    EXPECT_EQ(page().value("zavhost_queue_head_age_seconds"), 0);
}

TEST_F(Metrics, CountRefusalsByGuard) {
    startOnScripts();
    EXPECT_EQ(host_->zavctl({"start", "nothere"}).status, 1);
    EXPECT_EQ(host_->zavctl({"start", "u x"}).status, 2);
    const MetricsPage now = page();
    EXPECT_EQ(now.value(refusals("product")), 1);
    EXPECT_EQ(now.value(refusals("values")), 1);
    EXPECT_EQ(now.value(refusals("target")), 0);
    EXPECT_EQ(now.faults(), std::vector<std::string>());
}

TEST_F(Metrics, CountTransfersAndTheirBytes) {
    startOnScripts();
    const std::string content = randomBytes(3 * 4096 + 5);
    files_.write("one", content);
    files_.write("two", "12345");
    EXPECT_EQ(push(files_.path("one")).status, 0);
    EXPECT_EQ(push(files_.path("two")).status, 0);
    const MetricsPage now = page();
    EXPECT_EQ(now.value("zavhost_transfers_total"), 2);
    EXPECT_EQ(now.value("zavhost_transfer_received_bytes_total"),
              static_cast<double>(content.size() + 5));
    EXPECT_EQ(now.value("zavhost_transfer_failures_total"), 0);
    EXPECT_GE(now.value("zavhost_connections_accepted_total{socket=\"rpc\"}"), 2);
}

TEST_F(Metrics, TellConnectionsAndSubscriptions) {
    startOnScripts();
    EXPECT_EQ(page().value("zavhost_subscriptions"), 0);
    const auto events = host_->startZavctl({"events"});
    EXPECT_TRUE(eventually([&] { return page().value("zavhost_subscriptions") == 1; }));
    const std::string connections = "zavhost_connections{socket=\"http\"}";
    EXPECT_TRUE(eventually([&] { return page().value(connections) == 2; }))
        << "the one that asks, too";
    events->signal(SIGTERM);
    events->wait();
    EXPECT_TRUE(eventually([&] { return page().value("zavhost_subscriptions") == 0; }));
    EXPECT_EQ(page().value("zavhost_connections_refused_total{socket=\"http\"}"), 0);
}

TEST_F(Metrics, CountTheTaskThatAKillInterrupted) {
    startOnScripts("while [ ! -e " + files_.path("go") + " ]; do sleep 0.05; done");
    const auto waiting = host_->startZavctl({"start", "ux"});
    EXPECT_TRUE(eventually([&] { return page().value("zavhost_tasks_running") == 1; }));
    host_->program().signal(SIGKILL);
    host_->program().wait();
    files_.write("go", "");
    host_->start();
    EXPECT_EQ(page().value(ends("START", "interrupted")), 1);
}

TEST_F(Metrics, PassThePublishersOwnCheck) {
    if (runProgram({"/bin/sh", "-c", "command -v promtool"}).status != 0) {
        GTEST_SKIP() << "promtool, of the package prometheus, is not installed";
    }
    startOnScripts();
    EXPECT_EQ(host_->zavctl({"start", "ux"}).status, 0);
    const ProgramResult checked =
        runProgram({"/bin/sh", "-c", "exec promtool check metrics"}, body());
    EXPECT_EQ(checked.status, 0) << checked.out << checked.err;
    EXPECT_EQ(checked.out + checked.err, "") << "nor does it advise anything";
}

}  // namespace
