// ctest-label: threaded
#include "ctl/client/tasks/task_list.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <vector>

#include "ctl/client/canned_host.h"
#include "ctl/client/failure.h"

namespace {

using ctl_test::CannedHost;
using ctl_test::Peer;
using nlohmann::json;

/// The list of a host that gives these answers, and what it was asked.
std::pair<json, std::vector<std::string>> listWith(const std::vector<json>& answers,
                                                   const ctl::TaskFilter& filter) {
    std::vector<std::string> targets;
    CannedHost host([&](const CannedHost& self) {
        for (const json& answer : answers) {
            const Peer peer = self.accept();
            const std::string request = peer.request();
            targets.push_back(request.substr(4, request.find(" HTTP/") - 4));
            peer.answer(200, answer.dump());
        }
    });
    json list = ctl::listTasks(ctl::HostClient(host.path()), filter,
                               ctl::deadlineIn(std::chrono::seconds(20)));
    host.join();
    return {list, targets};
}

TEST(TaskList, AsksForWhatIsWanted) {
    const json answer = {{"tasks", {{{"id", "1"}}}}, {"next", 7}};
    const auto [list, targets] = listWith({answer}, {"failed", "u x", 1});
    EXPECT_EQ(list, answer) << "there are more, and no more are wanted";
    EXPECT_EQ(targets, std::vector<std::string>{"/v1/tasks?limit=1&state=failed&product=u%20x"});
}

TEST(TaskList, AsksPageByPage) {
    json full = json::array();
    for (int i = 0; i < 1000; ++i)
        full.push_back({{"id", i}});
    const auto [list, targets] = listWith(
        {{{"tasks", full}, {"next", 17}}, {{"tasks", {{{"id", "last"}}}}, {"next", nullptr}}},
        {"", "", 5000});
    EXPECT_EQ(list["tasks"].size(), 1001U);
    EXPECT_EQ(list["next"], nullptr);
    EXPECT_EQ(targets,
              (std::vector<std::string>{"/v1/tasks?limit=1000", "/v1/tasks?limit=1000&after=17"}));
}

TEST(TaskList, DoesNotGoOnBehindAnEmptyPage) {
    const auto [list, targets] = listWith({{{"tasks", json::array()}, {"next", 17}}}, {});
    EXPECT_EQ(list, (json{{"tasks", json::array()}, {"next", nullptr}}));
}

}  // namespace
