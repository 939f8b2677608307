// A real Prometheus with a real host: what it scrapes sets off the alerts.

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

/// What brings a host's metrics to the node exporter.
class MetricsPageFile : public testing::Test {
protected:
    ProgramResult write(const std::string& socket) const {
        return runProgram({ZAV_SOURCE_DIR "/contrib/prometheus/zavhost-metrics", socket,
                           scratch.path("zavhost.prom")});
    }

    ScratchDir scratch;
};

TEST_F(MetricsPageFile, HasTheHostsMetricsButNotThoseThatTheNodeExporterHasItself) {
    ScriptHome home;
    const ManagedHost host(home.path());
    const ProgramResult written = write(host.socket());
    ASSERT_EQ(written.status, 0) << written.err;
    const std::string page = scratch.read("zavhost.prom");
    EXPECT_NE(page.find("\nzavhost_build_info{"), std::string::npos) << page;
    EXPECT_NE(page.find("# TYPE zavhost_tasks_total counter\n"), std::string::npos) << page;
    EXPECT_EQ(page.find("\nprocess_"), std::string::npos) << page;
    EXPECT_EQ(page.find(" process_"), std::string::npos) << page;
    EXPECT_EQ(page.back(), '\n');
}

TEST_F(MetricsPageFile, IsGoneWhenTheHostIs) {
    scratch.write("zavhost.prom", "zavhost_build_info 1\n");
    const ProgramResult written = write(scratch.path("nobody"));
    EXPECT_EQ(written.status, 1);
    EXPECT_NE(written.err, "");
    EXPECT_FALSE(scratch.exists("zavhost.prom"));
    EXPECT_FALSE(scratch.exists("zavhost.prom.new"));
}

TEST(Prometheus, RaisesTheAlertForAnInstallThatFails) {
    if (runProgram({"/bin/sh", "-c", "command -v prometheus"}).status != 0) {
        GTEST_SKIP() << "prometheus is not installed";
    }
    ScriptHome home;
    home.products({"ux"}, "exit 0");
    const ManagedHost host(home.path(), {{"QVSDEPLOY_AGENTDEPOT", home.depot()}}, {},
                           ManagedHost::Guards::On);
    const std::string installer = home.files().script("installer", "exit 7");
    const ScratchDir scratch;
    // As it is shipped: nothing of the rule is made shorter for the test.
    Program watch({"/usr/bin/python3", ZAV_SOURCE_DIR "/tests/contrib/watch_host.py", host.socket(),
                   ZAV_SOURCE_DIR "/contrib/prometheus/zavhost.rules.yml", "ZavhostInstallFailed",
                   scratch.path("")});
    ASSERT_TRUE(watch.awaitOutput("scraped\n", std::chrono::seconds(90)))
        << watch.err() << scratch.read("prometheus.log");
    const ProgramResult install =
        host.zavctl({"install", "ux", "1.0", "--no-verify", "--", installer});
    EXPECT_EQ(install.status, 1) << install.out << install.err;
    const ProgramResult watched = watch.wait(std::chrono::seconds(90));
    ASSERT_EQ(watched.status, 0) << watched.err << scratch.read("prometheus.log");
    const auto labels =
        nlohmann::json::parse(watched.out.substr(watched.out.find('\n') + 1), nullptr, false);
    ASSERT_TRUE(labels.is_object()) << watched.out;
    EXPECT_EQ(labels.value("command", ""), "INSTALL");
    EXPECT_EQ(labels.value("outcome", ""), "failed");
    EXPECT_EQ(labels.value("severity", ""), "critical");
    EXPECT_EQ(labels.value("instance", "").rfind("127.0.0.1:", 0), 0U) << labels;
}

}  // namespace
