// The table of metrics against its page and against the conventions for names.
#include "host/api/metrics/metric_table.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <set>
#include <sstream>

#include "host/api_fixture.h"
#include "support/host/metrics_page.h"

namespace {

using host::Metric;
using metrics::MetricType;

std::string rowOf(const Metric& metric) {
    return "| `" + std::string(metric.name) + "` | " + std::string(metrics::nameOf(metric.type)) +
           " | " + metric.labels + (*metric.labels == '\0' ? "| " : " | ") + metric.help + " |";
}

TEST(PageOfMetrics, ListsExactlyTheMetricsThatThereAre) {
    std::vector<std::string> expected;
    for (const Metric& metric : host::metricTable())
        expected.push_back(rowOf(metric));
    std::vector<std::string> found;
    std::ifstream in(ZAV_SOURCE_DIR "/docs/metrics.md");
    for (std::string line; std::getline(in, line);) {
        if (line.rfind("| `", 0) == 0) found.push_back(line);
    }
    EXPECT_EQ(found, expected);
}

bool endsWith(const std::string& name, const std::string& end) {
    return name.size() >= end.size() &&
           name.compare(name.size() - end.size(), end.size(), end) == 0;
}

TEST(TableOfMetrics, KeepsToTheConventionsForNames) {
    std::set<std::string> names;
    for (const Metric& metric : host::metricTable()) {
        const std::string name = metric.name;
        EXPECT_TRUE(names.insert(name).second) << name << " comes twice";
        EXPECT_TRUE(name.rfind("zavhost_", 0) == 0 || name.rfind("process_", 0) == 0) << name;
        EXPECT_EQ(endsWith(name, "_total"), metric.type == metrics::MetricType::Counter) << name;
        EXPECT_EQ(name.find_first_not_of("abcdefghijklmnopqrstuvwxyz_"), std::string::npos);
        if (metric.type == metrics::MetricType::Histogram) {
            EXPECT_TRUE(endsWith(name, "_seconds")) << name;
        }
        EXPECT_TRUE(endsWith(metric.help, ".")) << name;
    }
}

class MetricsEndpoint : public ApiTest {
protected:
    MetricsPage page() {
        const http::Reply reply = ask("GET", "/v1/metrics");
        EXPECT_EQ(reply.status, 200U);
        EXPECT_EQ(reply.type, "text/plain; version=0.0.4; charset=utf-8");
        return MetricsPage(reply.body);
    }
};

TEST_F(MetricsEndpoint, TellsInTheFormatThatMonitoringSystemsRead) {
    EXPECT_EQ(page().faults(), std::vector<std::string>());
}

TEST_F(MetricsEndpoint, TellsEveryLabelThatTheTableNames) {
    const std::string body = ask("GET", "/v1/metrics").body;
    for (const Metric& metric : host::metricTable()) {
        std::istringstream labels(metric.labels);
        for (std::string label; labels >> label;) {
            if (label.back() == ',') label.pop_back();
            EXPECT_NE(body.find(label + "=\""), std::string::npos) << metric.name;
        }
    }
}

TEST_F(MetricsEndpoint, LeavesOutWhatIsNotKnownYet) {
    const MetricsPage now = page();
    EXPECT_EQ(now.types().count("zavhost_inventory_products"), 0U);
    EXPECT_EQ(now.value("zavhost_connections{socket=\"http\"}"), 0);
    EXPECT_FALSE(now.has("zavhost_connections{socket=\"rpc\"}"));
    services->transferServer = [] {
        ncs::Counts counts;
        counts.connections = 3;
        counts.refused = 2;
        return counts;
    };
    const MetricsPage then = page();
    EXPECT_EQ(then.value("zavhost_connections{socket=\"rpc\"}"), 3);
    EXPECT_EQ(then.value("zavhost_connections_refused_total{socket=\"rpc\"}"), 2);
}

TEST_F(MetricsEndpoint, MakesNoSeriesFromWhatClientsSend) {
    const std::size_t before = page().series();
    for (const char* guard : {"made up", "another", "columns"})
        services->refusals.at(guard).add();
    host::Task task;
    task.request = {{"COMMAND", "MADE UP"}};
    task.state = host::TaskState::Refused;
    services->tasks.hasEnded(task);
    const MetricsPage after = page();
    EXPECT_EQ(after.series(), before);
    EXPECT_EQ(after.value("zavhost_guard_refusals_total{guard=\"other\"}"), 2);
    EXPECT_EQ(after.value("zavhost_guard_refusals_total{guard=\"columns\"}"), 1);
    EXPECT_EQ(after.value("zavhost_tasks_total{command=\"other\",outcome=\"refused\"}"), 1);
}

TEST_F(MetricsEndpoint, TellsTheQueueAndTheAgeOfItsHead) {
    EXPECT_EQ(page().value("zavhost_queue_length"), 0);
    EXPECT_EQ(page().value("zavhost_queue_head_age_seconds"), 0);
    for (const int age : {50, 100}) {
        host::Task task;
        task.way = host::TaskWay::Journal;
        task.accepted = host::WallClock::now() - std::chrono::seconds(age);
        services->journal.enter(task);
    }
    const MetricsPage waiting = page();
    EXPECT_EQ(waiting.value("zavhost_queue_length"), 2);
    EXPECT_GE(waiting.value("zavhost_queue_head_age_seconds"), 100);
    EXPECT_EQ(waiting.value("zavhost_tasks_running"), 0);
    EXPECT_GE(waiting.value("zavhost_journal_commit_duration_seconds_count"), 2);
}

TEST(ReaderOfMetricsPages, FindsWhatIsWrong) {
    const std::string head = "# HELP m M.\n# TYPE m gauge\n";
    EXPECT_EQ(MetricsPage(head + "m 1\nm{a=\"b\"} 2\n").faults().size(), 0U);
    for (const char* wrong : {"m 1", "m  1\n", "m one\n", "n 1\n", "m{a=b} 1\n", "m{a=\"\"b\"} 1\n",
                              "m 1\nm 2\n", "# TYPE m gauge\nm 1\n", "# HELP m M.\nm 1\n",
                              "# HELP n_total N.\n# TYPE n_total gauge\nn_total 1\n"}) {
        EXPECT_NE(MetricsPage(head + wrong).faults().size(), 0U) << wrong;
    }
    const std::string histogram = "# HELP h H.\n# TYPE h histogram\n";
    const std::string end = "h_sum 1\nh_count 2\n";
    EXPECT_EQ(
        MetricsPage(histogram + "h_bucket{le=\"1\"} 1\nh_bucket{le=\"+Inf\"} 2\n" + end).faults(),
        std::vector<std::string>());
    for (const char* wrong : {"h_bucket{le=\"1\"} 3\nh_bucket{le=\"+Inf\"} 2\n",
                              "h_bucket{le=\"1\"} 2\n", "h_bucket{le=\"+Inf\"} 1\n"}) {
        EXPECT_NE(MetricsPage(histogram + wrong + end).faults().size(), 0U) << wrong;
    }
}

}  // namespace
