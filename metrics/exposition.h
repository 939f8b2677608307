/// Figures as text for a monitoring system: Prometheus' text format, version 0.0.4.
///
/// The client library that Debian packages for C++ is a shared one with a web server, and its
/// 32-bit package does not install beside the 64-bit one. What is needed of it are these few lines.
#pragma once

#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "metrics/histogram.h"

namespace metrics {

enum class MetricType { Counter, Gauge, Histogram };

/// The type's word in the format.
std::string_view nameOf(MetricType type);

/// Label names with their values, which may be any UTF-8.
using Labels = std::vector<std::pair<std::string_view, std::string_view>>;

/// Writes one metric after the other. One thread.
class Exposition {
public:
    static constexpr std::string_view kContentType = "text/plain; version=0.0.4; charset=utf-8";

    /// The samples that follow belong to this metric. It does not appear if there are none, so what
    /// is not known is left out. `name` and `help` stay valid until the next metric; a name has
    /// letters, digits and "_" only.
    void metric(std::string_view name, MetricType type, std::string_view help);

    /// Of a counter or a gauge. No two samples of a metric have the same labels.
    void sample(const Labels& labels, double value);
    void sample(double value) { sample({}, value); }
    /// Of a histogram of durations, in seconds.
    void sample(const Labels& labels, const Histogram::Snapshot& durations);
    void sample(const Histogram::Snapshot& durations) { sample({}, durations); }

    const std::string& text() const { return text_; }

private:
    void head();
    void line(std::string_view suffix, const Labels& labels, double value);

    std::string text_;
    std::string_view name_;
    std::string_view help_;
    MetricType type_ = MetricType::Gauge;
    bool hasHead_ = false;
};

}  // namespace metrics
