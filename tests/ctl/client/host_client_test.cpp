// ctest-label: threaded
#include "ctl/client/host_client.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "canned_host.h"
#include "ctl/client/failure.h"

namespace {

using ctl::HostClient;
using ctl_test::CannedHost;
using ctl_test::Peer;
using nlohmann::json;

ctl::Deadline soon() {
    return ctl::deadlineIn(std::chrono::seconds(20));
}

/// Status and text of the failure that a query ends with when the host does as `part` says.
std::pair<int, std::string> failureOfQuery(const std::function<void(const Peer&)>& part) {
    const CannedHost host([&part](const CannedHost& self) { part(self.accept()); });
    try {
        HostClient(host.path()).query("KINAGT", {}, soon());
    } catch (const ctl::Failure& failure) {
        return {failure.status(), failure.what()};
    }
    return {0, ""};
}

std::function<void(const Peer&)> answering(int status, const std::string& body) {
    return [=](const Peer& peer) {
        peer.request();
        peer.answer(status, body);
    };
}

TEST(HostClient, AsksForATableWithItsConditionsAndReturnsTheRows) {
    std::string request;
    CannedHost host([&request](const CannedHost& self) {
        const Peer peer = self.accept();
        request = peer.request();
        peer.answer(200, R"({"table": "KINAGT", "rows": [{"PRODUCT": "ux"}]})");
    });
    const json rows = HostClient(host.path()).query("KINAGT", {{"PRODUCT", "like", "u*"}}, soon());
    host.join();
    EXPECT_EQ(rows, (json{{{"PRODUCT", "ux"}}}));
    EXPECT_EQ(request.rfind("POST /v1/query HTTP/1.1\r\n", 0), 0U);
    EXPECT_EQ(json::parse(request.substr(request.find("\r\n\r\n"))),
              (json{{"table", "KINAGT"},
                    {"where", {{{"column", "PRODUCT"}, {"op", "like"}, {"value", "u*"}}}}}));
}

TEST(HostClient, MendsAValueThatIsNoValidUtf8) {
    std::string request;
    CannedHost host([&request](const CannedHost& self) {
        const Peer peer = self.accept();
        request = peer.request();
        peer.answer(200, R"({"rows": []})");
    });
    HostClient(host.path()).query("KINAGT", {{"PRODUCT", "=", "\xff"}}, soon());
    host.join();
    EXPECT_NE(request.find("\"\xef\xbf\xbd\""), std::string::npos);
}

TEST(HostClient, TakesAnEarlyRefusalForTheAnswer) {
    EXPECT_EQ(failureOfQuery([](const Peer& peer) { peer.answer(503, R"({"error": "busy"})"); }),
              std::make_pair(int{ctl::kHostReportedFailure},
                             std::string("the host refused the request: busy")));
    EXPECT_EQ(failureOfQuery(answering(400, R"({"error": "no such table"})")).first,
              ctl::kWrongUsage);
}

TEST(HostClient, SaysWhatIsWrongWithAnAnswer) {
    EXPECT_EQ(failureOfQuery(answering(200, "<html>")),
              std::make_pair(int{ctl::kNoHost}, std::string("the host's answer is no JSON")));
    for (const char* body : {"[]", "{}", R"({"rows": 7})"}) {
        EXPECT_EQ(failureOfQuery(answering(200, body)),
                  std::make_pair(int{ctl::kNoHost}, std::string("the host's answer has no rows")));
    }
    const auto broken = failureOfQuery([](const Peer& peer) { peer.request(); });
    EXPECT_EQ(broken.first, ctl::kNoHost);
    EXPECT_NE(broken.second.find(" broke: "), std::string::npos) << broken.second;
}

}  // namespace
