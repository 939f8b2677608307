#include "fleet/operator/verbs/looks/fleet_config_get.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "fleet/operator/verbs/looks/fleet_tasks.h"

namespace {

using ctl::Format;
using fleet::HostAnswer;
using nlohmann::json;

HostAnswer configured(const std::string& name, const std::string& text) {
    const json full = {{"row", 0}, {"column", "CONTEXT"}, {"text", text}, {"complete", true}};
    return {{"U", name, "here"},
            {{"rows", json::array({{{"RETVAL", 0}}})}, {"full", json::array({full})}},
            ""};
}

TEST(ConfigurationsOfMany, AreShownInGroupsOfEqualOnes) {
    const std::vector<HostAnswer> answers = {
        configured("a", "port=1\n"), configured("b", "port=2\n"), configured("c", "port=2\n")};
    const ctl::Page page = fleet::showConfigurations(answers, false, Format::Text);
    EXPECT_EQ(page.out,
              "# 2 hosts: b, c\n"
              "port=2\n"
              "# 1 host: a\n"
              "port=1\n");
    EXPECT_EQ(page.status, ctl::kSuccess);
    const json document = json::parse(fleet::showConfigurations(answers, false, Format::Json).out);
    EXPECT_EQ(document.at("groups").at(0).at("hosts"), (json{"b", "c"}));
    EXPECT_EQ(document.at("groups").at(1).at("configuration"), "port=1\n");
}

TEST(ConfigurationsOfMany, AreComparedWithTheLargestGroup) {
    const std::vector<HostAnswer> answers = {configured("a", "x\nport=1\ny\n"),
                                             configured("b", "x\nport=2\ny\n"),
                                             configured("c", "x\nport=2\ny\n")};
    EXPECT_EQ(fleet::showConfigurations(answers, true, Format::Text).out,
              "# 2 hosts: b, c\n"
              "x\nport=2\ny\n"
              "# 1 host: a\n"
              "-port=2\n"
              "+port=1\n");
}

TEST(ConfigurationsOfMany, NameHostsThatHaveNone) {
    std::vector<HostAnswer> answers = {configured("a", "x\n"),
                                       {{"U", "b", "away"}, nullptr, "it is away"}};
    HostAnswer odd = configured("c", "x\n");
    odd.answer = 7;
    answers.push_back(odd);
    const ctl::Page page = fleet::showConfigurations(answers, false, Format::Text);
    EXPECT_EQ(page.err, "zavctl: b: it is away\nzavctl: c: its answer makes no sense\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    EXPECT_EQ(page.out, "# 1 host: a\nx\n");
    HostAnswer cut = configured("d", "x");
    cut.answer["full"][0]["complete"] = false;
    EXPECT_EQ(fleet::showConfigurations({cut}, false, Format::Text).err,
              "zavctl: d: its configuration is not whole\n");
}

TEST(ConfigurationsOfMany, DifferByLines) {
    EXPECT_EQ(fleet::differingLines("a\nb\nc\n", "a\nb\nc\n"), "");
    EXPECT_EQ(fleet::differingLines("a\nb\nc\n", "b\nc\nd\n"), "-a\n+d\n");
    EXPECT_EQ(fleet::differingLines("", "a\n"), "+a\n");
    std::string many;
    for (int i = 0; i < 3000; ++i)
        many += "line\n";
    EXPECT_EQ(fleet::differingLines(many, many).size(), 2 * (many.size() + 3000));
}

TEST(TasksOfMany, AreShownHostByHost) {
    const std::vector<HostAnswer> answers = {
        {{"U", "a", "here"}, {{"tasks", json::array()}, {"next", nullptr}}, ""},
        {{"U", "b", "away"}, nullptr, "it is away"}};
    const ctl::Page page =
        fleet::showFleetTasks(answers, std::chrono::system_clock::now(), Format::Text);
    EXPECT_EQ(page.out, "a\nThere are no such tasks.\n");
    EXPECT_EQ(page.err, "zavctl: b: it is away\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    const json document = json::parse(
        fleet::showFleetTasks(answers, std::chrono::system_clock::now(), Format::Json).out);
    EXPECT_EQ(document.at("hosts").at(1), (json{{"host", "b"}, {"error", "it is away"}}));
}

}  // namespace
