#include "metrics/exposition.h"

#include <array>
#include <charconv>
#include <chrono>
#include <cmath>

namespace metrics {
namespace {

/// As the format's readers expect it, whatever the locale.
std::string numberText(double value) {
    if (std::isnan(value)) return "NaN";
    if (std::isinf(value)) return value > 0 ? "+Inf" : "-Inf";
    std::array<char, 400> text{};  // of the largest number, all digits
    const auto end =
        std::to_chars(text.data(), text.data() + text.size(), value, std::chars_format::fixed);
    return {text.data(), end.ptr};
}

std::string secondsText(Histogram::Duration time) {
    return numberText(std::chrono::duration<double>(time).count());
}

/// In help texts quotes stay as they are, in values of labels they do not.
void appendEscaped(std::string& out, std::string_view text, bool quotes) {
    for (const char letter : text) {
        if (letter == '\\') {
            out += "\\\\";
        } else if (letter == '\n') {
            out += "\\n";
        } else if (letter == '"' && quotes) {
            out += "\\\"";
        } else {
            out += letter;
        }
    }
}

void appendLabels(std::string& out, const Labels& labels) {
    if (labels.empty()) return;
    char before = '{';
    for (const auto& [name, value] : labels) {
        out += before;
        out += name;
        out += "=\"";
        appendEscaped(out, value, true);
        out += '"';
        before = ',';
    }
    out += '}';
}

}  // namespace

std::string_view nameOf(MetricType type) {
    switch (type) {
        case MetricType::Counter:
            return "counter";
        case MetricType::Gauge:
            return "gauge";
        case MetricType::Histogram:
            return "histogram";
    }
    return "untyped";
}

void Exposition::metric(std::string_view name, MetricType type, std::string_view help) {
    name_ = name;
    type_ = type;
    help_ = help;
    hasHead_ = false;
}

void Exposition::head() {
    if (hasHead_) return;
    hasHead_ = true;
    text_.append("# HELP ").append(name_) += ' ';
    appendEscaped(text_, help_, false);
    text_.append("\n# TYPE ").append(name_).append(" ").append(nameOf(type_)) += '\n';
}

void Exposition::line(std::string_view suffix, const Labels& labels, double value) {
    text_.append(name_).append(suffix);
    appendLabels(text_, labels);
    text_.append(" ").append(numberText(value)) += '\n';
}

void Exposition::sample(const Labels& labels, double value) {
    head();
    line("", labels, value);
}

void Exposition::sample(const Labels& labels, const Histogram::Snapshot& durations) {
    head();
    Labels withBound = labels;
    withBound.emplace_back("le", "");
    for (const Histogram::Bucket& bucket : durations.buckets) {
        const std::string bound = secondsText(bucket.bound);
        withBound.back().second = bound;
        line("_bucket", withBound, static_cast<double>(bucket.count));
    }
    withBound.back().second = "+Inf";
    line("_bucket", withBound, static_cast<double>(durations.count));
    line("_sum", labels, std::chrono::duration<double>(durations.sum).count());
    line("_count", labels, static_cast<double>(durations.count));
}

}  // namespace metrics
