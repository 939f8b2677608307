/// What holds for every program's table of metrics.
#pragma once

#include <gtest/gtest.h>

#include <fstream>
#include <set>
#include <string>
#include <vector>

#include "metrics/metric_table.h"
#include "support/host/program.h"

namespace metrics_tables {

/// The rows as a page in docs has them.
template <typename Scrape>
std::vector<std::string> rowsOf(const std::vector<metrics::Metric<Scrape>>& table) {
    std::vector<std::string> rows;
    for (const auto& metric : table) {
        const std::string labels = metric.labels;
        rows.push_back("| `" + std::string(metric.name) + "` | " +
                       std::string(metrics::nameOf(metric.type)) + " | " + labels +
                       (labels.empty() ? "| " : " | ") + metric.help + " |");
    }
    return rows;
}

/// The rows that the page of the fleet's metrics has from this heading to the next one.
inline std::vector<std::string> documentedBelow(const std::string& heading) {
    std::vector<std::string> rows;
    std::ifstream in(ZAV_SOURCE_DIR "/docs/fleet-metrics.md");
    bool isBelow = false;
    for (std::string line; std::getline(in, line);) {
        if (line.rfind("## ", 0) == 0) isBelow = line == "## " + heading;
        if (isBelow && line.rfind("| `", 0) == 0) rows.push_back(line);
    }
    return rows;
}

template <typename Scrape>
void expectConventions(const std::vector<metrics::Metric<Scrape>>& table,
                       const std::string& prefix) {
    std::set<std::string> names;
    for (const auto& metric : table) {
        const std::string name = metric.name;
        const std::string help = metric.help;
        const auto endsWith = [](const std::string& text, const std::string& end) {
            return text.size() >= end.size() &&
                   text.compare(text.size() - end.size(), end.size(), end) == 0;
        };
        EXPECT_TRUE(names.insert(name).second) << name << " comes twice";
        EXPECT_TRUE(name.rfind(prefix, 0) == 0 || name.rfind("process_", 0) == 0) << name;
        EXPECT_EQ(endsWith(name, "_total"), metric.type == metrics::MetricType::Counter) << name;
        EXPECT_EQ(name.find_first_not_of("abcdefghijklmnopqrstuvwxyz_"), std::string::npos) << name;
        EXPECT_TRUE(endsWith(help, ".")) << name;
    }
}

inline bool hasPromtool() {
    return runProgram({"/bin/sh", "-c", "command -v promtool"}).status == 0;
}

/// Asks Prometheus' own tool, which must be there.
inline void expectPromtoolContent(const std::string& page) {
    const ProgramResult checked =
        runProgram({"/bin/sh", "-c", "exec promtool check metrics"}, page);
    EXPECT_EQ(checked.status, 0) << checked.out << checked.err;
    EXPECT_EQ(checked.out + checked.err, "") << "nor does it advise anything";
}

}  // namespace metrics_tables
