// ctest-label: threaded
#include "ctl/client/depot_client.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "ctl/client/canned_host.h"
#include "ctl/client/failure.h"

namespace {

using ctl::DepotClient;
using ctl_test::CannedHost;
using ctl_test::Peer;
using nlohmann::json;

DepotClient clientOf(const CannedHost& host) {
    return DepotClient({host.path(), "", std::chrono::seconds(20)});
}

std::string lineOf(const std::string& request) {
    return request.substr(0, request.find("\r\n"));
}

TEST(DepotClient, AsksAboutAllNamesAtOnce) {
    std::string line;
    CannedHost host([&line](const CannedHost& self) {
        const Peer peer = self.accept();
        line = lineOf(peer.request());
        peer.answer(200, R"({"taken": true, "files": [{"path": "a b"}, {"path": "c"}]})");
    });
    EXPECT_EQ(clientOf(host).check({"a b", "c"}, 12)["taken"], true);
    host.join();
    EXPECT_EQ(line, "GET /v1/depot/check?bytes=12&path=a%20b&path=c HTTP/1.1");
}

TEST(DepotClient, SplitsWhatIsTooLongForOneRequest) {
    const std::string longName(5000, 'x');
    int requests = 0;
    CannedHost host([&requests](const CannedHost& self) {
        for (const char* answer : {R"({"files": [{"sha256": "1"}, {"sha256": "2"}]})",
                                   R"({"files": [{"sha256": "3"}]})"}) {
            const Peer peer = self.accept();
            EXPECT_LT(lineOf(peer.request()).size(), 16'000U);
            ++requests;
            peer.answer(200, answer);
        }
    });
    const json rows = clientOf(host).sums({longName, longName, longName});
    host.join();
    EXPECT_EQ(requests, 2);
    EXPECT_EQ(rows, json::parse(R"([{"sha256": "1"}, {"sha256": "2"}, {"sha256": "3"}])"));
}

TEST(DepotClient, KnowsAHostThatLacksTheQuestion) {
    const CannedHost host([](const CannedHost& self) {
        for (int i = 0; i < 2; ++i) {
            const Peer peer = self.accept();
            peer.request();
            peer.answer(404, R"({"error": "there is nothing at /v1/depot/sum"})");
        }
    });
    EXPECT_TRUE(clientOf(host).sums({"a"}).is_null());
    EXPECT_TRUE(clientOf(host).check({"a"}, 1).is_null());
}

TEST(DepotClient, TakesNoAnswerThatLacksAFile) {
    for (const char* answer : {R"({"files": []})", "{}", "[]", R"({"files": 1})"}) {
        const CannedHost host([answer](const CannedHost& self) {
            const Peer peer = self.accept();
            peer.request();
            peer.answer(200, answer);
        });
        EXPECT_THROW(clientOf(host).sums({"a"}), ctl::Failure) << answer;
    }
}

TEST(DepotClient, RemovesWithTheMethodForIt) {
    std::string line;
    CannedHost host([&line](const CannedHost& self) {
        const Peer peer = self.accept();
        line = lineOf(peer.request());
        peer.answer(200, "{}");
    });
    clientOf(host).remove("a/b", true);
    host.join();
    EXPECT_EQ(line, "DELETE /v1/depot?path=a%2Fb&recursive=1 HTTP/1.1");
}

}  // namespace
