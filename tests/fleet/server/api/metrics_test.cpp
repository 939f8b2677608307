// ctest-label: threaded
// What the centre tells a monitoring system.
#include <arpa/inet.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/time.h>

#include <memory>
#include <nlohmann/json.hpp>
#include <set>
#include <string>

#include "fleet/https/front/front_error.h"
#include "fleet/server/api/metrics/centre_metrics.h"
#include "fleet/server/api/metrics/metrics_server.h"
#include "support/fleet/metrics_tables.h"
#include "support/host/metrics_page.h"
#include "tests/fleet/server/api/centre_interface.h"

namespace {

using centre_interface::CentreInterface;
using centre_interface::LoggedIn;
using nlohmann::json;

/// The whole answer of a server on this port, or what came of it within a minute.
std::string exchange(std::uint16_t port, const std::string& request) {
    const sys::FileDescriptor connection(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const timeval patience{60, 0};
    ::setsockopt(connection.get(), SOL_SOCKET, SO_RCVTIMEO, &patience, sizeof patience);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    if (::connect(connection.get(), reinterpret_cast<sockaddr*>(&address), sizeof address) != 0 ||
        ::send(connection.get(), request.data(), request.size(), MSG_NOSIGNAL) < 0) {
        return "";
    }
    std::string answer;
    char piece[4096];
    for (ssize_t length = 0; (length = ::recv(connection.get(), piece, sizeof piece, 0)) > 0;)
        answer.append(piece, static_cast<std::size_t>(length));
    return answer;
}

class CentresMetrics : public CentreInterface {
protected:
    fleet::MetricsSources sources() { return {*service_, *services_, server_, front_}; }
    std::string text() { return fleet::MetricsPageMaker(sources()).page(); }
    MetricsPage page() { return MetricsPage(text()); }
    static std::string hosts(const std::string& state) {
        return "zavfleetd_hosts{state=\"" + state + "\"}";
    }
    void rollOut(const std::string& host, const LoggedIn& who) {
        EXPECT_EQ(
            post("/v1/rollouts", who, {{"orders", json::array({orderFor(host, who)})}}).status,
            201U);
    }

    http::ServerCounts server_;
    fleet::FrontCounts front_;
};

TEST(TableOfCentresMetrics, IsThatOfItsPage) {
    EXPECT_EQ(metrics_tables::documentedBelow("The centre"),
              metrics_tables::rowsOf(fleet::centreMetricTable()));
    metrics_tables::expectConventions(fleet::centreMetricTable(), "zavfleetd_");
}

TEST_F(CentresMetrics, TellAllThatTheirPageNames) {
    join("web-1");
    sayHello("web-1");
    const MetricsPage now = page();
    EXPECT_EQ(now.faults(), std::vector<std::string>());
    std::set<std::string> told;
    for (const auto& [name, type] : now.types())
        told.insert(name);
    for (const auto& metric : fleet::centreMetricTable())
        EXPECT_EQ(told.count(metric.name), 1U) << metric.name;
    EXPECT_EQ(now.value("zavfleetd_working"), 1);
    EXPECT_EQ(now.value("zavfleetd_bus_connected"), 1);
    EXPECT_GE(now.value("zavfleetd_lease_age_seconds"), 0);
    EXPECT_LT(now.value("zavfleetd_lease_age_seconds"), 30);
}

TEST_F(CentresMetrics, CountHostsByWhatOperatorsSee) {
    join("web-1");
    join("web-2");
    sayHello("web-1");
    ASSERT_TRUE(eventually([this] { return page().value(hosts("here")) == 1; }));
    const MetricsPage now = page();
    EXPECT_EQ(now.value(hosts("unknown")), 1);
    EXPECT_EQ(now.value(hosts("away")), 0);
    EXPECT_EQ(now.value(hosts("stopped")), 0);
    EXPECT_GE(now.value("zavfleetd_hellos_total"), 1);
}

TEST_F(CentresMetrics, FollowAnOrderToItsRollOutsEnd) {
    const LoggedIn who = admin();
    rollOut(join("web-1"), who);
    // It counts as published when the database has that.
    ASSERT_TRUE(eventually(
        [this] { return page().value("zavfleetd_orders_open{state=\"published\"}") == 1; }));
    const MetricsPage now = page();
    EXPECT_EQ(now.value("zavfleetd_publishes_total{answer=\"stored\"}"), 1);
    EXPECT_EQ(now.value("zavfleetd_orders_open{state=\"waiting\"}"), 0);
    EXPECT_EQ(now.value("zavfleetd_orders_unconfirmed"), 0);
    EXPECT_EQ(now.value("zavfleetd_rollouts{state=\"running\"}"), 1);
    EXPECT_GE(now.value("zavfleetd_commit_duration_seconds_count"), 1);
    EXPECT_EQ(now.value("zavfleetd_requests_total{status=\"201\"}"), 1);
    EXPECT_EQ(now.value("zavfleetd_sessions"), 1);
    const std::string rollout =
        get("/v1/rollouts", who).document.at("rollouts").at(0).at("id").get<std::string>();
    EXPECT_EQ(post("/v1/rollouts/" + rollout + "/pause", who).status, 200U);
    EXPECT_EQ(page().value("zavfleetd_rollouts_paused{cause=\"operator\"}"), 1);
    EXPECT_EQ(page().value("zavfleetd_rollouts{state=\"running\"}"), 0);
}

TEST_F(CentresMetrics, CountOutcomesAndMakeNoSeriesOfWhatHostsSay) {
    const std::string host = join("web-1");
    const LoggedIn who = admin();  // whose certificate ends some day, which is told
    const std::size_t before = page().series();
    const auto outcomes = [this](const std::string& command, const std::string& state) {
        return page().value("zavfleetd_outcomes_total{command=\"" + command + "\",state=\"" +
                            state + "\"}");
    };
    for (const char* const state : {"done", "a made-up state"}) {
        const std::string id = fleet::makeOrderId();
        const std::string order = fleet::bytesOfBase64(orderFor(host, who, id));
        ASSERT_TRUE(service_->centre().submit(order).get());
        fleet::Outcome outcome;
        outcome.host = host;
        outcome.order = id;
        outcome.journal = "j1";
        outcome.state = state;
        service_->centre()
            .ask([outcome](fleet::CentreParts& parts) {
                parts.centre.hear(outcome);
                return true;
            })
            .get();
    }
    EXPECT_EQ(outcomes("START", "done"), 1);
    EXPECT_EQ(outcomes("START", "other"), 1);
    EXPECT_EQ(page().series(), before);
}

TEST_F(CentresMetrics, AreToldByACentreThatDoesNotWork) {
    join("web-1");
    stop();
    running_ = std::async(std::launch::deferred, [] { return fleet::CentreProgram::End::Asked; });
    const MetricsPage now = page();
    EXPECT_EQ(now.faults(), std::vector<std::string>());
    EXPECT_EQ(now.value("zavfleetd_working"), 0);
    EXPECT_FALSE(now.has("zavfleetd_lease_age_seconds"));
    EXPECT_EQ(now.value(hosts("unknown")), 1);
}

TEST_F(CentresMetrics, TellWhenCertificatesEnd) {
    const MetricsPage now = page();
    const double day = 86'400;
    const double today =
        std::chrono::duration<double>(std::chrono::system_clock::now().time_since_epoch()).count();
    for (const char* const of : {"centre", "server", "authority"}) {
        const double end =
            now.value(std::string("zavfleetd_certificate_end_time_seconds{of=\"") + of + "\"}");
        EXPECT_GT(end, today) << of;
        EXPECT_LT(end, today + 2 * day) << of << ": this fleet lasts for a day";
    }
}

TEST_F(CentresMetrics, PassThePublishersOwnCheck) {
    if (!metrics_tables::hasPromtool()) GTEST_SKIP() << "promtool is not installed";
    metrics_tables::expectPromtoolContent(text());
}

TEST_F(CentresMetrics, AreServedOnALoopbackPortAndNothingElseIs) {
    const fleet::MetricsServer server(sources(), 0);
    const std::string answer =
        exchange(server.port(), "GET /v1/metrics HTTP/1.0\r\nHost: localhost\r\n\r\n");
    EXPECT_EQ(answer.rfind("HTTP/1.1 200 ", 0), 0U) << answer.substr(0, 200);
    EXPECT_NE(answer.find("Content-Type: text/plain; version=0.0.4; charset=utf-8\r\n"),
              std::string::npos);
    EXPECT_NE(answer.find("\nzavfleetd_working 1\n"), std::string::npos);
    const auto statusOf = [&](const std::string& line) {
        return exchange(server.port(), line + " HTTP/1.0\r\nHost: localhost\r\n\r\n").substr(9, 3);
    };
    EXPECT_EQ(statusOf("GET /v1/hosts"), "404");
    EXPECT_EQ(statusOf("POST /v1/metrics"), "405");
    EXPECT_THROW(fleet::MetricsServer(sources(), server.port()), fleet::FrontError);
}

}  // namespace
