// Alert rules and dashboard against the list of metrics.
#include <gtest/gtest.h>

#include <fstream>
#include <nlohmann/json.hpp>
#include <regex>
#include <set>
#include <sstream>
#include <string>

namespace {

std::string contentOf(const std::string& file) {
    std::ifstream in(ZAV_SOURCE_DIR "/" + file);
    std::ostringstream content;
    content << in.rdbuf();
    return content.str();
}

std::set<std::string> namesIn(const std::string& text, const std::regex& form) {
    std::set<std::string> names;
    for (std::sregex_iterator at(text.begin(), text.end(), form), end; at != end; ++at)
        names.insert((*at)[1]);
    return names;
}

/// Metrics of a page that an expression may name, those that histograms consist of among them.
std::set<std::string> documentedIn(const std::string& file) {
    const std::string page = contentOf(file);
    std::set<std::string> names = namesIn(page, std::regex("\\n\\| `([a-z_]+)`"));
    for (const std::string& histogram : namesIn(page, std::regex("`([a-z_]+)` \\| histogram"))) {
        for (const char* const part : {"_bucket", "_sum", "_count"})
            names.insert(histogram + part);
    }
    return names;
}

void expectDocumented(const std::string& file, const std::string& page) {
    const std::set<std::string> known = documentedIn(page);
    const std::set<std::string> used =
        namesIn(contentOf(file), std::regex("\\b((?:zavhost|zavfleetd|zavlink|process)_[a-z_]+)"));
    EXPECT_GE(used.size(), 8U);
    for (const std::string& name : used)
        EXPECT_EQ(known.count(name), 1U) << file << " uses " << name;
}

void expectACaseEach(const std::string& rules) {
    const std::string folder = "contrib/prometheus/" + rules;
    const auto alerts = namesIn(contentOf(folder + ".rules.yml"), std::regex("- alert: (\\w+)"));
    const std::string cases = contentOf(folder + ".rules_test.yml");
    EXPECT_GE(alerts.size(), 5U);
    for (const std::string& alert : alerts) {
        EXPECT_NE(cases.find("alertname: " + alert + "\n        exp_alerts:"), std::string::npos)
            << alert;
    }
}

TEST(AlertRules, UseMetricsThatThereAre) {
    expectDocumented("contrib/prometheus/zavhost.rules.yml", "docs/metrics.md");
    expectDocumented("contrib/prometheus/fleet.rules.yml", "docs/fleet-metrics.md");
}

TEST(AlertRules, HaveACaseEach) {
    expectACaseEach("zavhost");
    expectACaseEach("fleet");
}

TEST(Dashboard, UsesMetricsThatThereAre) {
    expectDocumented("contrib/grafana/zavhost.json", "docs/metrics.md");
}

TEST(Dashboard, IsADocumentWithPanelsThatDoNotOverlap) {
    const auto board = nlohmann::json::parse(contentOf("contrib/grafana/zavhost.json"));
    std::set<int> numbers;
    std::set<std::pair<int, int>> taken;
    for (const auto& panel : board.at("panels")) {
        EXPECT_TRUE(numbers.insert(panel.at("id").get<int>()).second);
        EXPECT_FALSE(panel.at("targets").empty());
        const auto& place = panel.at("gridPos");
        const int left = place.at("x");
        const int top = place.at("y");
        for (int x = left; x < left + place.at("w").get<int>(); ++x) {
            EXPECT_LT(x, 24) << panel.at("title");
            for (int y = top; y < top + place.at("h").get<int>(); ++y)
                EXPECT_TRUE(taken.emplace(x, y).second) << panel.at("title");
        }
    }
}

}  // namespace
