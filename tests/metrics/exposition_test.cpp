#include "metrics/exposition.h"

#include <gtest/gtest.h>

#include <limits>

namespace {

using metrics::Exposition;
using metrics::MetricType;

TEST(AnExposition, HasHelpAndTypeAboveTheSamples) {
    metrics::Exposition out;
    out.metric("jobs_total", metrics::MetricType::Counter, "Jobs.");
    out.sample({{"kind", "a"}, {"end", "b"}}, 3);
    out.sample({{"kind", "c"}, {"end", "d"}}, 0);
    out.metric("width", metrics::MetricType::Gauge, "Width.");
    out.sample(1.5);
    EXPECT_EQ(out.text(),
              "# HELP jobs_total Jobs.\n"
              "# TYPE jobs_total counter\n"
              "jobs_total{kind=\"a\",end=\"b\"} 3\n"
              "jobs_total{kind=\"c\",end=\"d\"} 0\n"
              "# HELP width Width.\n"
              "# TYPE width gauge\n"
              "width 1.5\n");
}

TEST(AnExposition, LeavesOutWhatHasNoSamples) {
    metrics::Exposition out;
    out.metric("unknown", metrics::MetricType::Gauge, "Not known.");
    out.metric("known", metrics::MetricType::Gauge, "Known.");
    out.sample(0);
    EXPECT_EQ(out.text(), "# HELP known Known.\n# TYPE known gauge\nknown 0\n");
}

TEST(AnExposition, EscapesWhatWouldEndALineOrAValue) {
    metrics::Exposition out;
    out.metric("m", metrics::MetricType::Gauge, "a \"b\" \\ c\nd");
    out.sample({{"l", "a \"b\" \\ c\nd"}}, 1);
    EXPECT_EQ(out.text(),
              "# HELP m a \"b\" \\\\ c\\nd\n"
              "# TYPE m gauge\n"
              "m{l=\"a \\\"b\\\" \\\\ c\\nd\"} 1\n");
}

TEST(AnExposition, WritesNumbersAsReadersExpectThem) {
    metrics::Exposition out;
    out.metric("m", metrics::MetricType::Gauge, "M.");
    const double infinity = std::numeric_limits<double>::infinity();
    for (const double value : {0.0001, 1e15, 9'007'199'254'740'991.0, infinity, -infinity})
        out.sample(value);
    out.sample(std::numeric_limits<double>::quiet_NaN());
    EXPECT_EQ(out.text(),
              "# HELP m M.\n# TYPE m gauge\n"
              "m 0.0001\nm 1000000000000000\nm 9007199254740991\nm +Inf\nm -Inf\nm NaN\n");
}

TEST(AnExposition, HasTheBucketsSumAndCountOfAHistogramInSeconds) {
    metrics::Histogram histogram({std::chrono::microseconds(500), std::chrono::seconds(1)});
    histogram.observe(std::chrono::milliseconds(250));
    histogram.observe(std::chrono::seconds(2));
    metrics::Exposition out;
    out.metric("took_seconds", metrics::MetricType::Histogram, "Took.");
    out.sample({{"job", "a"}}, histogram.snapshot());
    EXPECT_EQ(out.text(),
              "# HELP took_seconds Took.\n"
              "# TYPE took_seconds histogram\n"
              "took_seconds_bucket{job=\"a\",le=\"0.0005\"} 0\n"
              "took_seconds_bucket{job=\"a\",le=\"1\"} 1\n"
              "took_seconds_bucket{job=\"a\",le=\"+Inf\"} 2\n"
              "took_seconds_sum{job=\"a\"} 2.25\n"
              "took_seconds_count{job=\"a\"} 2\n");
}

}  // namespace
