#include "metrics/by_label.h"

#include <gtest/gtest.h>

#include <chrono>
#include <map>

#include "metrics/counter.h"
#include "metrics/histogram.h"

namespace {

using metrics::ByLabel;
using metrics::Counter;

std::map<std::string, std::uint64_t> valuesOf(const metrics::ByLabel<metrics::Counter>& counters) {
    std::map<std::string, std::uint64_t> values;
    counters.each([&](std::string_view label, const metrics::Counter& counter) {
        EXPECT_TRUE(values.emplace(label, counter.value()).second) << label << " comes twice";
    });
    return values;
}

TEST(CountersByLabel, CountEachValueByItself) {
    metrics::ByLabel<metrics::Counter> counters({"a", "b"});
    counters.at("a").add();
    counters.at("b").add(5);
    counters.at("a").add();
    EXPECT_EQ(valuesOf(counters),
              (std::map<std::string, std::uint64_t>{{"a", 2}, {"b", 5}, {"other", 0}}));
}

TEST(CountersByLabel, CountWhatNobodyNamedAsOther) {
    metrics::ByLabel<metrics::Counter> counters({"a"});
    counters.at("made up").add();
    counters.at("").add();
    counters.at("other").add();
    EXPECT_EQ(valuesOf(counters), (std::map<std::string, std::uint64_t>{{"a", 0}, {"other", 3}}));
}

TEST(CountersByLabel, HaveOneForAValueThatIsGivenTwice) {
    metrics::ByLabel<metrics::Counter> counters({"a", "a", "other"});
    counters.at("a").add();
    EXPECT_EQ(valuesOf(counters), (std::map<std::string, std::uint64_t>{{"a", 1}, {"other", 0}}));
}

TEST(HistogramsByLabel, AreMadeWithTheSameBounds) {
    const std::vector<metrics::Histogram::Duration> bounds = {std::chrono::seconds(1)};
    metrics::ByLabel<metrics::Histogram> histograms({"a"}, bounds);
    histograms.at("a").observe(std::chrono::milliseconds(10));
    EXPECT_EQ(histograms.at("a").snapshot().buckets.at(0).count, 1U);
    EXPECT_EQ(histograms.at("b").snapshot().buckets.at(0).count, 0U);
}

}  // namespace
