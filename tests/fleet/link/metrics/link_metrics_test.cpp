#include "fleet/link/metrics/link_metrics.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <optional>

#include "fleet/link/metrics/metrics_file.h"
#include "support/fleet/metrics_tables.h"
#include "support/host/metrics_page.h"
#include "support/scratch_dir.h"

namespace {

using fleet::LinkScrape;
using fleet::MetricsFile;
using fleet::Moment;
using std::chrono::seconds;

class LinksMetrics : public testing::Test {
protected:
    LinkScrape scrape() const {
        return {counts_,
                true,
                true,
                false,
                7,
                2,
                Moment(1'700'000'000'500),
                metrics::readProcessFigures()};
    }
    std::string text() const { return metrics::pageOf(fleet::linkMetricTable(), scrape()); }
    std::string path() const { return scratch_.path("zavlink.prom"); }

    ScratchDir scratch_;
    fleet::LinkCounts counts_;
    const MetricsFile::Clock::time_point now_{std::chrono::hours(1)};
};

TEST_F(LinksMetrics, AreThoseOfTheirPage) {
    EXPECT_EQ(metrics_tables::documentedBelow("The links"),
              metrics_tables::rowsOf(fleet::linkMetricTable()));
    metrics_tables::expectConventions(fleet::linkMetricTable(), "zavlink_");
}

TEST_F(LinksMetrics, TakeNoNameThatTheNodeExporterUsesItself) {
    for (const auto& metric : fleet::linkMetricTable())
        EXPECT_EQ(std::string(metric.name).rfind("zavlink_", 0), 0U) << metric.name;
}

TEST_F(LinksMetrics, TellWhatTheLinkIsDoing) {
    counts_.hellos.add(3);
    const MetricsPage page(text());
    EXPECT_EQ(page.faults(), std::vector<std::string>());
    EXPECT_EQ(page.value("zavlink_bus_connected"), 1);
    EXPECT_EQ(page.value("zavlink_blocked"), 0);
    EXPECT_EQ(page.value("zavlink_taken"), 7);
    EXPECT_EQ(page.value("zavlink_numbers_unsigned_total"), 2);
    EXPECT_EQ(page.value("zavlink_hellos_total"), 3);
    EXPECT_EQ(page.value("zavlink_reply_time_seconds"), 1'700'000'000.5);
    EXPECT_EQ(page.types().size(), fleet::linkMetricTable().size()) << "all of them are told";
}

TEST_F(LinksMetrics, LeaveOutAReplyThatNeverCame) {
    LinkScrape fresh = scrape();
    fresh.replied.reset();
    const MetricsPage page(metrics::pageOf(fleet::linkMetricTable(), fresh));
    EXPECT_FALSE(page.has("zavlink_reply_time_seconds"));
}

TEST_F(LinksMetrics, PassThePublishersOwnCheck) {
    if (!metrics_tables::hasPromtool()) GTEST_SKIP() << "promtool is not installed";
    metrics_tables::expectPromtoolContent(text());
}

TEST_F(LinksMetrics, AreWrittenForOthersToReadAndGoWithTheLink) {
    {
        MetricsFile file(path());
        EXPECT_TRUE(file.isDue(now_));
        file.write(scrape(), now_);
        EXPECT_EQ(MetricsPage(scratch_.read("zavlink.prom")).value("zavlink_taken"), 7);
        struct stat status {};
        ASSERT_EQ(::stat(path().c_str(), &status), 0);
        EXPECT_EQ(status.st_mode & 0777U, 0644U);
        EXPECT_FALSE(file.isDue(now_ + seconds(14)));
        EXPECT_TRUE(file.isDue(now_ + MetricsFile::kPause));
    }
    EXPECT_FALSE(std::filesystem::exists(path()));
}

TEST_F(LinksMetrics, ThatCannotBeWrittenDoNotHoldTheLinkUp) {
    MetricsFile file(scratch_.path("no such folder") + "/zavlink.prom");
    file.write(scrape(), now_);
    EXPECT_FALSE(file.isDue(now_)) << "it is tried again later";
    MetricsFile nothing("");
    EXPECT_FALSE(nothing.isDue(now_)) << "nobody has asked for one";
}

}  // namespace
